// Who listens to which event: per event type, the hooked handlers in order of registration.
#ifndef VORNWIRELESS_NETWORK_EVENT_EVENT_TABLE_H
#define VORNWIRELESS_NETWORK_EVENT_EVENT_TABLE_H

#include <map>
#include <string>
#include <vector>

#include "vornwireless/network/base_module.h"
#include "vornwireless/network/event/event_type.h"
#include "vornwireless/network/module_type.h"

namespace vornnetwork {
namespace network {
namespace event {

struct EventHandler {
  module::MODULE_TYPE module;
  module::EVENT_HANDLER handler;

  EventHandler(module::MODULE_TYPE m, module::EVENT_HANDLER h) : module(m), handler(h) {}
  bool IsModule(module::MODULE_TYPE type) const { return module == type; }
  bool operator==(EventHandler const& other) const {
    return handler == other.handler && module == other.module;
  }
};

class EventTable {
 public:
  typedef std::vector<EventHandler> HandlerList;
  typedef std::map<EVENT_TYPE, HandlerList> EventMap;

  // 0, or -1 for an invalid event, an invalid handler or a module already hooked to the event.
  int Add(EVENT_TYPE event, EventHandler const& handler);
  // Always 0; an event left without handlers is dropped.
  int Remove(EVENT_TYPE event, module::MODULE_TYPE module);
  // Removes the module from every event; true when nothing failed.
  bool RemoveModule(module::MODULE_TYPE module);
  // The handlers of the event in registration order (an empty list for an unknown event).
  HandlerList const& ListHandlers(EVENT_TYPE event) const;
  bool IsEventExist(EVENT_TYPE event) const;
  EventMap::iterator FindEvent(EVENT_TYPE event);
  HandlerList::iterator FindModule(HandlerList& list, module::MODULE_TYPE module);
  HandlerList::const_iterator FindConstModule(HandlerList const& list,
                                              module::MODULE_TYPE module) const;
  // "event[1]/ modules[1, 3, ]" for each event.
  std::string ToStr() const;

 private:
  HandlerList _empty;
  EventMap _events;
};

}  // namespace event
}  // namespace network
}  // namespace vornnetwork

#endif
