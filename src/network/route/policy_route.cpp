// Policy tables are not managed in this build: the two calls of the route module's start are
// logged and succeed.
#include "vornwireless/network/route/policy_route.h"

#include "vornplatform/log.h"

namespace vornnetwork {
namespace network {

int PolicyRoute::EnableTable(IP_TYPE const& type, std::string const& name,
                             std::string const& source) {
  VORN_LOG(LOG_INFO,
           "Policy route tables are not managed in this build, EnableTable [%s] type [%d] "
           "source [%s] skipped",
           name.c_str(), static_cast<int>(type), source.c_str());
  return 0;
}

int PolicyRoute::DisableTable(IP_TYPE const& type, std::string const& name) {
  VORN_LOG(LOG_INFO,
           "Policy route tables are not managed in this build, DisableTable [%s] type [%d] "
           "skipped",
           name.c_str(), static_cast<int>(type));
  return 0;
}

}  // namespace network
}  // namespace vornnetwork
