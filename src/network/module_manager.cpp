// The module manager: creation from the module table, life cycle, requests and events.
#include "vornwireless/network/module_manager.h"

#include "vornplatform/log.h"
#include "vornwireless/network/event/base_event.h"

namespace vornnetwork {
namespace network {
namespace module {

ModuleManager::ModuleManager() {}

ModuleManager::~ModuleManager() {}

ModuleManager& ModuleManager::GetInstance() {
  static ModuleManager instance;
  return instance;
}

bool ModuleManager::Initialize() { return Initialize(module_info, module_info_count); }

bool ModuleManager::Initialize(MODULE_INFO const* table, std::size_t count) {
  int failures = 0;
  for (std::size_t i = 0; table != nullptr && i < count; ++i) {
    if (!table[i].enabled) continue;
    if (!AddModule(table[i])) {
      ++failures;
      VORN_LOG(LOG_ERR, "Failed to initial module [%d]", table[i].type);
    }
  }
  if (!InitModules()) {
    VORN_LOG(LOG_ERR, "Failed to initial modules");
    return false;
  }
  return failures == 0;
}

bool ModuleManager::InitModules() {
  int failures = 0;
  for (auto& entry : _modules) {
    if (entry.second == nullptr) {
      ++failures;
      VORN_LOG(LOG_ERR, "Null module pointer");
      continue;
    }
    if (entry.second->Initialize() != 0) {
      ++failures;
      VORN_LOG(LOG_ERR, "Failed to init module [%d]", entry.first);
    }
  }
  return failures == 0;
}

bool ModuleManager::Start() {
  int failures = 0;
  for (auto& entry : _modules) {
    if (entry.second == nullptr || entry.second->Start() != 0) {
      ++failures;
      VORN_LOG(LOG_ERR, "Failed to start module [%d]", entry.first);
    }
  }
  return failures == 0;
}

bool ModuleManager::AddModule(MODULE_INFO const& info) {
  if (!info.enabled) return true;
  if (IsModuleExist(info.type)) {
    VORN_LOG(LOG_INFO, "The network module [%d] has been created.", info.type);
    return true;
  }
  BaseModule* created = info.create != nullptr ? info.create() : nullptr;
  if (created == nullptr) {
    VORN_LOG(LOG_ERR, "Failed to create module [%d]", info.type);
    return false;
  }
  _modules[info.type] = created;
  return true;
}

bool ModuleManager::RemoveModule(MODULE_TYPE type) {
  auto it = FindModule(type);
  if (it == _modules.end()) return true;
  if (it->second != nullptr) {
    if (it->second->Terminate() != 0) {
      VORN_LOG(LOG_ERR, "Failed to terminiate module [%d]", type);
    }
    delete it->second;
  }
  _modules.erase(it);
  return IsModuleExist(type);
}

std::map<MODULE_TYPE, BaseModule*>::iterator ModuleManager::FindModule(MODULE_TYPE type) {
  return _modules.find(type);
}

bool ModuleManager::IsModuleExist(MODULE_TYPE type) { return FindModule(type) != _modules.end(); }

BaseModule* ModuleManager::GetModule(MODULE_TYPE type) {
  auto it = FindModule(type);
  return it == _modules.end() ? nullptr : it->second;
}

int ModuleManager::ProcessRequest(MODULE_TYPE type, Json::Value const& request,
                                  Json::Value& response) {
  BaseModule* module = GetModule(type);
  if (module == nullptr) {
    VORN_LOG(LOG_ERR, "Failed to find module [%d]", type);
    return -1;
  }
  int ret = module->ProcessRequest(request, response);
  if (ret != 0) {
    VORN_LOG(LOG_ERR, "Failed to process request from module [%d]", type);
  }
  return ret;
}

int ModuleManager::HookEvent(event::EVENT_TYPE event, MODULE_TYPE module, EVENT_HANDLER handler) {
  int ret = _eventTable.Add(event, event::EventHandler(module, handler));
  if (ret != 0) {
    VORN_LOG(LOG_ERR, "Failed to register event [%d] by module [%d] with ret=[%d]", event, module,
             ret);
  }
  return ret;
}

int ModuleManager::UnHookEvent(event::EVENT_TYPE event, MODULE_TYPE module) {
  return _eventTable.Remove(event, module);
}

int ModuleManager::NotifyEvent(event::BaseEvent const* event) {
  if (event == nullptr) {
    VORN_LOG(LOG_ERR, "NULL Event Pointer");
    return -1;
  }
  if (!event->IsValid()) {
    VORN_LOG(LOG_ERR, "Invalid event [%s]", event->ToStr().c_str());
    return -1;
  }
  int failures = 0;
  // A copy: a handler may hook or unhook while the list is walked.
  event::EventTable::HandlerList handlers = _eventTable.ListHandlers(event->GetType());
  for (auto const& handler : handlers) {
    BaseModule* module = GetModule(handler.module);
    if (module == nullptr) {
      VORN_LOG(LOG_ERR, "NULL pointer for module [%d]", handler.module);
      ++failures;
      continue;
    }
    int ret = (module->*(handler.handler))(event);
    if (ret != 0) {
      VORN_LOG(LOG_ERR, "Failed to handler event [%d] by module [%d] and ret=[%d]",
               event->GetType(), handler.module, ret);
      ++failures;
    }
  }
  return failures;
}

void ModuleManager::Dump() const {
  for (auto const& entry : _modules) {
    if (entry.second == nullptr) continue;
    VORN_LOG(LOG_ERR, "module: [%s]", entry.second->ToStr().c_str());
  }
}

}  // namespace module
}  // namespace network
}  // namespace vornnetwork
