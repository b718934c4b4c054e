// vornnetdtool's routing commands over PolicyRoute and StaticRoute.
#include "route_commands.h"

#include <json/json.h>

#include <exception>
#include <iostream>
#include <iterator>
#include <string>
#include <vector>

#include "vornwireless/network/route/policy_route.h"
#include "vornwireless/network/route/static_route.h"

#pragma GCC diagnostic ignored "-Wdeprecated-declarations"

namespace vornnetdtool {

using vornnetwork::network::IP_TYPE;
using vornnetwork::network::IPTYPE_V4;
using vornnetwork::network::IPTYPE_V6;
using vornnetwork::network::PolicyRoute;
using vornnetwork::network::PolicyRouteRule;
using vornnetwork::network::StaticRoute;
using vornnetwork::network::StaticRouteRule;

const char kRouteUsage[] =
    "Routing tables (run in this process; FAMILY is -4 or -6):\n"
    "  route enable-table FAMILY NAME SOURCES      turn table NAME-table on for the comma list\n"
    "                                              of sources (\"all\" or networks)\n"
    "  route disable-table FAMILY NAME             flush NAME-table and turn it off\n"
    "  route add-rule FAMILY JSON | --ifname IF --name SECTION [--ip ADDR]\n"
    "                 [--mask MASK | --prefix-length N] [--gateway ADDR]\n"
    "                                              store a rule of IF's table (used at the\n"
    "                                              next enable-table)\n"
    "  route del-rule FAMILY NAME SECTION          remove a rule of NAME's table\n"
    "  route enabled-tables                        the tables that are on (asks vornnetd)\n"
    "  route set-static FAMILY JSON|-              replace the static rules (a JSON array;\n"
    "                                              - reads it from stdin)\n"
    "  route get-static FAMILY                     the static rules with their kernel state\n"
    "  route test-static FAMILY JSON               let the kernel check one static rule\n"
    "  route refresh-static                        rebuild static-table from the rule files\n"
    "  route tables FAMILY                         every table that is on, and main\n"
    "  route table FAMILY TABLE                    one table's routes (e.g. eth0-table)\n"
    "  --disable-route-table FAMILY NAME           as disable-table, as other programs call it\n"
    "  --del-policy-route-rule FAMILY NAME SECTION as del-rule, as other programs call it\n";

const char kRouteExamples[] =
    "  vornnetdtool route add-rule -4 --ifname eth0 --name office --ip 10.8.0.0 \\\n"
    "                --mask 255.255.0.0 --gateway 10.0.0.1\n"
    "  vornnetdtool route enable-table -4 eth0 10.1.0.0/24,10.2.0.0/24\n"
    "  vornnetdtool route set-static -4 '[{\"ifname\": \"eth0\", \"ip\": \"10.30.0.0\",\n"
    "                \"mask\": \"255.255.0.0\", \"gateway\": \"10.0.0.1\", \"enable\": true}]'\n"
    "  vornnetdtool route set-static -6 '[{\"ifname\": \"eth0\", \"ip\": \"2001:db8:5::\",\n"
    "                \"mask\": \"48\", \"gateway\": \"2001:db8::1\", \"enable\": true}]'\n"
    "  vornnetdtool route tables -4\n"
    "  vornnetdtool --disable-route-table -4 eth0\n";

namespace {

struct RouteUsageError {
  std::string message;
};

int Usage(std::string const& message) {
  std::cerr << "vornnetdtool: " << message << "\n(vornnetdtool --help for usage)\n";
  return 1;
}

int Failed(std::string const& what) {
  std::cerr << "vornnetdtool: " << what << " failed (details in the system log)\n";
  return 1;
}

int Print(Json::Value const& value) {
  std::cout << value.toStyledString();
  return 0;
}

IP_TYPE Family(std::string const& text) {
  if (text == "-4" || text == "4" || text == "v4" || text == "ipv4") return IPTYPE_V4;
  if (text == "-6" || text == "6" || text == "v6" || text == "ipv6") return IPTYPE_V6;
  throw RouteUsageError{"unknown family [" + text + "] (-4 or -6)"};
}

void NeedArgs(std::vector<std::string> const& args, size_t count, std::string const& form) {
  if (args.size() != count) throw RouteUsageError{"usage: " + form};
}

Json::Value ParseJson(std::string const& text) {
  Json::Reader reader;
  Json::Value value;
  if (!reader.parse(text, value, true)) throw RouteUsageError{"not JSON: " + text};
  return value;
}

std::string JsonText(Json::Value const& object, char const* key) {
  Json::Value const& value = object[key];
  if (value.isNull()) return std::string();
  if (value.isString()) return value.asString();
  if (value.isIntegral()) return value.asString();
  throw RouteUsageError{std::string("\"") + key + "\" must be a string"};
}

// A policy rule from a JSON object or from flags.
PolicyRouteRule PolicyRuleFrom(IP_TYPE type, std::vector<std::string> const& args) {
  PolicyRouteRule rule;
  rule.type = type;
  Json::Value object(Json::objectValue);
  if (args.size() == 1 && args[0].find('{') != std::string::npos) {
    object = ParseJson(args[0]);
    if (!object.isObject()) throw RouteUsageError{"the rule must be a JSON object"};
    if (!object["name"].isNull()) object["section"] = object["name"];
  } else {
    for (size_t i = 0; i < args.size(); ++i) {
      std::string const& flag = args[i];
      if (i + 1 >= args.size()) throw RouteUsageError{"option " + flag + " needs a value"};
      std::string const value = args[++i];
      if (flag == "--ifname") {
        object["ifname"] = value;
      } else if (flag == "--name" || flag == "--section") {
        object["section"] = value;
      } else if (flag == "--ip") {
        object["ip"] = value;
      } else if (flag == "--mask" || flag == "--prefix-length") {
        object["mask"] = value;
      } else if (flag == "--gateway") {
        object["gateway"] = value;
      } else {
        throw RouteUsageError{"unknown option " + flag};
      }
    }
  }
  rule.ifname = JsonText(object, "ifname");
  rule.name = JsonText(object, "section");
  rule.ip = JsonText(object, "ip");
  rule.gateway = JsonText(object, "gateway");
  std::string const mask = object.isMember("prefix_length") ? JsonText(object, "prefix_length")
                                                            : JsonText(object, "mask");
  if (type == IPTYPE_V6) {
    rule.prefix_length = mask;
  } else {
    rule.mask = mask;
  }
  if (rule.ifname.empty() || rule.name.empty()) {
    throw RouteUsageError{"a rule needs an interface (ifname) and a section name"};
  }
  return rule;
}

std::string ReadStdin() {
  return std::string(std::istreambuf_iterator<char>(std::cin), std::istreambuf_iterator<char>());
}

int Route(std::vector<std::string> const& args) {
  if (args.empty()) throw RouteUsageError{"route needs a subcommand"};
  std::string const sub = args[0];
  std::vector<std::string> rest(args.begin() + 1, args.end());

  if (sub == "enable-table") {
    NeedArgs(rest, 3, "route enable-table -4|-6 NAME SOURCES");
    PolicyRoute policy;
    if (policy.EnableTable(Family(rest[0]), rest[1], rest[2]) != 0) return Failed(sub);
    return 0;
  }
  if (sub == "disable-table") {
    NeedArgs(rest, 2, "route disable-table -4|-6 NAME");
    PolicyRoute policy;
    if (policy.DisableTable(Family(rest[0]), rest[1]) != 0) return Failed(sub);
    return 0;
  }
  if (sub == "add-rule") {
    if (rest.size() < 2) throw RouteUsageError{"usage: route add-rule -4|-6 JSON|FLAGS"};
    IP_TYPE const type = Family(rest[0]);
    PolicyRouteRule const rule =
        PolicyRuleFrom(type, std::vector<std::string>(rest.begin() + 1, rest.end()));
    PolicyRoute policy;
    if (policy.AddRule(rule) != 0) return Failed(sub);
    return 0;
  }
  if (sub == "del-rule") {
    NeedArgs(rest, 3, "route del-rule -4|-6 NAME SECTION");
    PolicyRoute policy;
    if (policy.DeleteRule(Family(rest[0]), rest[1], rest[2]) != 0) return Failed(sub);
    return 0;
  }
  if (sub == "enabled-tables") {
    NeedArgs(rest, 0, "route enabled-tables");
    PolicyRoute policy;
    Json::Value tables(Json::arrayValue);
    if (policy.GetEnableTables(tables) != 0) return Failed(sub);
    return Print(tables);
  }
  if (sub == "set-static") {
    NeedArgs(rest, 2, "route set-static -4|-6 JSON|-");
    IP_TYPE const type = Family(rest[0]);
    Json::Value rules = ParseJson(rest[1] == "-" ? ReadStdin() : rest[1]);
    if (!rules.isArray()) throw RouteUsageError{"the static rules must be a JSON array"};
    StaticRoute route;
    if (route.SetRules(type, rules) != 0) return Failed(sub);
    return 0;
  }
  if (sub == "get-static") {
    NeedArgs(rest, 1, "route get-static -4|-6");
    StaticRoute route;
    Json::Value rules(Json::arrayValue);
    if (route.GetRules(Family(rest[0]), rules) != 0) return Failed(sub);
    return Print(rules);
  }
  if (sub == "test-static") {
    NeedArgs(rest, 2, "route test-static -4|-6 JSON");
    IP_TYPE const type = Family(rest[0]);
    StaticRouteRule rule;
    std::string why;
    if (!StaticRoute::FromJson(type, ParseJson(rest[1]), rule, &why)) {
      throw RouteUsageError{"bad rule: " + why};
    }
    StaticRoute route;
    Json::Value result(Json::objectValue);
    if (route.TestRuleVaild(rule, result) != 0) return Failed(sub);
    return Print(result);
  }
  if (sub == "refresh-static") {
    NeedArgs(rest, 0, "route refresh-static");
    StaticRoute route;
    if (route.RefreshRules() != 0) return Failed(sub);
    return 0;
  }
  if (sub == "tables") {
    NeedArgs(rest, 1, "route tables -4|-6");
    StaticRoute route;
    Json::Value tables(Json::arrayValue);
    if (route.GetRouteTables(Family(rest[0]), tables) != 0) return Failed(sub);
    return Print(tables);
  }
  if (sub == "table") {
    NeedArgs(rest, 2, "route table -4|-6 TABLE");
    StaticRoute route;
    Json::Value info(Json::objectValue);
    if (route.GetTableInfo(Family(rest[0]), rest[1], info) != 0) return Failed(sub);
    return Print(info);
  }
  throw RouteUsageError{"unknown route subcommand " + sub};
}

}  // namespace

bool IsRouteCommand(std::string const& command) {
  return command == "route" || command == "--del-policy-route-rule" ||
         command == "--disable-route-table";
}

int RunRouteCommand(std::string const& command, std::vector<std::string> const& args) {
  try {
    if (command == "--del-policy-route-rule") {
      NeedArgs(args, 3, "--del-policy-route-rule -4|-6 NAME SECTION");
      PolicyRoute policy;
      if (policy.DeleteRule(Family(args[0]), args[1], args[2]) != 0) {
        return Failed("deleting the policy route rule");
      }
      return 0;
    }
    if (command == "--disable-route-table") {
      NeedArgs(args, 2, "--disable-route-table -4|-6 NAME");
      PolicyRoute policy;
      if (policy.DisableTable(Family(args[0]), args[1]) != 0) {
        return Failed("disabling the route table");
      }
      return 0;
    }
    return Route(args);
  } catch (RouteUsageError const& e) {
    return Usage(e.message);
  } catch (std::exception const& e) {
    std::cerr << "vornnetdtool: " << e.what() << "\n";
    return 1;
  }
}

}  // namespace vornnetdtool
