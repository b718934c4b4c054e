// Model detection from the unit's "unique" key (e.g. "vs_x86_713sky_..."): the third "_" piece.
#ifndef VORNWIRELESS_UTILS_IS_SKY_MODEL_H
#define VORNWIRELESS_UTILS_IS_SKY_MODEL_H

namespace vornwireless {
namespace utils {

bool IsSkyModel();
bool Is713SkyModel();
bool Is715SkyModel();

}  // namespace utils
}  // namespace vornwireless

#endif
