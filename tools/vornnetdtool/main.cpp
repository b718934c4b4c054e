// vornnetdtool: a command-line client of the network daemon over NetClient. Exit status 0 on
// success; 1 with the error on stderr otherwise (a usage error included).
#include <json/json.h>
#include <syslog.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <exception>
#include <iostream>
#include <string>
#include <vector>

#include "auth_commands.h"
#include "route_commands.h"
#include "vornwireless/dbus_net/net_client.h"

#pragma GCC diagnostic ignored "-Wdeprecated-declarations"

// The IPv6 router commands (ipv6_commands.cpp).
int RunIpv6Command(std::string const& cmd, std::vector<std::string> const& args, bool* handled);

namespace {

using vornnetwork::dbus::NetClient;

const char kUsage[] =
    "usage: vornnetdtool COMMAND [ARGS]\n"
    "\n"
    "Client of the network daemon vornnetd (D-Bus com.vornlink.net). Requests are JSON objects\n"
    "given as one argument, or built from the flags. TYPE is v4, v6, all, GTYPE_V4, GTYPE_V6\n"
    "or ALL.\n"
    "\n"
    "Gateways:\n"
    "  gateway list [--type TYPE] | JSON          the gateway list, in priority order\n"
    "  gateway get IFNAME [--type TYPE] | JSON    one interface's entry\n"
    "  gateway add JSON | --ifname IF [--type TYPE] [--priority N] [--gateway ADDR]\n"
    "                     [--dns ADDR] [--class CLASS]    an absent value keeps the stored one\n"
    "  gateway del JSON | --ifname IF [--type TYPE]\n"
    "  gateway set-slave JSON | --ifname IF [--type TYPE] --slave true|false\n"
    "  gateway copy JSON | --from IF --to IF [--type TYPE] [--delete-source]\n"
    "  gateway refresh [TYPE | JSON]               recompute the default route (default all)\n"
    "  --refresh-gateway TYPE                      the same, as other programs call it\n"
    "\n"
    "Devices:\n"
    "  device list [all|upnp|nc|wifi]              the devices seen on the network\n"
    "  device set JSON | --mac MAC --name NAME --device-type TYPE\n"
    "  device del MAC\n"
    "\n"
    "IPv6:\n"
    "  reset-ipv6 IFNAME                           forget the interface's router advertisement\n"
    "  ipv6-router create TYPE [JSON]              bring up an IPv6 router: TYPE off, native,\n"
    "                                              6in4 or 6to4; JSON {\"wan\": ..., ...}\n"
    "  ipv6-router destroy WAN                     end the router of a WAN and remove its record\n"
    "  ipv6-router show WAN                        the router record of a WAN\n"
    "  ipv6-router wan-address WAN IPV4            reconfigure after the WAN's address changed\n"
    "  ipv6-prefix list                            the /64 prefixes of the routers and their LANs\n"
    "  ipv6-prefix allocate|deallocate PREFIX LAN  give a prefix to a LAN or take it back\n"
    "\n"
    "802.1X:\n"
    "  8021x SUBCOMMAND JSON                       port authentication of a wired interface\n"
    "                                              (vornnetdtool 8021x --help)\n"
    "\n"
    "  --help                                      this text\n"
    "\n"
    "Examples:\n"
    "  vornnetdtool gateway add --ifname eth0 --type v4 --priority 0 --gateway 10.0.0.1\n"
    "  vornnetdtool gateway get eth0\n"
    "  vornnetdtool gateway list '{\"type\": \"GTYPE_V6\"}'\n"
    "  vornnetdtool --refresh-gateway all\n";

struct UsageError {
  std::string message;
};

int Fail(NetClient const& client, std::string const& what) {
  std::string message = client.LastErrorMessage();
  if (message.empty()) message = "no answer from vornnetd";
  std::cerr << "vornnetdtool: " << what << ": " << message << "\n";
  return 1;
}

std::string GatewayType(std::string const& text) {
  if (text == "v4" || text == "V4" || text == "ipv4" || text == "4") return "GTYPE_V4";
  if (text == "v6" || text == "V6" || text == "ipv6" || text == "6") return "GTYPE_V6";
  if (text == "all" || text == "ALL") return "ALL";
  if (text == "GTYPE_V4" || text == "GTYPE_V6") return text;
  throw UsageError{"unknown type [" + text + "] (v4, v6 or all)"};
}

Json::Value ParseObject(std::string const& text) {
  Json::Reader reader;
  Json::Value value;
  if (!reader.parse(text, value, true) || !value.isObject()) {
    throw UsageError{"not a JSON object: " + text};
  }
  return value;
}

bool LooksLikeJson(std::string const& text) {
  size_t i = text.find_first_not_of(" \t\n");
  return i != std::string::npos && text[i] == '{';
}

// Flags of the form --name VALUE (or --name alone for the booleans in `switches`).
struct Flags {
  std::vector<std::string> positional;
  Json::Value values{Json::objectValue};
};

Flags ParseFlags(std::vector<std::string> const& args, std::vector<std::string> const& known,
                 std::vector<std::string> const& switches = {}) {
  Flags flags;
  for (size_t i = 0; i < args.size(); ++i) {
    std::string const& a = args[i];
    if (a.rfind("--", 0) != 0) {
      flags.positional.push_back(a);
      continue;
    }
    std::string name = a.substr(2);
    bool isSwitch = false;
    for (auto const& s : switches) isSwitch = isSwitch || s == name;
    if (isSwitch) {
      flags.values[name] = true;
      continue;
    }
    bool isKnown = false;
    for (auto const& k : known) isKnown = isKnown || k == name;
    if (!isKnown) throw UsageError{"unknown option " + a};
    if (i + 1 >= args.size()) throw UsageError{"option " + a + " needs a value"};
    flags.values[name] = args[++i];
  }
  return flags;
}

std::string Str(Flags const& f, const char* name, std::string const& fallback = "") {
  return f.values.isMember(name) ? f.values[name].asString() : fallback;
}

void NeedNoPositional(Flags const& f) {
  if (!f.positional.empty()) throw UsageError{"unexpected argument " + f.positional[0]};
}

int PrintResult(Json::Value const& result) {
  std::cout << result.toStyledString();
  return 0;
}

// One argument that is a JSON object is the request itself; otherwise the flags build it.
bool JsonRequest(std::vector<std::string> const& args, Json::Value& request) {
  if (args.size() == 1 && LooksLikeJson(args[0])) {
    request = ParseObject(args[0]);
    return true;
  }
  return false;
}

int Gateway(NetClient& client, std::vector<std::string> const& args) {
  if (args.empty()) throw UsageError{"gateway needs a subcommand"};
  std::string const sub = args[0];
  std::vector<std::string> rest(args.begin() + 1, args.end());
  Json::Value request(Json::objectValue);
  bool json = JsonRequest(rest, request);

  if (sub == "list") {
    if (!json) {
      Flags f = ParseFlags(rest, {"type"});
      NeedNoPositional(f);
      request["type"] = GatewayType(Str(f, "type", "v4"));
    }
    Json::Value result;
    if (client.GetGatewayListData(request, result) < 0) return Fail(client, "gateway list");
    return PrintResult(result);
  }
  if (sub == "get") {
    if (!json) {
      Flags f = ParseFlags(rest, {"type", "ifname"});
      std::string ifname = Str(f, "ifname");
      if (ifname.empty() && f.positional.size() == 1)
        ifname = f.positional[0];
      else
        NeedNoPositional(f);
      if (ifname.empty()) throw UsageError{"gateway get needs an interface"};
      request["type"] = GatewayType(Str(f, "type", "v4"));
      request["ifname"] = ifname;
    }
    Json::Value result;
    if (client.GetGatewayDataByInterface(request, result) < 0) return Fail(client, "gateway get");
    return PrintResult(result);
  }
  if (sub == "add") {
    if (!json) {
      Flags f = ParseFlags(rest, {"type", "ifname", "priority", "gateway", "dns", "class"});
      NeedNoPositional(f);
      if (Str(f, "ifname").empty()) throw UsageError{"gateway add needs --ifname"};
      request["type"] = GatewayType(Str(f, "type", "v4"));
      request["ifname"] = Str(f, "ifname");
      std::string prio = Str(f, "priority", "-1");
      char* end = nullptr;
      long p = std::strtol(prio.c_str(), &end, 10);
      if (prio.empty() || *end != '\0') throw UsageError{"--priority needs a number"};
      request["priority"] = static_cast<int>(p);
      request["gateway"] = Str(f, "gateway", "NULL");
      request["dns"] = Str(f, "dns", "NULL");
      request["class"] = Str(f, "class", "NULL");
    }
    if (client.AddGatewayData(request) < 0) return Fail(client, "gateway add");
    return 0;
  }
  if (sub == "del") {
    if (!json) {
      Flags f = ParseFlags(rest, {"type", "ifname"});
      std::string ifname = Str(f, "ifname");
      if (ifname.empty() && f.positional.size() == 1)
        ifname = f.positional[0];
      else
        NeedNoPositional(f);
      if (ifname.empty()) throw UsageError{"gateway del needs an interface"};
      request["type"] = GatewayType(Str(f, "type", "v4"));
      request["ifname"] = ifname;
    }
    if (client.DelGatewayData(request) < 0) return Fail(client, "gateway del");
    return 0;
  }
  if (sub == "set-slave") {
    if (!json) {
      Flags f = ParseFlags(rest, {"type", "ifname", "slave"});
      NeedNoPositional(f);
      std::string slave = Str(f, "slave");
      if (Str(f, "ifname").empty() || (slave != "true" && slave != "false")) {
        throw UsageError{"gateway set-slave needs --ifname and --slave true|false"};
      }
      request["type"] = GatewayType(Str(f, "type", "v4"));
      request["ifname"] = Str(f, "ifname");
      request["slave"] = slave == "true";
    }
    if (client.SetSlaveData(request) < 0) return Fail(client, "gateway set-slave");
    return 0;
  }
  if (sub == "copy") {
    if (!json) {
      Flags f = ParseFlags(rest, {"type", "from", "to"}, {"delete-source"});
      NeedNoPositional(f);
      if (Str(f, "from").empty() || Str(f, "to").empty()) {
        throw UsageError{"gateway copy needs --from and --to"};
      }
      request["type"] = GatewayType(Str(f, "type", "v4"));
      request["interface_source"] = Str(f, "from");
      request["interface_destination"] = Str(f, "to");
      request["interface_source_delete"] = f.values.isMember("delete-source");
    }
    if (client.CopyGatewayData(request) < 0) return Fail(client, "gateway copy");
    return 0;
  }
  if (sub == "refresh") {
    if (!json) {
      if (rest.size() > 1) throw UsageError{"gateway refresh takes one type"};
      request["type"] = GatewayType(rest.empty() ? "all" : rest[0]);
    }
    if (client.RefreshGateway(request) < 0) return Fail(client, "gateway refresh");
    return 0;
  }
  throw UsageError{"unknown gateway subcommand " + sub};
}

int Device(NetClient& client, std::vector<std::string> const& args) {
  if (args.empty()) throw UsageError{"device needs a subcommand"};
  std::string const sub = args[0];
  std::vector<std::string> rest(args.begin() + 1, args.end());
  if (sub == "list" || sub == "get") {
    if (rest.size() > 1) throw UsageError{"device list takes one scanner type"};
    Json::Value result;
    if (client.GetDeviceListData(rest.empty() ? "all" : rest[0], result) < 0) {
      return Fail(client, "device list");
    }
    return PrintResult(result);
  }
  if (sub == "set") {
    Json::Value request(Json::objectValue);
    if (!JsonRequest(rest, request)) {
      Flags f = ParseFlags(rest, {"mac", "name", "device-type"});
      NeedNoPositional(f);
      if (Str(f, "mac").empty()) throw UsageError{"device set needs --mac"};
      request["macAddr"] = Str(f, "mac");
      request["userdef_displayName"] = Str(f, "name");
      request["userdef_deviceType"] = Str(f, "device-type");
    }
    if (client.SetDeviceListData(request) < 0) return Fail(client, "device set");
    return 0;
  }
  if (sub == "del") {
    if (rest.size() != 1) throw UsageError{"device del needs one MAC address"};
    if (client.DelDeviceListData(rest[0]) < 0) return Fail(client, "device del");
    return 0;
  }
  throw UsageError{"unknown device subcommand " + sub};
}

int Run(std::vector<std::string> const& args) {
  if (args.empty()) throw UsageError{"no command"};
  std::string const cmd = args[0];
  std::vector<std::string> rest(args.begin() + 1, args.end());
  if (cmd == "--help" || cmd == "-h" || cmd == "help") {
    std::cout << kUsage << "\n" << vornnetdtool::kRouteUsage << "\nRouting examples:\n"
              << vornnetdtool::kRouteExamples;
    return 0;
  }
  if (vornnetdtool::IsRouteCommand(cmd)) return vornnetdtool::RunRouteCommand(cmd, rest);
  bool ipv6Command = false;
  const int ipv6Status = RunIpv6Command(cmd, rest, &ipv6Command);
  if (ipv6Command) return ipv6Status;
  if (cmd == "8021x") return vornnetdtool::Auth8021XCommand(rest);
  NetClient client;
  if (cmd == "--refresh-gateway") {
    if (rest.size() != 1) throw UsageError{"--refresh-gateway needs one type"};
    Json::Value request(Json::objectValue);
    request["type"] = GatewayType(rest[0]);
    if (client.RefreshGateway(request) < 0) return Fail(client, "refresh gateway");
    return 0;
  }
  if (cmd == "gateway") return Gateway(client, rest);
  if (cmd == "device") return Device(client, rest);
  if (cmd == "reset-ipv6") {
    if (rest.size() != 1) throw UsageError{"reset-ipv6 needs one interface"};
    if (client.ResetIPv6Module(rest[0]) < 0) return Fail(client, "reset-ipv6");
    return 0;
  }
  throw UsageError{"unknown command " + cmd};
}

}  // namespace

int main(int argc, char** argv) {
  openlog("vornnetdtool", LOG_PID, LOG_USER);
  std::vector<std::string> args(argv + 1, argv + argc);
  try {
    return Run(args);
  } catch (UsageError const& e) {
    std::cerr << "vornnetdtool: " << e.message << "\n(vornnetdtool --help for usage)\n";
    return 1;
  } catch (std::exception const& e) {
    std::cerr << "vornnetdtool: " << e.what() << "\n";
    return 1;
  }
}
