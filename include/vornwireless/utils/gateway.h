// The system's default gateway: read, set, and saved and restored around a topology change.
#ifndef VORNWIRELESS_UTILS_GATEWAY_H
#define VORNWIRELESS_UTILS_GATEWAY_H

#include "vornwireless/utils/ip_address.h"

namespace vornwireless {
namespace utils {

class Gateway {
 public:
  Gateway();

  // The current default gateway (empty when there is none). 0, -1.
  int Get(IPAddress& gateway) const;
  // The configured default gateway (empty when none is configured). 0, -1.
  int GetConfig(IPAddress& gateway) const;
  // Makes gateway the configured and the current default gateway (empty: none) and writes a
  // system log event; nothing happens when both already are gateway. 0, -1.
  int Set(IPAddress const& gateway);
  // Saves the current gateway, or the configured one when there is no current one. 0; -1 when
  // neither can be read or both are empty.
  int Backup();
  // Sets the saved gateway again; does nothing without a saved gateway.
  void Restore();

 private:
  IPAddress _gateway;  // the gateway last set through this object
  IPAddress _backup;   // the saved gateway
};

}  // namespace utils
}  // namespace vornwireless

#endif
