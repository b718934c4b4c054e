// Per event type, the hooked handlers in order of registration.
#include "vornwireless/network/event/event_table.h"

#include <sstream>

#include "vornplatform/log.h"
#include "vornwireless/network/event/base_event.h"

namespace vornnetwork {
namespace network {
namespace event {

int EventTable::Add(EVENT_TYPE event, EventHandler const& handler) {
  if (!BaseEvent::IsValidEvent(event)) {
    VORN_LOG(LOG_ERR, "event [%d] is invalid", event);
    return -1;
  }
  if (!module::BaseModule::IsValidModule(handler.module) || handler.handler == nullptr) {
    VORN_LOG(LOG_ERR, "invalid handler");
    return -1;
  }
  auto it = FindEvent(event);
  if (it == _events.end()) {
    _events[event] = HandlerList(1, handler);
    return 0;
  }
  if (FindModule(it->second, handler.module) != it->second.end()) {
    VORN_LOG(LOG_ERR, "The module [%d] has been registered.", handler.module);
    return -1;
  }
  it->second.push_back(handler);
  return 0;
}

int EventTable::Remove(EVENT_TYPE event, module::MODULE_TYPE module) {
  auto it = FindEvent(event);
  if (it == _events.end()) return 0;
  auto handler = FindModule(it->second, module);
  if (handler != it->second.end()) it->second.erase(handler);
  if (it->second.empty()) _events.erase(it);
  return 0;
}

bool EventTable::RemoveModule(module::MODULE_TYPE module) {
  int failures = 0;
  std::vector<EVENT_TYPE> events;
  for (auto const& entry : _events) events.push_back(entry.first);
  for (EVENT_TYPE event : events) {
    if (Remove(event, module) != 0) {
      ++failures;
      VORN_LOG(LOG_ERR, "Failed to remove module [%d] from event [%d]", module, event);
    }
  }
  return failures == 0;
}

EventTable::HandlerList const& EventTable::ListHandlers(EVENT_TYPE event) const {
  auto it = _events.find(event);
  return it == _events.end() ? _empty : it->second;
}

bool EventTable::IsEventExist(EVENT_TYPE event) const { return _events.count(event) != 0; }

EventTable::EventMap::iterator EventTable::FindEvent(EVENT_TYPE event) {
  return _events.find(event);
}

EventTable::HandlerList::iterator EventTable::FindModule(HandlerList& list,
                                                         module::MODULE_TYPE module) {
  for (auto it = list.begin(); it != list.end(); ++it) {
    if (it->IsModule(module)) return it;
  }
  return list.end();
}

EventTable::HandlerList::const_iterator EventTable::FindConstModule(
    HandlerList const& list, module::MODULE_TYPE module) const {
  for (auto it = list.begin(); it != list.end(); ++it) {
    if (it->IsModule(module)) return it;
  }
  return list.end();
}

std::string EventTable::ToStr() const {
  std::ostringstream out;
  for (auto const& entry : _events) {
    out << "event[" << entry.first << "]/ modules[";
    for (auto const& handler : entry.second) out << handler.module << ", ";
    out << "]";
  }
  return out.str();
}

}  // namespace event
}  // namespace network
}  // namespace vornnetwork
