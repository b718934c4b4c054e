// DeviceListModule (module 4): which devices are on the network. It owns the merged client list
// (kept in /tmp/connectionlist_upnpscanner.json across daemon restarts) and the four scanners,
// and merges what they report when a "get" with "all" asks for it. Requests:
//   {"method": "get", "scannertype": "all"|"upnp"|"nc"|"wifi"}
//   {"method": "set", "macAddr": M, "userdef_displayName": N, "userdef_deviceType": T}
//   {"method": "del", "macAddr": M}
#ifndef VORNWIRELESS_NETWORK_DEVICELIST_DEVICE_LIST_MODULE_H
#define VORNWIRELESS_NETWORK_DEVICELIST_DEVICE_LIST_MODULE_H

#include <json/json.h>

#include <string>

#include "vornwireless/network/base_module.h"
#include "vornwireless/network/devicelist/client_list.h"

#define VORN_DEVICE_LIST_FILE "/tmp/connectionlist_upnpscanner.json"

namespace vornnetwork {
namespace network {
namespace module {

class UpnpScanner;
class NCScanner;
class WifiScanner;
class ArpScanner;

class DeviceListModule : public BaseModule {
 public:
  DeviceListModule();
  ~DeviceListModule() override;

  // For the daemon's module table.
  static BaseModule* Create();

  // 0, or -1 for a bad or failed request (logged).
  int ProcessRequest(Json::Value const& request, Json::Value& response) override;
  int InitialModule() override;    // 0: loads the file, starts the scanners
  int TerminateModule() override;  // 0: writes the file, stops the scanners
  int StartModule() override;      // 0

  int StartUpnpScanner();
  int StopUpnpScanner();
  int StartNCScanner();
  int StopNCScanner();
  int StartWifiScanner();
  int StopWifiScanner();
  int StartArpScanner();
  int StopArpScanner();
  int InitClientList();
  int TerminateClientList();
  int GetUpnpScannerData(Json::Value& out);
  int GetNCScannerData(Json::Value& out);
  int GetWifiScannerData(Json::Value& out);
  int GetArpScannerData(Json::Value& out);
  // Merges a scanner's list into ours; create lets it add devices. 0, -1 for a bad list.
  int MergeList(Json::Value const& list, bool const& create);
  // ARP, UPnP, NC, Wi-Fi in this order, then the file. 0, -1.
  int GetAllScannerData(Json::Value& out);
  int SetData(Json::Value const& request);
  int DeleteData(Json::Value const& request);
  int GetDataByScannerType(Json::Value const& request, Json::Value& response);

  ClientList& GetMergedList() { return _clientList; }

 private:
  int Dispatch(Json::Value const& request, Json::Value& response);

  UpnpScanner* _upnpScanner;
  NCScanner* _ncScanner;
  WifiScanner* _wifiScanner;
  ArpScanner* _arpScanner;
  ClientList _clientList;
};

}  // namespace module
}  // namespace network
}  // namespace vornnetwork

#endif
