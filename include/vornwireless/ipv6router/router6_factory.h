// Builds the router object of a WAN's mode from a request or from its record. The caller owns
// the result; null means no router, with the reason in GetError().
#ifndef VORNWIRELESS_IPV6ROUTER_ROUTER6_FACTORY_H
#define VORNWIRELESS_IPV6ROUTER_ROUTER6_FACTORY_H

#include <json/json.h>

#include <string>

#include "vornwireless/ipv6router/router6_attr.h"
#include "vornwireless/ipv6router/router6_base.h"

namespace vorn {
namespace network {
namespace ipv6 {
namespace router {

class Router6Factory {
 public:
  enum ERROR_CODE {
    ERROR_NONE = 0,
    ERROR_BAD_PARAMETER = 2,  // bad or missing parameter, or failed validation
    ERROR_NO_PUBLIC_IPV4 = 3,
  };

  Router6Factory() : _error(ERROR_NONE) {}

  // The router of the record of config["wan"].
  Router6Base* newRouterV6Instance(Json::Value const& config);
  // The router of wan's record after its IPv4 address changed to localV4.
  Router6Base* newRouterV6Instance(std::string const& wan, std::string const& localV4);
  // A new router of `type` ("off", "native", "6in4", "6to4") from a request.
  Router6Base* newRouterV6Instance(std::string const& type, Json::Value const& config);

  int GetError() const { return _error; }

  // The 6to4 texts of an IPv4 address: "2002:xxxx:xxxx::1/16" and "2002:xxxx:xxxx::/48"
  // ("" when the address cannot be parsed).
  static std::string SixToFourAddress(std::string const& localV4);
  static std::string SixToFourPrefix(std::string const& localV4);

 private:
  Router6Base* newRouterV6InstanceImpl(Router6Attr const& attr);
  bool new6in4Attr(Json::Value const& config, Router6Attr& attr);
  bool new6to4Attr(Json::Value const& config, Router6Attr& attr);
  bool newDHCPPDAttr(Json::Value const& config, Router6Attr& attr);
  // The first public IPv4 address of wan; false (error 3) when it has none.
  bool PublicIPv4(std::string const& wan, std::string& address);
  // A required member as text; false (error 2) when it is missing, an object or an array.
  bool RequiredMember(Json::Value const& config, char const* name, std::string& value);
  // The optional is_default_gateway; false (error 2) when it cannot be read as a boolean.
  bool DefaultGatewayMember(Json::Value const& config, bool& value);

  int _error;
};

}  // namespace router
}  // namespace ipv6
}  // namespace network
}  // namespace vorn

#endif
