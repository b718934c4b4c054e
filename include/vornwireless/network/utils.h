// Small network helpers of the modules.
#ifndef VORNWIRELESS_NETWORK_UTILS_H
#define VORNWIRELESS_NETWORK_UTILS_H

#include <json/json.h>

#include <string>

namespace vornnetwork {
namespace network {

// "ip/mask" in the subnet form of `ip route ... to` (network/prefix): 0, or -1 on failure.
int GetSubnetFormat(std::string const& ip, std::string const& mask, std::string& out);
// Asks /usr/bin/ethtool whether the interface sees a link.
bool IsEthernetLinkDetected(std::string const& ifname);
// Keeps the gateway records of the array `list` that pass the filter ("wan", "lan", "all" or
// a class name), in their order. Always 0.
int FilterList(std::string const& filter, Json::Value& list);

}  // namespace network
}  // namespace vornnetwork

#endif
