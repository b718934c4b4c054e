// The address-change event over the platform's plug-in interface.
#include "vornwireless/hook/ip_change_event.h"

#include "vornplatform/err.h"
#include "vornplatform/hook.h"
#include "vornplatform/log.h"
#include "vornplatform/netif_link.h"

namespace vornwireless {
namespace hook {

namespace {

// Sets the arguments and fires the hook. 0, -1.
int FireIPChange(PVLIB_PLUGIN handle, char const* name, std::string const& ifname,
                 std::string const& originAddress, std::string const& newAddress,
                 std::string const& prefix, char const* isLink) {
  struct {
    char const* key;
    char const* value;
  } const args[] = {{"IFNAME", ifname.c_str()},
                    {"ORIGIN_ADDRESS", originAddress.c_str()},
                    {"NEW_ADDRESS", newAddress.c_str()},
                    {"PREFIX_LENGTH", prefix.c_str()},
                    {"IS_LINK", isLink}};
  for (auto const& arg : args) {
    if (VLIBPluginSetArg(handle, arg.key, arg.value) < 0) {
      VORN_LOG(LOG_ERR, "Failed to set %s of %s", arg.key, name);
      return -1;
    }
  }
  if (VLIBPluginAction_S(handle) < 0) {
    VORN_LOG(LOG_ERR, "Failed to run %s", name);
    return -1;
  }
  return 0;
}

}  // namespace

int NetIPChangeEvent(_tag_IPTYPE type, std::string const& ifname, std::string const& originAddress,
                     std::string const& newAddress, int prefixLength) {
  const unsigned int prefix = static_cast<unsigned int>(prefixLength);
  if (ifname.empty() || newAddress.empty() || (type != IPTYPE_IPV4 && type != IPTYPE_IPV6) ||
      (type == IPTYPE_IPV4 && prefix > 32) || (type == IPTYPE_IPV6 && prefix > 128)) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  char const* name = type == IPTYPE_IPV4 ? "net/ipv4_change" : "net/ipv6_change";
  // Nothing installed: nothing to run, so neither the link test nor the variables are needed
  // (this keeps an address flood cheap on a box without listeners).
  if (VLIBPluginHasAction(name) == 0) return 0;

  const int link = VORNNetIfIsLink(ifname.c_str());
  if (link < 0) {
    VORN_LOG(LOG_ERR, "error on link detect");
    return -1;
  }

  PVLIB_PLUGIN handle = nullptr;
  int result = -1;
  if (VLIBPluginSDKInit("net", name, &handle) < 0) {
    VORN_LOG(LOG_ERR, "Failed to init plugin %s", name);
  } else {
    try {
      result = FireIPChange(handle, name, ifname, originAddress, newAddress,
                            type == IPTYPE_IPV6 ? std::to_string(prefixLength) : "-1",
                            link > 0 ? "true" : "false");
    } catch (...) {
      VORN_LOG(LOG_ERR, "Failed to run %s", name);
      result = -1;
    }
  }
  VLIBPluginExit(handle);
  return result;
}

}  // namespace hook
}  // namespace vornwireless
