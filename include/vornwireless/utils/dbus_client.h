// One-line wrappers of the net service's client: each builds a JSON request, calls the network
// daemon through a NetClient made for the call, and logs its failure.
#ifndef VORNWIRELESS_UTILS_DBUS_CLIENT_H
#define VORNWIRELESS_UTILS_DBUS_CLIENT_H

#include <string>

namespace vornwireless {
namespace utils {

// The interface's place in the gateway list of `type` ("GTYPE_V4", "GTYPE_V6"): the "priority"
// of GetGatewayDataByInterface, -1 when it is not listed or on failure.
int GetGatewayPriority(std::string const& ifname, std::string const& type);
// AddGatewayData with type, priority, ifname, gateway, dns and class. The last argument has no
// effect.
bool SetGatewayInfo(std::string const& ifname, std::string const& type, std::string const& gateway,
                    std::string const& dns, std::string const& cls, int priority, bool notify);
// DelGatewayData with type and ifname. The last argument has no effect.
bool DelGatewayInfo(std::string const& ifname, std::string const& type, bool notify);
// RefreshGateway with {"type": type}.
bool RefreshGateway(std::string const& type);

}  // namespace utils
}  // namespace vornwireless

#endif
