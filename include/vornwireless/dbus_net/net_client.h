// NetClient: the typed, synchronous client of "com.vornlink.net". Every operation returns 0 on
// success and -1 on failure (the bus's error is kept in LastErrorName/LastErrorMessage).
#ifndef VORNWIRELESS_DBUS_NET_NET_CLIENT_H
#define VORNWIRELESS_DBUS_NET_NET_CLIENT_H

#include <json/json.h>

#include <string>

#include "vornplatform/dbus.h"

namespace vornnetwork {
namespace dbus {

class NetClient : public vornnetsdk::dbus::DBusClient {
 public:
  NetClient();
  ~NetClient() override;

  // True only when "/var/run/vornnetd.pid" names a living process and the bus name has an owner;
  // the bus is not asked when the pid file says no.
  bool IsServerReady() const override;

  int RefreshGateway(Json::Value& request);
  int ResetIPv6Module(std::string const& ifname);
  int GetDeviceListData(std::string const& scannerType, Json::Value& result);
  int SetDeviceListData(Json::Value const& data);
  int DelDeviceListData(std::string const& mac);
  int GetGatewayListData(Json::Value& request, Json::Value& result);
  int AddGatewayData(Json::Value& request);
  int DelGatewayData(Json::Value& request);
  int SetSlaveData(Json::Value& request);
  int CopyGatewayData(Json::Value& request);
  int GetGatewayDataByInterface(Json::Value& request, Json::Value& result);

  static const char kPidFile[];

 private:
  int Call(const char* method, std::string const& text);
  int Query(const char* method, std::string const& text, Json::Value& result,
            const char* parseFailure);
};

}  // namespace dbus
}  // namespace vornnetwork

#endif
