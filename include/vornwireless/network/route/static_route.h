// The administrator's static routes: one kernel table "static-table" (looked up for all traffic,
// see PolicyRoute) and its two rule files. No state: a set of operations for tools and the
// management layer, in their own processes; GetRouteTables/GetTableInfo ask vornnetd.
#ifndef VORNWIRELESS_NETWORK_ROUTE_STATIC_ROUTE_H
#define VORNWIRELESS_NETWORK_ROUTE_STATIC_ROUTE_H

#include <json/json.h>

#include <string>

#include "vornwireless/network/route/ip_type.h"
#include "vornwireless/network/route/route_rule.h"

#define VORN_STATIC_RULE_FILE "/etc/iproute2/config/static-table-rule"
#define VORN_STATIC_RULE_FILE_V6 "/etc/iproute2/config/static-table-rule-v6"

namespace vornnetwork {
namespace network {

class StaticRoute {
 public:
  StaticRoute() {}
  ~StaticRoute() {}

  // All 0 for success, -1 for failure.
  // Replaces the family's rules: flushes the table, rewrites the file, adds the enabled rules.
  int SetRules(IP_TYPE const& type, Json::Value& rules);
  // Appends the family's rules, each with "active" from the kernel table.
  int GetRules(IP_TYPE const& type, Json::Value& rules);
  int AddRule(StaticRouteRule const& rule);     // one kernel route in static-table
  int DeleteRule(StaticRouteRule const& rule);  // the same route removed
  // Lets the kernel validate the rule (added, then deleted); result["ip"] is the network.
  int TestRuleVaild(StaticRouteRule const& rule, Json::Value& result);
  // 0 when the kernel table holds the rule.
  int CheckRuleExist(StaticRouteRule const& rule);
  int RefreshRules();
  int RefreshIpv4Rules();
  int RefreshIpv6Rules();
  // Every table that is on (sorted by id) and "main" last, each as GetTableInfo gives it.
  int GetRouteTables(IP_TYPE const& type, Json::Value& tables);
  // {"name", "class", "rules": [{"ip", "mask", "gateway", "ifname", "metric"}, ...]}.
  int GetTableInfo(IP_TYPE const& type, std::string const& table, Json::Value& info);

  // The "ip route" destination of a rule (network/prefix); -1 when it has none.
  static int Destination(StaticRouteRule const& rule, std::string& destination);
  // Fills a rule from one JSON rule object; false (with *why) when a member has the wrong JSON
  // type or a text would break the rule file.
  static bool FromJson(IP_TYPE const& type, Json::Value const& value, StaticRouteRule& rule,
                       std::string* why);
  // Parses one line of "ip route show" into the working object (keys of earlier lines stay
  // where this line sets none). False for a line to leave out.
  static bool ParseRouteLine(IP_TYPE const& type, std::string const& line, Json::Value& route);
};

}  // namespace network
}  // namespace vornnetwork

#endif
