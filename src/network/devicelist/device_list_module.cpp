// The device list module: merges the scanners' lists into one on request and keeps it in a file.
// There is no timer and no thread of its own; the UPnP and NC scanners search in the background
// and their answers arrive with the next request.
#include "vornwireless/network/devicelist/device_list_module.h"

#include <exception>

#include "vornplatform/file.h"
#include "vornplatform/log.h"
#include "vornwireless/network/devicelist/arp_scanner.h"
#include "vornwireless/network/devicelist/nc_scanner.h"
#include "vornwireless/network/devicelist/upnp_scanner.h"
#include "vornwireless/network/devicelist/wifi_scanner.h"

namespace vornnetwork {
namespace network {
namespace module {

namespace {

const char kList[] = "ClientList";

// The member as text when it is a string; false (after the log line) otherwise.
bool StringMember(Json::Value const& request, char const* key, std::string& out) {
  if (!request.isObject() || !request.isMember(key) || !request[key].isString()) {
    VORN_LOG(LOG_ERR, "indata has no member (%s) or wrong format", key);
    return false;
  }
  out = request[key].asString();
  return true;
}

Json::Value EmptyList() {
  Json::Value list(Json::objectValue);
  list[kList] = Json::Value(Json::arrayValue);
  return list;
}

}  // namespace

DeviceListModule::DeviceListModule()
    : BaseModule(MODULE_DEVICELIST),
      _upnpScanner(nullptr),
      _ncScanner(nullptr),
      _wifiScanner(nullptr),
      _arpScanner(nullptr) {}

DeviceListModule::~DeviceListModule() {}

BaseModule* DeviceListModule::Create() { return new DeviceListModule(); }

int DeviceListModule::StartModule() { return 0; }

int DeviceListModule::InitialModule() {
  InitClientList();
  StartUpnpScanner();
  StartNCScanner();
  StartWifiScanner();
  StartArpScanner();
  return 0;
}

int DeviceListModule::TerminateModule() {
  TerminateClientList();
  StopUpnpScanner();
  StopNCScanner();
  StopWifiScanner();
  StopArpScanner();
  return 0;
}

int DeviceListModule::InitClientList() {
  if (VLIBCFileExist(VORN_DEVICE_LIST_FILE) != 1) return 0;
  if (!_clientList.Load(VORN_DEVICE_LIST_FILE)) {
    VORN_LOG(LOG_ERR, "failed to read (%s) to client list, skip it", VORN_DEVICE_LIST_FILE);
  }
  return 0;
}

int DeviceListModule::TerminateClientList() {
  if (!_clientList.WriteToFile(VORN_DEVICE_LIST_FILE)) {
    VORN_LOG(LOG_ERR, "failed to write (%s) to client list when terminate", VORN_DEVICE_LIST_FILE);
    return -1;
  }
  return 0;
}

int DeviceListModule::StartUpnpScanner() {
  if (_upnpScanner == nullptr) _upnpScanner = UpnpScanner::Inst();
  return _upnpScanner != nullptr ? _upnpScanner->Start() : -1;
}

int DeviceListModule::StopUpnpScanner() {
  // A running search ends here, so nothing of it outlives the module.
  return _upnpScanner != nullptr ? _upnpScanner->Stop() : 0;
}

int DeviceListModule::StartNCScanner() {
  if (_ncScanner == nullptr) _ncScanner = NCScanner::Inst();
  return _ncScanner != nullptr ? _ncScanner->Start() : -1;
}

int DeviceListModule::StopNCScanner() { return _ncScanner != nullptr ? _ncScanner->Stop() : 0; }

int DeviceListModule::StartWifiScanner() {
  if (_wifiScanner == nullptr) _wifiScanner = WifiScanner::Inst();
  return _wifiScanner != nullptr ? _wifiScanner->Start() : -1;
}

int DeviceListModule::StopWifiScanner() {
  return _wifiScanner != nullptr ? _wifiScanner->Stop() : 0;
}

int DeviceListModule::StartArpScanner() {
  if (_arpScanner == nullptr) _arpScanner = ArpScanner::Inst();
  return _arpScanner != nullptr ? _arpScanner->Start() : -1;
}

int DeviceListModule::StopArpScanner() { return _arpScanner != nullptr ? _arpScanner->Stop() : 0; }

int DeviceListModule::GetUpnpScannerData(Json::Value& out) {
  if (_upnpScanner == nullptr) {
    VORN_LOG(LOG_ERR, "no upnp scanner when getting data");
    return -1;
  }
  out = _upnpScanner->GetData();
  return 0;
}

int DeviceListModule::GetNCScannerData(Json::Value& out) {
  if (_ncScanner == nullptr) {
    VORN_LOG(LOG_ERR, "no nc scanner when getting data");
    return -1;
  }
  out = _ncScanner->GetData();
  return 0;
}

int DeviceListModule::GetWifiScannerData(Json::Value& out) {
  if (_wifiScanner == nullptr) {
    VORN_LOG(LOG_ERR, "no wifi scanner when getting data");
    return -1;
  }
  out = _wifiScanner->GetData();
  return 0;
}

int DeviceListModule::GetArpScannerData(Json::Value& out) {
  if (_arpScanner == nullptr) {
    VORN_LOG(LOG_ERR, "no arp scanner when getting data");
    return -1;
  }
  out = _arpScanner->GetData();
  return 0;
}

int DeviceListModule::MergeList(Json::Value const& list, bool const& create) {
  if (!list.isObject() || !list.isMember(kList) || !list[kList].isArray()) {
    VORN_LOG(LOG_ERR, "wrong format of input list");
    return -1;
  }
  Json::Value const& devices = list[kList];
  for (Json::ArrayIndex i = 0; i < devices.size(); ++i) {
    Json::Value const& device = devices[i];
    std::string mac;
    std::string ip;
    if (device.isObject()) {
      if (device.isMember("macAddr") && device["macAddr"].isString()) {
        mac = device["macAddr"].asString();
      }
      if (device.isMember("ipAddr") && device["ipAddr"].isString()) {
        ip = device["ipAddr"].asString();
      }
    }
    if (!mac.empty()) {
      _clientList.UpdateKeysByMac(mac, device, create);
    } else if (!ip.empty()) {
      _clientList.UpdateKeysByIP(ip, device, create);
    } else {
      VORN_LOG(LOG_ERR, "cannot get ip or mac from list object");
      return -1;
    }
  }
  return 0;
}

int DeviceListModule::GetAllScannerData(Json::Value& out) {
  Json::Value data = EmptyList();
  if (GetArpScannerData(data) != 0) {
    VORN_LOG(LOG_ERR, "cannot get arp data");
    return -1;
  }
  if (MergeList(data, true) != 0) {
    VORN_LOG(LOG_ERR, "cannot merge list from arp data");
    return -1;
  }
  data = EmptyList();
  if (GetUpnpScannerData(data) != 0) {
    VORN_LOG(LOG_ERR, "cannot get upnp data");
    return -1;
  }
  if (MergeList(data, false) != 0) {
    VORN_LOG(LOG_ERR, "cannot merge list from upnp data");
    return -1;
  }
  data = EmptyList();
  if (GetNCScannerData(data) != 0) {
    VORN_LOG(LOG_ERR, "cannot get nc data");
    return -1;
  }
  if (MergeList(data, false) != 0) {
    VORN_LOG(LOG_ERR, "cannot merge list from nc data");
    return -1;
  }
  data = EmptyList();
  if (GetWifiScannerData(data) != 0) {
    VORN_LOG(LOG_ERR, "cannot get nc data");
    return -1;
  }
  if (MergeList(data, true) != 0) {
    VORN_LOG(LOG_ERR, "cannot merge list from wifi data");
    return -1;
  }
  if (!_clientList.WriteToFile(VORN_DEVICE_LIST_FILE)) {
    VORN_LOG(LOG_ERR, "failed to write back to (%s)", VORN_DEVICE_LIST_FILE);
    return -1;
  }
  out = _clientList.GetClientList();
  return 0;
}

int DeviceListModule::SetData(Json::Value const& request) {
  std::string mac;
  std::string name;
  std::string type;
  if (!StringMember(request, "macAddr", mac) ||
      !StringMember(request, "userdef_displayName", name) ||
      !StringMember(request, "userdef_deviceType", type)) {
    return -1;
  }
  if (mac.empty() || name.empty() || type.empty()) {
    VORN_LOG(LOG_ERR, "input string should not be empty");
    return -1;
  }
  Json::Value device;
  if (!_clientList.GetObject(mac, device)) {
    VORN_LOG(LOG_ERR, "failed to get object (%s) from list", mac.c_str());
    return -1;
  }
  device["userdef_displayName"] = name;
  device["userdef_deviceType"] = type;
  _clientList.UpdateKeysByMac(device["macAddr"].asString(), device, false);
  return 0;
}

int DeviceListModule::DeleteData(Json::Value const& request) {
  std::string mac;
  if (!StringMember(request, "macAddr", mac)) return -1;
  if (mac.empty()) {
    VORN_LOG(LOG_ERR, "input mac should not be empty");
    return -1;
  }
  if (!_clientList.EraseObject(mac)) {
    VORN_LOG(LOG_ERR, "failed to erase object (%s) from list", mac.c_str());
    return -1;
  }
  return 0;
}

int DeviceListModule::GetDataByScannerType(Json::Value const& request, Json::Value& response) {
  std::string type;
  if (!StringMember(request, "scannertype", type)) return -1;
  if (type == "all") {
    if (GetAllScannerData(response) != 0) {
      VORN_LOG(LOG_ERR, "failed to get all list data");
      return -1;
    }
    return 0;
  }
  int rc = 0;
  if (type == "upnp") {
    rc = GetUpnpScannerData(response);
  } else if (type == "nc") {
    rc = GetNCScannerData(response);
  } else if (type == "wifi") {
    rc = GetWifiScannerData(response);
  } else {
    VORN_LOG(LOG_ERR, "unknown type from input (%s)", type.c_str());
    return -1;
  }
  if (rc != 0) {
    VORN_LOG(LOG_ERR, "failed to get upnp data");
    return -1;
  }
  return 0;
}

int DeviceListModule::ProcessRequest(Json::Value const& request, Json::Value& response) {
  try {
    return Dispatch(request, response);
  } catch (std::exception const& e) {
    VORN_LOG(LOG_ERR, "failed to process request: %s", e.what());
    return -1;
  }
}

int DeviceListModule::Dispatch(Json::Value const& request, Json::Value& response) {
  std::string method;
  if (!StringMember(request, "method", method)) return -1;
  if (method == "get") {
    if (GetDataByScannerType(request, response) != 0) {
      VORN_LOG(LOG_ERR, "failed to get data by scannertype");
      return -1;
    }
    return 0;
  }
  if (method == "set") {
    if (SetData(request) != 0) {
      VORN_LOG(LOG_ERR, "failed to set data");
      return -1;
    }
    return 0;
  }
  if (method == "del") {
    if (DeleteData(request) != 0) {
      VORN_LOG(LOG_ERR, "failed to del data");
      return -1;
    }
    return 0;
  }
  VORN_LOG(LOG_ERR, "unknown type from input (%s)", method.c_str());
  return -1;
}

}  // namespace module
}  // namespace network
}  // namespace vornnetwork
