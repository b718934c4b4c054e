// Builds router objects from requests and records.
#include "vornwireless/ipv6router/router6_factory.h"

#include <cstdio>

#include "vornplatform/ipaddr.h"
#include "vornplatform/ipv6.h"
#include "vornplatform/log.h"
#include "vornwireless/ipv6router/6in4.h"
#include "vornwireless/ipv6router/dhcp_pd.h"
#include "vornwireless/utils/ip_address.h"

namespace vorn {
namespace network {
namespace ipv6 {
namespace router {

namespace {

// The 6to4 relay anycast address.
const char kSixToFourRelay[] = "192.88.99.1";

std::string SixToFour(std::string const& localV4, char const* format) {
  unsigned int o[4] = {0, 0, 0, 0};
  if (cVLIBISepIP(localV4.c_str(), o) != 4) {
    VORN_LOG(LOG_ERR, "Failed to parse local v4 IPaddr [%s]", localV4.c_str());
    return "";
  }
  char text[64];
  std::snprintf(text, sizeof text, format, o[0], o[1], o[2], o[3]);
  return text;
}

}  // namespace

std::string Router6Factory::SixToFourAddress(std::string const& localV4) {
  return SixToFour(localV4, "2002:%02x%02x:%02x%02x::1/16");
}

std::string Router6Factory::SixToFourPrefix(std::string const& localV4) {
  return SixToFour(localV4, "2002:%02x%02x:%02x%02x::/48");
}

bool Router6Factory::RequiredMember(Json::Value const& config, char const* name,
                                    std::string& value) {
  // Numbers and booleans read as their text, as jsoncpp gives them; objects and arrays have none.
  if (!config.isObject() || !config.isMember(name) ||
      !(config[name].isString() || config[name].isNumeric() || config[name].isBool())) {
    VORN_LOG(LOG_ERR, "Missing field: %s", name);
    _error = ERROR_BAD_PARAMETER;
    return false;
  }
  value = config[name].asString();
  return true;
}

bool Router6Factory::DefaultGatewayMember(Json::Value const& config, bool& value) {
  value = false;
  if (!config.isObject() || !config.isMember("is_default_gateway")) return true;
  // Booleans, numbers and null read as jsoncpp reads them; a text is no boolean.
  if (!config["is_default_gateway"].isConvertibleTo(Json::booleanValue)) {
    VORN_LOG(LOG_ERR, "Missing field: %s", "is_default_gateway");
    _error = ERROR_BAD_PARAMETER;
    return false;
  }
  value = config["is_default_gateway"].asBool();
  return true;
}

bool Router6Factory::PublicIPv4(std::string const& wan, std::string& address) {
  const vornwireless::utils::IPAddress::AddressList list =
      vornwireless::utils::IPAddress::GetIPv4Address(Router6Attr::ConvertInterface(wan));
  for (std::size_t i = 0; i < list.size(); ++i) {
    if (VORNNetIsPrivateIP(list[i].first.c_str()) == 0) {
      address = list[i].first;
      return true;
    }
  }
  VORN_LOG(LOG_ERR, "Unable to retrieve public IPv4 on %s", wan.c_str());
  _error = ERROR_NO_PUBLIC_IPV4;
  return false;
}

bool Router6Factory::new6in4Attr(Json::Value const& config, Router6Attr& attr) {
  std::string wan, prefix, remote, localV6, localV4;
  if (!RequiredMember(config, "wan", wan) || !RequiredMember(config, "prefix", prefix) ||
      !RequiredMember(config, "remote_addr_v4", remote) ||
      !RequiredMember(config, "local_addr_v6", localV6)) {
    return false;
  }
  if (!PublicIPv4(wan, localV4)) return false;
  bool isDefault = false;
  if (!DefaultGatewayMember(config, isDefault)) return false;
  attr = Router6Attr("6in4", wan, prefix, localV4, remote, localV6, isDefault);
  return true;
}

bool Router6Factory::new6to4Attr(Json::Value const& config, Router6Attr& attr) {
  std::string wan, localV4;
  if (!RequiredMember(config, "wan", wan)) return false;
  if (!PublicIPv4(wan, localV4)) return false;
  Json::Value request = config;
  request["local_addr_v6"] = SixToFourAddress(localV4);
  request["prefix"] = SixToFourPrefix(localV4);
  request["remote_addr_v4"] = kSixToFourRelay;
  if (!new6in4Attr(request, attr)) return false;
  attr.type = "6to4";
  return true;
}

bool Router6Factory::newDHCPPDAttr(Json::Value const& config, Router6Attr& attr) {
  std::string wan;
  if (!RequiredMember(config, "wan", wan)) return false;
  bool isDefault = false;
  if (!DefaultGatewayMember(config, isDefault)) return false;
  attr = Router6Attr(wan, isDefault);
  return true;
}

Router6Base* Router6Factory::newRouterV6Instance(Json::Value const& config) {
  std::string wan;
  if (!RequiredMember(config, "wan", wan)) return nullptr;
  Router6Attr attr;
  attr.wan = wan;
  attr.LoadConfig();
  return newRouterV6InstanceImpl(attr);
}

Router6Base* Router6Factory::newRouterV6Instance(std::string const& wan,
                                                 std::string const& localV4) {
  Router6Attr attr;
  attr.wan = wan;
  if (attr.LoadConfig() < 0) {
    VORN_LOG(LOG_ERR, "No IPv6 router config for %s available", wan.c_str());
    return nullptr;
  }
  if (!localV4.empty() && attr.type != "native") {
    attr.local_addr_v4 = localV4;
    if (attr.type == "6to4") {
      attr.local_addr_v6 = SixToFourAddress(localV4);
      attr.prefix = SixToFourPrefix(localV4);
    }
  }
  return newRouterV6InstanceImpl(attr);
}

Router6Base* Router6Factory::newRouterV6Instance(std::string const& type,
                                                 Json::Value const& config) {
  Router6Attr attr;
  if (type == "6in4") {
    if (!new6in4Attr(config, attr)) return nullptr;
  } else if (type == "6to4") {
    if (!new6to4Attr(config, attr)) return nullptr;
  } else if (type == "native") {
    if (!newDHCPPDAttr(config, attr)) return nullptr;
  } else if (type == "off") {
    return nullptr;
  } else {
    VORN_LOG(LOG_ERR, "Bad type: %s", type.c_str());
    _error = ERROR_BAD_PARAMETER;
    return nullptr;
  }
  return newRouterV6InstanceImpl(attr);
}

Router6Base* Router6Factory::newRouterV6InstanceImpl(Router6Attr const& attr) {
  Router6Base* router = nullptr;
  if (attr.type == "6in4" || attr.type == "6to4") {
    router = new Tunnel6in4(attr);
  } else if (attr.type == "native") {
    router = new DHCPPD(attr);
  } else if (attr.type == "off") {
    VORN_LOG(LOG_INFO, "No existing ipv6 router config");
    return nullptr;
  } else {
    VORN_LOG(LOG_ERR, "Bad type: %s, should not reach here", attr.type.c_str());
    _error = ERROR_BAD_PARAMETER;
    return nullptr;
  }
  if (!router->ValidateAttr()) {
    delete router;
    VORN_LOG(LOG_ERR, "Failed to validate attr, possiblely wrong parameters?");
    _error = ERROR_BAD_PARAMETER;
    return nullptr;
  }
  return router;
}

}  // namespace router
}  // namespace ipv6
}  // namespace network
}  // namespace vorn
