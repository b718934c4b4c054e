// The sample event: a message.
#include "vornwireless/network/event/hello_event.h"

#include "vornplatform/log.h"

namespace vornnetwork {
namespace network {
namespace event {

HelloEvent::HelloEvent(std::string const& message) : BaseEvent(EVENT_HELLO), _message(message) {}

bool HelloEvent::IsValid() const { return !_message.empty(); }

std::string HelloEvent::ToStr() const {
  return BaseEvent::ToStr() + "/ msg:[" + _message + "]\n";
}

int HelloEvent::ProcessEvent() {
  VORN_LOG(LOG_INFO, "process by hello event");
  return 0;
}

}  // namespace event
}  // namespace network
}  // namespace vornnetwork
