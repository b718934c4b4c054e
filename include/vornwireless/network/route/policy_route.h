// Per-interface routing tables and the static table. A table is known by a short name ("static",
// "eth0"); its kernel name is that name plus "-table". Three things are kept in step: the table
// registry "/etc/iproute2/config/multi_table_config", the kernel's name file
// "/etc/iproute2/rt_tables", and the kernel's rules and routes. Short-lived: create one on the
// stack for a series of calls.
#ifndef VORNWIRELESS_NETWORK_ROUTE_POLICY_ROUTE_H
#define VORNWIRELESS_NETWORK_ROUTE_POLICY_ROUTE_H

#include <json/json.h>

#include <string>

#include "vornwireless/network/route/ip_type.h"
#include "vornwireless/network/route/route_rule.h"
#include "vornwireless/utils/lock.h"

#define VORN_MULTI_TABLE_CONFIG "/etc/iproute2/config/multi_table_config"
#define VORN_RT_TABLES_FILE "/etc/iproute2/rt_tables"
#define VORN_RT_TABLES_LOCK "/tmp/lock/lock_rt_tables"
#define VORN_ROUTE_CONFIG_DIR "/etc/iproute2/config/"

namespace vornnetwork {
namespace network {

class PolicyRoute {
 public:
  PolicyRoute();
  ~PolicyRoute() = default;
  PolicyRoute(PolicyRoute const&) = delete;
  PolicyRoute& operator=(PolicyRoute const&) = delete;

  // Turns the table `name` on for the family, looked up for each source of the comma list
  // `source`. A table other than "static" without rules stays off (0). 0, negative on failure.
  int EnableTable(IP_TYPE const& type, std::string const& name, std::string const& source);
  // Flushes the table's routes and lookup rules and marks it off for the family.
  int DisableTable(IP_TYPE const& type, std::string const& name);
  // Stores a rule in the section rule.name of its interface's rule file; the kernel is not
  // touched until the table is enabled again.
  int AddRule(PolicyRouteRule const& rule);
  // Removes the section from the rule file of table `name`; a missing file is 0.
  int DeleteRule(IP_TYPE const& type, std::string const& name, std::string const& section);
  // Appends {"name", "id"} of each table that is on and whose interface the daemon knows
  // (asks vornnetd: never call from inside the daemon).
  int GetEnableTables(Json::Value& tables);

  // Steps.
  int InitMaxID();
  int ConfigWrite(IP_TYPE const& type, std::string const& table, std::string const& source,
                  bool const& enable);
  int SetTableLookupRule(IP_TYPE const& type, std::string const& table);
  int SetTableRouteRule(IP_TYPE const& type, std::string const& ruleFile);
  int FlushTableRule(IP_TYPE const& type, std::string const& table);
  int FlushTableLookupRule(IP_TYPE const& type, std::string const& table);
  // A rule file name is resolved under "/etc/iproute2/config/".
  bool IsRulesEmpty(std::string const& ruleFile);

  int GetMaxID() const { return _maxId; }

  // The rule file of a table's short name and family ("eth0-table-rule", "...-v6"); empty for
  // an unknown family.
  static std::string RuleFileName(IP_TYPE const& type, std::string const& name);
  // A table short name or section name that can be stored in the registry, rt_tables and a
  // rule file's path: not empty, no blank, control character, '[', ']', '=' or '/'.
  static bool IsValidName(std::string const& name);
  // One source of a lookup rule: "all", "any", "default", or an address of the family with an
  // optional prefix length.
  static bool IsValidSource(IP_TYPE const& type, std::string const& source);

 private:
  int _maxId;
  vornwireless::utils::FileLock _lock;
};

}  // namespace network
}  // namespace vornnetwork

#endif
