// The numbers of the events of the network daemon.
#ifndef VORNWIRELESS_NETWORK_EVENT_EVENT_TYPE_H
#define VORNWIRELESS_NETWORK_EVENT_EVENT_TYPE_H

namespace vornnetwork {
namespace network {
namespace event {

enum EVENT_TYPE {
  EVENT_HELLO = 1,  // HelloEvent
  EVENT_VALID = 2,  // accepted by the table; no event class behind it
};

}  // namespace event
}  // namespace network
}  // namespace vornnetwork

#endif
