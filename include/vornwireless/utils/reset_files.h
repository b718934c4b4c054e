#ifndef VORNWIRELESS_UTILS_RESET_FILES_H
#define VORNWIRELESS_UTILS_RESET_FILES_H

namespace vornwireless {
namespace utils {

// Removes the file when it exists.
void RemoveFile(char const* path);
// Removes the regular files of dir whose names begin with pattern.
void RemoveFiles(char const* dir, char const* pattern);
// Puts factory files back: removes what matches target, then copies what matches source into
// the directory of target. Both may be glob patterns.
void ResetFiles(char const* source, char const* target);

}  // namespace utils
}  // namespace vornwireless

#endif
