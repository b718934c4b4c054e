// vornnetdtool's IPv6 router commands: the router modes of the WANs and the prefixes they hand
// to the LANs. They run in the tool's own process on the router records; the gateway entries
// they make go to vornnetd.
#include <json/json.h>

#include <exception>
#include <iostream>
#include <memory>
#include <string>
#include <vector>

#include "vornwireless/ipv6router/router6_attr.h"
#include "vornwireless/ipv6router/router6_base.h"
#include "vornwireless/ipv6router/router6_factory.h"
#include "vornwireless/ipv6router/router6_prefix.h"

#pragma GCC diagnostic ignored "-Wdeprecated-declarations"

namespace {

using vorn::network::ipv6::router::Router6Attr;
using vorn::network::ipv6::router::Router6Base;
using vorn::network::ipv6::router::Router6Factory;
using vorn::network::ipv6::router::Router6Prefix;
using vorn::network::ipv6::router::Router6PrefixAttr;

int Usage(std::string const& message) {
  std::cerr << "vornnetdtool: " << message << "\n(vornnetdtool --help for usage)\n";
  return 1;
}

// The factory's error as the exit status (2 bad parameter, 3 no public IPv4), 1 otherwise.
int FactoryFailure(Router6Factory const& factory, std::string const& what) {
  const int error = factory.GetError();
  std::cerr << "vornnetdtool: " << what << ": no router (error " << error << ")\n";
  return error != 0 ? error : 1;
}

bool ParseObject(std::string const& text, Json::Value& value) {
  Json::Reader reader;
  return reader.parse(text, value, true) && value.isObject();
}

void Print(Json::Value const& value) {
  Json::StyledStreamWriter writer("  ");
  writer.write(std::cout, value);
}

int Router(std::vector<std::string> const& args) {
  if (args.empty()) return Usage("ipv6-router needs a subcommand");
  std::string const sub = args[0];
  Router6Factory factory;
  if (sub == "create") {
    if (args.size() < 2 || args.size() > 3) return Usage("ipv6-router create TYPE [JSON]");
    Json::Value config(Json::objectValue);
    if (args.size() == 3 && !ParseObject(args[2], config)) {
      return Usage("not a JSON object: " + args[2]);
    }
    std::unique_ptr<Router6Base> router(factory.newRouterV6Instance(args[1], config));
    if (!router) {
      if (factory.GetError() == 0) return 0;  // "off": nothing to bring up
      return FactoryFailure(factory, "ipv6-router create");
    }
    if (!router->Create()) {
      std::cerr << "vornnetdtool: ipv6-router create: failed to bring the router up\n";
      return 1;
    }
    Print(router->GetAttr().ToJson());
    return 0;
  }
  if (sub == "destroy" || sub == "show") {
    if (args.size() != 2) return Usage("ipv6-router " + sub + " WAN");
    if (sub == "show") {
      Router6Attr attr;
      attr.wan = args[1];
      if (attr.LoadConfig() < 0) {
        std::cerr << "vornnetdtool: ipv6-router show: no IPv6 router on " << args[1] << "\n";
        return 1;
      }
      Print(attr.ToJson());
      return 0;
    }
    Json::Value config(Json::objectValue);
    config["wan"] = args[1];
    std::unique_ptr<Router6Base> router(factory.newRouterV6Instance(config));
    if (!router) return FactoryFailure(factory, "ipv6-router destroy");
    if (!router->Destroy()) {
      std::cerr << "vornnetdtool: ipv6-router destroy: the router was not fully removed\n";
      return 1;
    }
    return 0;
  }
  if (sub == "wan-address") {
    if (args.size() != 3) return Usage("ipv6-router wan-address WAN IPV4");
    std::unique_ptr<Router6Base> router(factory.newRouterV6Instance(args[1], args[2]));
    if (!router) return FactoryFailure(factory, "ipv6-router wan-address");
    if (!router->Create()) {
      std::cerr << "vornnetdtool: ipv6-router wan-address: failed to bring the router up\n";
      return 1;
    }
    Print(router->GetAttr().ToJson());
    return 0;
  }
  return Usage("unknown ipv6-router subcommand " + sub);
}

int Prefix(std::vector<std::string> const& args) {
  if (args.empty()) return Usage("ipv6-prefix needs a subcommand");
  std::string const sub = args[0];
  Router6Prefix prefixes;
  if (sub == "list") {
    if (args.size() != 1) return Usage("ipv6-prefix list takes no argument");
    Json::Value list(Json::arrayValue);
    for (Router6PrefixAttr const& entry : prefixes.List()) {
      Json::Value item(Json::objectValue);
      item["prefix"] = entry.prefix;
      item["wan"] = entry.wan;
      item["lan"] = entry.lan;
      list.append(item);
    }
    Print(list);
    return 0;
  }
  if (sub == "allocate" || sub == "deallocate") {
    if (args.size() != 3) return Usage("ipv6-prefix " + sub + " PREFIX LAN");
    const bool ok = sub == "allocate" ? prefixes.Allocate(args[1], args[2])
                                      : prefixes.Deallocate(args[1], args[2]);
    if (!ok) {
      std::cerr << "vornnetdtool: ipv6-prefix " << sub << ": no free prefix " << args[1] << "\n";
      return 1;
    }
    return 0;
  }
  return Usage("unknown ipv6-prefix subcommand " + sub);
}

}  // namespace

// The IPv6 router commands; *handled is false for a command that is not one of them.
int RunIpv6Command(std::string const& cmd, std::vector<std::string> const& args, bool* handled) {
  *handled = cmd == "ipv6-router" || cmd == "ipv6-prefix";
  if (!*handled) return 1;
  try {
    return cmd == "ipv6-router" ? Router(args) : Prefix(args);
  } catch (std::exception const& e) {
    // A record whose prefix length is not a number, among others.
    std::cerr << "vornnetdtool: " << cmd << ": " << e.what() << "\n";
    return 1;
  }
}
