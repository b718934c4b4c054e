// The process-wide state of the adapters.
#include "vornwireless/wifi/adapter.h"

namespace vornwireless {
namespace wifi {

WIFI_TOPOLOGY Adapter::topology = WIFI_TOPOLOGY_ERROR;

WIFI_TOPOLOGY Adapter::GetTopology() { return topology; }

}  // namespace wifi
}  // namespace vornwireless
