// The topology code and the host finder for the device list.
#include "vornplatform/devicelist.h"

#include <cstring>

#include "vornplatform/action.h"
#include "vornplatform/file.h"

int VLIBNetTopologyGet(int /*flags*/) {
  char value[64] = "";
  if (VLIBCFileGetKeyValue(VLIBC_INFO_FILE, "net_topology", value, sizeof(value), 0) <= 0) {
    return 0;
  }
  if (std::strcmp(value, "client") == 0) return 1;
  if (std::strcmp(value, "bridge") == 0) return 2;
  if (std::strcmp(value, "router") == 0) return 3;
  return 0;
}

int VORNFHOSTDumpHost() {
  // Any non-zero exit of the finder counts as a failed search.
  return vornplatform::RunAction("VORNFHOSTDumpHost", {}) == 0 ? 0 : -1;
}
