// The life cycle shared by every module: 1 created, 2 initialised, 3 started.
#include "vornwireless/network/base_module.h"

#include "vornplatform/log.h"
#include "vornwireless/network/module_manager.h"

namespace vornnetwork {
namespace network {
namespace module {

BaseModule::BaseModule(MODULE_TYPE type) : _state(MODULE_STATE_CREATED), _type(type) {}

BaseModule::~BaseModule() {}

int BaseModule::ProcessRequest(Json::Value const& /*request*/, Json::Value& /*response*/) {
  return 0;
}

std::string BaseModule::ToStr() const { return "module:" + std::to_string(_type); }

int BaseModule::HookEvents() const { return 0; }

int BaseModule::Initialize() {
  if (_state == MODULE_STATE_INITIALIZED) return 0;
  int ret = HookEvents();
  if (ret != 0) {
    VORN_LOG(LOG_ERR, "Failed to hook event of module [%d]", _type);
    Terminate();
    return ret;
  }
  ret = InitialModule();
  if (ret != 0) {
    VORN_LOG(LOG_ERR, "Failed to init module [%d]", _type);
    Terminate();
    return ret;
  }
  _state = MODULE_STATE_INITIALIZED;
  return 0;
}

int BaseModule::Start() {
  if (_state != MODULE_STATE_INITIALIZED) {
    VORN_LOG(LOG_ERR, "Module [%d] is not initialized", _type);
    return -1;
  }
  int ret = StartModule();
  if (ret != 0) {
    VORN_LOG(LOG_ERR, "Failed to start module [%d]", _type);
    return ret;
  }
  _state = MODULE_STATE_STARTED;
  return 0;
}

int BaseModule::Terminate() {
  int ret = TerminateModule();
  if (ret == 0) {
    _state = MODULE_STATE_CREATED;
  } else {
    VORN_LOG(LOG_ERR, "Failed to terminate module [%d]", _type);
  }
  return ret;
}

bool BaseModule::Lock() { return _mutex.Lock(); }

bool BaseModule::Unlock() { return _mutex.Unlock(); }

bool BaseModule::Trylock() { return _mutex.TryLock(); }

int BaseModule::HookEvent(event::EVENT_TYPE type, EVENT_HANDLER handler) const {
  int ret = ModuleManager::GetInstance().HookEvent(type, _type, handler);
  if (ret != 0) {
    VORN_LOG(LOG_ERR, "Failed to hook event [%d] of module [%d]", type, _type);
  }
  return ret;
}

int BaseModule::UnHookEvent(event::EVENT_TYPE type) const {
  return ModuleManager::GetInstance().UnHookEvent(type, _type);
}

bool BaseModule::IsValidModule(int type) {
  return static_cast<unsigned int>(type) - 1u < 5u;
}

}  // namespace module
}  // namespace network
}  // namespace vornnetwork
