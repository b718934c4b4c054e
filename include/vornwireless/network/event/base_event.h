// An event: notified to the modules through the manager, then processed by itself. Each half
// is remembered, so a second Process repeats only the half that failed.
#ifndef VORNWIRELESS_NETWORK_EVENT_BASE_EVENT_H
#define VORNWIRELESS_NETWORK_EVENT_BASE_EVENT_H

#include <string>

#include "vornwireless/network/event/event_type.h"

namespace vornnetwork {
namespace network {
namespace event {

class BaseEvent {
 public:
  explicit BaseEvent(EVENT_TYPE type);
  virtual ~BaseEvent();

  virtual bool IsValid() const = 0;
  // "event:[" type "]".
  virtual std::string ToStr() const;
  // The event's own work; the base version returns 0.
  virtual int ProcessEvent();

  // 0, or -1 when invalid or when either half failed.
  int Process();
  int NotifyModuleManager();
  int PostProcess();

  static bool IsValidEvent(int type);

  EVENT_TYPE GetType() const { return _type; }
  bool IsNotified() const { return _notified; }
  bool IsProcessed() const { return _processed; }

 protected:
  EVENT_TYPE _type;
  bool _notified;
  bool _processed;
};

}  // namespace event
}  // namespace network
}  // namespace vornnetwork

#endif
