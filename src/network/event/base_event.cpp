// An event's two halves: notification of the modules, then its own processing.
#include "vornwireless/network/event/base_event.h"

#include "vornplatform/log.h"
#include "vornwireless/network/module_manager.h"

namespace vornnetwork {
namespace network {
namespace event {

BaseEvent::BaseEvent(EVENT_TYPE type) : _type(type), _notified(false), _processed(false) {}

BaseEvent::~BaseEvent() {}

std::string BaseEvent::ToStr() const { return "event:[" + std::to_string(_type) + "]"; }

int BaseEvent::ProcessEvent() { return 0; }

int BaseEvent::Process() {
  if (_notified && _processed) return 0;
  if (!IsValid()) {
    VORN_LOG(LOG_ERR, "The event [%s] is not valid.", ToStr().c_str());
    return -1;
  }
  int result = 0;
  if (NotifyModuleManager() != 0) {
    VORN_LOG(LOG_ERR, "Failed to notify event [%d] to manager", _type);
    result = -1;
  }
  if (PostProcess() != 0) result = -1;
  return result;
}

int BaseEvent::NotifyModuleManager() {
  if (_notified) return 0;
  if (module::ModuleManager::GetInstance().NotifyEvent(this) != 0) {
    VORN_LOG(LOG_ERR, "Failed to notify event[%d] to manager", _type);
    return -1;
  }
  _notified = true;
  return 0;
}

int BaseEvent::PostProcess() {
  if (_processed) return 0;
  int ret = ProcessEvent();
  if (ret != 0) {
    VORN_LOG(LOG_ERR, "Failed to process event [%s]", ToStr().c_str());
    return ret;
  }
  _processed = true;
  return 0;
}

bool BaseEvent::IsValidEvent(int type) { return type == EVENT_HELLO || type == EVENT_VALID; }

}  // namespace event
}  // namespace network
}  // namespace vornnetwork
