// The framework's sample event: a message.
#ifndef VORNWIRELESS_NETWORK_EVENT_HELLO_EVENT_H
#define VORNWIRELESS_NETWORK_EVENT_HELLO_EVENT_H

#include <string>

#include "vornwireless/network/event/base_event.h"

namespace vornnetwork {
namespace network {
namespace event {

class HelloEvent : public BaseEvent {
 public:
  explicit HelloEvent(std::string const& message);

  bool IsValid() const override;  // a non-empty message
  std::string ToStr() const override;
  int ProcessEvent() override;

  std::string const& GetMessage() const { return _message; }

 private:
  std::string _message;
};

}  // namespace event
}  // namespace network
}  // namespace vornnetwork

#endif
