// WifiScanner: the stations associated with the unit's access points, as hostapd and iw see them.
#ifndef VORNWIRELESS_NETWORK_DEVICELIST_WIFI_SCANNER_H
#define VORNWIRELESS_NETWORK_DEVICELIST_WIFI_SCANNER_H

#include <json/json.h>

#include <string>

#include "vornwireless/network/devicelist/client_list.h"

#define VORN_HOSTAPD_CLI "/usr/bin/hostapd_cli"
#define VORN_IW "/usr/sbin/iw"

namespace vornnetwork {
namespace network {
namespace module {

class WifiScanner {
 public:
  static WifiScanner* Inst();
  int Start();  // 0
  int Stop();   // 0
  // Reads the stations into the list, returns a copy, erases the list.
  Json::Value GetData();

  // -35 dBm or more is 100 %, -100 or less 0 %, linear in between (rounded up).
  static int ConvertDbmToPercent(int dbm);
  // Adds "transferRX", "transferTX" and "signalstrength" from "iw dev IF station get MAC".
  int GetIwDevInfo(Json::Value& object);
  int AppendClientList(std::string const& mac, std::string const& ifname);  // 0
  // 1 when text matches the extended regular expression, 0 when not, -1 for a bad pattern.
  static int RegMatch(char const* text, char const* pattern);
  int GetStationByIfName(std::string const& ifname);
  int GetHostapdData();

 private:
  WifiScanner() = default;
  ClientList _clientList;
};

}  // namespace module
}  // namespace network
}  // namespace vornnetwork

#endif
