// Stand-in modules for the net service's tests: each answers a request with what it received,
// remembers the previous request, reads the members it knows with jsoncpp's converting getters
// (which throw on a wrong type, as a real module's would) and refuses what a real module refuses.
#ifndef VORN_TESTS_UNIT_DBUS_NET_FAKE_MODULES_H
#define VORN_TESTS_UNIT_DBUS_NET_FAKE_MODULES_H

#include <json/json.h>

#include <string>

#include "vornwireless/network/base_module.h"
#include "vornwireless/network/module_manager.h"

namespace vorntest {

using vornnetwork::network::module::BaseModule;
using vornnetwork::network::module::MODULE_TYPE;
using vornnetwork::network::module::ModuleManager;

class RecordingModule : public BaseModule {
 public:
  explicit RecordingModule(MODULE_TYPE type) : BaseModule(type) {}
  int InitialModule() override { return 0; }
  int TerminateModule() override { return 0; }
  int StartModule() override { return 0; }

  int ProcessRequest(Json::Value const& request, Json::Value& response) override {
    ++calls;
    // Typed reads first: a wrong type throws here, before anything is recorded.
    std::string method = request["method"].asString();
    if (request.isMember("priority")) (void)request["priority"].asInt();
    if (request.isMember("type")) (void)request["type"].asString();
    if (request.isMember("slave")) (void)request["slave"].asBool();
    if (request.isMember("scannertype") && request["scannertype"].asString() == "arp") {
      return -1;  // the device list knows no "arp" scanner
    }
    if (request.isMember("fail") && request["fail"].asBool()) return -1;
    // A tiny gateway table, so that priorities can be read back.
    std::string key = request["type"].asString() + "/" + request["ifname"].asString();
    if (method == "ADD_GATEWAY_DATA") priorities[key] = request["priority"];
    if (method == "DEL_GATEWAY_DATA") priorities.removeMember(key);
    if (method == "GET_GATEWAY_DATA_BY_INTERFACE") {
      response["exist"] = priorities.isMember(key);
      response["priority"] = priorities.isMember(key) ? priorities[key] : Json::Value(-1);
    }
    response["module"] = static_cast<int>(_type);
    response["request"] = request;
    response["last"] = last;
    last = request;
    return 0;
  }

  int calls = 0;
  Json::Value last;
  Json::Value priorities{Json::objectValue};
};

inline BaseModule* CreateIPv6() {
  return new RecordingModule(vornnetwork::network::module::MODULE_IPV6);
}
inline BaseModule* CreateRoute() {
  return new RecordingModule(vornnetwork::network::module::MODULE_ROUTE);
}
inline BaseModule* CreateDeviceList() {
  return new RecordingModule(vornnetwork::network::module::MODULE_DEVICELIST);
}

// Adds the three recording modules to the manager.
inline bool AddRecordingModules() {
  using Info = ModuleManager::MODULE_INFO;
  ModuleManager& m = ModuleManager::GetInstance();
  return m.AddModule(Info{vornnetwork::network::module::MODULE_IPV6, true, CreateIPv6}) &&
         m.AddModule(Info{vornnetwork::network::module::MODULE_ROUTE, true, CreateRoute}) &&
         m.AddModule(Info{vornnetwork::network::module::MODULE_DEVICELIST, true, CreateDeviceList});
}

inline void RemoveRecordingModules() {
  ModuleManager& m = ModuleManager::GetInstance();
  m.RemoveModule(vornnetwork::network::module::MODULE_IPV6);
  m.RemoveModule(vornnetwork::network::module::MODULE_ROUTE);
  m.RemoveModule(vornnetwork::network::module::MODULE_DEVICELIST);
}

inline RecordingModule* Recorder(MODULE_TYPE type) {
  return static_cast<RecordingModule*>(ModuleManager::GetInstance().GetModule(type));
}

}  // namespace vorntest

#endif
