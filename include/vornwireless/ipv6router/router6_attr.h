// The record of one WAN's IPv6 router mode ("off", "native", "6in4", "6to4") with its file
// /etc/sysconfig/networking/ipv6-<WAN>.
#ifndef VORNWIRELESS_IPV6ROUTER_ROUTER6_ATTR_H
#define VORNWIRELESS_IPV6ROUTER_ROUTER6_ATTR_H

#include <json/json.h>

#include <string>
#include <utility>
#include <vector>

namespace vorn {
namespace network {
namespace ipv6 {
namespace router {

class Router6Attr {
 public:
  typedef std::vector<std::pair<std::string, std::string> > LanList;  // prefix, LAN interface

  Router6Attr();  // type "off"
  Router6Attr(std::string const& wan, bool isDefaultGateway);  // "native"
  Router6Attr(std::string const& type, std::string const& wan, std::string const& prefix,
              std::string const& localV4, std::string const& remoteV4,
              std::string const& localV6, bool isDefaultGateway);
  Router6Attr(Router6Attr const& other) = default;
  Router6Attr& operator=(Router6Attr const& other) = default;

  // Reads the record of `wan` (which must be set); the gateway database, when it answers,
  // decides is_default_gateway. 0, or -1 when there is no file or a section cannot be read.
  int LoadConfig();
  // Rewrites the file whole. 0 or -1.
  int SaveConfig() const;
  // Removes the file. 0, or -1 when it cannot be removed (a missing file included).
  int RemoveConfig() const;
  // "/etc/sysconfig/networking/ipv6-" plus the converted WAN.
  std::string GetConfigName() const;
  Json::Value ToJson() const;
  // All fields but the LANs.
  bool operator==(Router6Attr const& other) const;
  bool operator!=(Router6Attr const& other) const { return !(*this == other); }
  // Both do nothing when an argument is empty; RemoveLan takes the first exact pair.
  void AddLan(std::string const& prefix, std::string const& lan);
  void RemoveLan(std::string const& prefix, std::string const& lan);
  // "pppoe" becomes the current PPPoE interface ("" when there is none); other names stay.
  static std::string ConvertInterface(std::string const& name);

  std::string type;
  std::string wan;
  std::string prefix;
  std::string local_addr_v4;
  std::string remote_addr_v4;
  std::string local_addr_v6;
  LanList lans;
  bool is_default_gateway;
};

// Directory of the records.
extern char const kRouter6ConfigDir[];

}  // namespace router
}  // namespace ipv6
}  // namespace network
}  // namespace vorn

#endif
