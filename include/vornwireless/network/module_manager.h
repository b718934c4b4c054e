// The singleton that owns the network daemon's modules and routes requests and events to them.
#ifndef VORNWIRELESS_NETWORK_MODULE_MANAGER_H
#define VORNWIRELESS_NETWORK_MODULE_MANAGER_H

#include <json/json.h>

#include <cstddef>
#include <map>

#include "vornwireless/network/base_module.h"
#include "vornwireless/network/event/event_table.h"
#include "vornwireless/network/module_type.h"

namespace vornnetwork {
namespace network {
namespace module {

class ModuleManager {
 public:
  // One row of the module table.
  struct MODULE_INFO {
    MODULE_TYPE type;
    bool enabled;
    BaseModule* (*create)();
  };

  // The daemon's table, in creation order: 1 (disabled), 5, 2, 3, 4.
  static MODULE_INFO const module_info[];
  static std::size_t const module_info_count;

  // The singleton, created on first use; never null.
  static ModuleManager& GetInstance();

  // Creates the enabled modules of module_info and initialises them; false when any failed.
  bool Initialize();
  // The same over another table (a daemon or a test with its own set of modules).
  bool Initialize(MODULE_INFO const* table, std::size_t count);
  // Starts every module in ascending type order; false when any failed.
  bool Start();

  bool AddModule(MODULE_INFO const& info);
  // Terminates, deletes and unlists one module. Returns whether it still exists afterwards:
  // false on success, true when it was not there at all.
  bool RemoveModule(MODULE_TYPE type);
  std::map<MODULE_TYPE, BaseModule*>::iterator FindModule(MODULE_TYPE type);
  bool IsModuleExist(MODULE_TYPE type);
  BaseModule* GetModule(MODULE_TYPE type);

  // The module's own result; -1 when the module does not exist.
  int ProcessRequest(MODULE_TYPE type, Json::Value const& request, Json::Value& response);

  // 0 or non-zero.
  int HookEvent(event::EVENT_TYPE event, MODULE_TYPE module, EVENT_HANDLER handler);
  int UnHookEvent(event::EVENT_TYPE event, MODULE_TYPE module);
  // Calls every hooked handler in order of registration: the number of failures, -1 for a
  // null or invalid event.
  int NotifyEvent(event::BaseEvent const* event);

  // Logs each module's ToStr.
  void Dump() const;

  // The event table (read-only), for inspection.
  event::EventTable const& GetEventTable() const { return _eventTable; }

  ModuleManager(ModuleManager const&) = delete;
  ModuleManager& operator=(ModuleManager const&) = delete;

 private:
  ModuleManager();
  ~ModuleManager();  // frees the containers only: modules are neither terminated nor deleted

  bool InitModules();

  std::map<MODULE_TYPE, BaseModule*> _modules;
  event::EventTable _eventTable;
};

}  // namespace module
}  // namespace network
}  // namespace vornnetwork

#endif
