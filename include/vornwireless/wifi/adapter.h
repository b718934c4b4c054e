// One wireless interface: what is wanted (AdapterData), what is possible (AdapterCapability) and
// what runs (the agent), and the process-wide state of the Wi-Fi daemon. So far it carries the
// unit's topology, which the persistence and capability layers read.
#ifndef VORNWIRELESS_WIFI_ADAPTER_H
#define VORNWIRELESS_WIFI_ADAPTER_H

#include "vornwireless/wifi/enum.h"

namespace vornwireless {
namespace wifi {

class Adapter {
 public:
  // The unit's topology: 0 until first read, changed only by a topology switch.
  static WIFI_TOPOLOGY GetTopology();

  static WIFI_TOPOLOGY topology;
};

}  // namespace wifi
}  // namespace vornwireless

#endif
