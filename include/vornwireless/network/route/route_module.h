// RouteModule (module 3): two ordered gateway lists, one per family, whose order is the priority
// of the default route (index 0 first). The lists live in the priority files, the last address
// of every interface in the gateway database, and the DNS servers of all entries in one resolver
// file per family.
#ifndef VORNWIRELESS_NETWORK_ROUTE_ROUTE_MODULE_H
#define VORNWIRELESS_NETWORK_ROUTE_ROUTE_MODULE_H

#include <json/json.h>

#include <string>
#include <vector>

#include "vornwireless/network/base_module.h"
#include "vornwireless/network/pthread_mutex.h"
#include "vornwireless/network/route/gateway_info.h"

#define VORN_GATEWAY_V4_PRIORITY_FILE "/etc/iproute2/config/gateway_v4_priority"
#define VORN_GATEWAY_V6_PRIORITY_FILE "/etc/iproute2/config/gateway_v6_priority"
#define VORN_GATEWAY_DATABASE_FILE "/etc/iproute2/config/gateway_database"
#define VORN_RESOLV4_FILE "/etc/iproute2/config/resolv4.conf"
#define VORN_RESOLV6_FILE "/etc/iproute2/config/resolv6.conf"

namespace vornnetwork {
namespace network {
namespace module {

class RouteModule : public BaseModule {
 public:
  RouteModule();
  ~RouteModule() override;

  // For the daemon's module table.
  static BaseModule* Create();

  // Runs the handler named by request["method"] under the module's mutex. Always 0: failures
  // show in the log only; an unknown method (or a request that is no object) does nothing.
  int ProcessRequest(Json::Value const& request, Json::Value& response) override;
  // Reads both lists and rebuilds the static table's rules. Always 0; no route is touched.
  int InitialModule() override;
  int TerminateModule() override;  // 0
  int StartModule() override;      // 0

  // The handlers. 0, or -1 on failure (logged).
  int GetGatewayListData(Json::Value const& request, Json::Value& response);
  int AddGatewayInfo(Json::Value const& request);  // also serves as update
  int DelGatewayInfo(Json::Value const& request);
  int GetGatewayDataByInterface(Json::Value const& request, Json::Value& response);
  int SetSlaveForGatewayInfo(Json::Value const& request);
  int CopyGatewayData(Json::Value const& request);
  int RefreshDefaultGateway(Json::Value const& request);  // "GTYPE_V4", "GTYPE_V6" or "ALL"

  int ReadGatewayListFromFile(GATEWAY_TYPE type);
  int WriteGatewayListToFile(GATEWAY_TYPE type);
  int WriteGatewayToDatabase(GATEWAY_TYPE type);
  int WriteDnsFile(GATEWAY_TYPE type);
  // The first interface (in list order) whose route can be added gets the default route and
  // moves to index 0. IPv4 restores the system's saved gateway when none can.
  int RefreshDefaultGatewayV4();
  int RefreshDefaultGatewayV6();
  // 1 when the database's value differs (or is missing), 0 when equal, -1 on a read failure.
  int IsDatabaseChanged(std::string const& section, std::string const& key,
                        std::string const& value);
  // 1 changed, 0 unchanged or not given, -1 on an unknown type or a failure.
  int IsGatewayConfigChanged(Json::Value const& request);
  int IsDnsConfigChanged(Json::Value const& request);

  // A copy of one list, taken under the module's mutex.
  std::vector<GatewayInfo> GetGatewayList(GATEWAY_TYPE type);

 private:
  int Dispatch(Json::Value const& request, Json::Value& response);
  int IsConfigChanged(Json::Value const& request, char const* member, char const* keyV4,
                      char const* keyV6);
  // The list of the request's "type" (and the family in *type); NULL after logging unknownText.
  std::vector<GatewayInfo>* PickList(Json::Value const& request, char const* unknownText,
                                     GATEWAY_TYPE* type);

  std::vector<GatewayInfo> _gatewayListV4;
  std::vector<GatewayInfo> _gatewayListV6;
  PthreadMutex _routeMutex;  // separate from the base module's mutex
};

}  // namespace module
}  // namespace network
}  // namespace vornnetwork

#endif
