#include "vornwireless/utils/is_sky_model.h"

#include <cstdio>
#include <cstring>

#include "vornplatform/log.h"
#include "vornplatform/proc.h"
#include "vornplatform/str.h"
#include "vornplatform/szhash.h"

namespace vornwireless {
namespace utils {

namespace {

// The third "_" piece of the unit's "unique" key holds the model family.
bool ModelHas(char const* text) {
  FILE* fp = VLIBCPopen("/bin/get_key_value", "r", "/etc/vorninfo.conf", "unique", nullptr);
  if (!fp) {
    VORN_LOG(LOG_ERR, "Failed to run /bin/get_key_value");
    return false;
  }
  char line[128] = "";
  bool got = fgets(line, sizeof line, fp) != nullptr;
  VLIBCPclose(fp);
  if (!got) return false;

  bool found = false;
  PVLIBSZLIST pieces = VLIBCSzListAlloc(8);
  if (pieces && VLIBCStrSep(line, "_", &pieces) > 2) {
    char const* third = VLIBCSzListGet(pieces, 2);
    found = third && strstr(third, text) != nullptr;
  }
  VLIBCSzListFree(pieces);
  return found;
}

}  // namespace

bool IsSkyModel() { return ModelHas("sky"); }
bool Is713SkyModel() { return ModelHas("713sky"); }
bool Is715SkyModel() { return ModelHas("715sky"); }

}  // namespace utils
}  // namespace vornwireless
