// The /64 prefixes the configured IPv6 routers offer, and which LAN each is given to. Its state
// is the set of router records on disk.
#ifndef VORNWIRELESS_IPV6ROUTER_ROUTER6_PREFIX_H
#define VORNWIRELESS_IPV6ROUTER_ROUTER6_PREFIX_H

#include <string>
#include <vector>

#include "vornwireless/ipv6router/router6_attr.h"

namespace vorn {
namespace network {
namespace ipv6 {
namespace router {

struct Router6PrefixAttr {
  std::string prefix;  // normalised
  std::string wan;     // the router's WAN
  std::string lan;     // the LAN interface it is given to, "" when free
};

class Router6Prefix {
 public:
  Router6Prefix();  // runs Load
  // Reads every record of the directory. False when a record could not be listed or read.
  bool Load();
  // Every candidate prefix of every record. A record whose prefix length is not a number
  // raises boost::bad_lexical_cast.
  std::vector<Router6PrefixAttr> List() const;
  // Gives a free prefix to lan and saves the record; false when no free one matches.
  bool Allocate(std::string const& prefix, std::string const& lan);
  // Takes prefix back from lan; true also when it was not given.
  bool Deallocate(std::string const& prefix, std::string const& lan);

  std::vector<Router6Attr> const& Records() const { return _routers; }

 private:
  static std::string NormalizePrefix(std::string const& text);
  static std::string AllocatedTo(std::string const& prefix, Router6Attr const& attr);
  static std::vector<std::string> EnumPrefix64(std::string const& prefix, int length);
  // The candidates of one record ("" prefix texts skipped with their log lines).
  static std::vector<std::string> Candidates(Router6Attr const& attr, bool logEmpty);

  std::vector<Router6Attr> _routers;
};

}  // namespace router
}  // namespace ipv6
}  // namespace network
}  // namespace vorn

#endif
