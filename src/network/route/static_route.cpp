// The static table: the administrator's routes, kept in two rule files and in the kernel table
// "static-table". The kernel is the validator of a route: a rule it refuses stays in the file,
// enabled and inactive.
#include "vornwireless/network/route/static_route.h"

#include <arpa/inet.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <exception>
#include <map>
#include <string>
#include <vector>

#include "vornplatform/file.h"
#include "vornplatform/log.h"
#include "vornplatform/proc.h"
#include "vornwireless/dbus_net/net_client.h"
#include "vornwireless/network/route/policy_route.h"
#include "vornwireless/network/utils.h"
#include "vornwireless/utils/config.h"

namespace vornnetwork {
namespace network {

using vornwireless::utils::ConfigSection;

namespace {

const char kIp[] = "/sbin/ip";
const int kExeclFlags = 187;
const char kStaticTable[] = "static-table";
const size_t kLineSize = 1024;

char const* Family(IP_TYPE const& type) { return type == IPTYPE_V6 ? "-6" : "-4"; }

char const* RuleFile(IP_TYPE const& type) {
  return type == IPTYPE_V6 ? VORN_STATIC_RULE_FILE_V6 : VORN_STATIC_RULE_FILE;
}

char const* MaskKey(IP_TYPE const& type) { return type == IPTYPE_V6 ? "prefix_length" : "mask"; }

std::string CommandText(std::initializer_list<char const*> args) {
  std::string text = kIp;
  for (char const* a : args) {
    text += ' ';
    text += a;
  }
  return text;
}

// "/sbin/ip args...": the exit status, negative when it could not run.
template <typename... Args>
int RunIp(std::string& text, Args... args) {
  text = CommandText({args...});
  return VLIBCExecl(kIp, kExeclFlags, args..., static_cast<char const*>(nullptr));
}

// A prefix length as decimal text within the family's range; -1 otherwise.
int ParsePrefix(std::string const& text, int max) {
  if (text.empty() || text.size() > 3 || text.find_first_not_of("0123456789") != std::string::npos) {
    return -1;
  }
  int value = std::atoi(text.c_str());
  return value <= max ? value : -1;
}

// The dotted netmask of a prefix length (0..32).
std::string NetmaskText(int prefix) {
  if (prefix < 0 || prefix > 32) prefix = 32;
  uint32_t bits = prefix == 0 ? 0 : 0xffffffffu << (32 - prefix);
  struct in_addr addr;
  addr.s_addr = htonl(bits);
  char text[INET_ADDRSTRLEN] = "";
  inet_ntop(AF_INET, &addr, text, sizeof text);
  return text;
}

// A text that a rule file can keep on one line.
bool IsStorable(std::string const& text) {
  for (unsigned char c : text) {
    if (c < ' ' || c == 0x7f) return false;
  }
  return true;
}

// The member as text: absent or null is "", a string as it is, an integer in decimal (only
// where allowed); false for any other JSON type.
bool MemberText(Json::Value const& object, char const* key, bool integerAllowed,
                std::string& out) {
  Json::Value const& value = object[key];
  if (value.isNull()) {
    out.clear();
  } else if (value.isString()) {
    out = value.asString();
  } else if (integerAllowed && value.isIntegral()) {
    out = value.isUInt64() ? std::to_string(value.asUInt64()) : std::to_string(value.asInt64());
  } else {
    return false;
  }
  return IsStorable(out);
}

// The class of a table's interface as the daemon's gateway lists know it; "unknown" otherwise.
std::string ClassOfTable(std::string const& table) {
  if (table == "main" || table == kStaticTable) return "unknown";
  std::string const ifname = table.substr(0, table.find('-'));
  vornnetwork::dbus::NetClient client;
  Json::Value request(Json::objectValue);
  Json::Value answer;
  request["type"] = "GTYPE_V4";
  request["ifname"] = ifname;
  if (client.GetGatewayDataByInterface(request, answer) < 0) {
    VORN_LOG(LOG_ERR, "Failed to get interface data from gateway list");
    return "unknown";
  }
  if (!answer.isObject() || !answer["exist"].isBool() || !answer["exist"].asBool()) {
    request["type"] = "GTYPE_V6";
    answer = Json::Value();
    if (client.GetGatewayDataByInterface(request, answer) < 0) {
      VORN_LOG(LOG_ERR, "Failed to get interface data from gateway list");
      return "unknown";
    }
  }
  if (answer.isObject() && answer["class"].isString()) return answer["class"].asString();
  return "unknown";
}

}  // namespace

int StaticRoute::Destination(StaticRouteRule const& rule, std::string& destination) {
  if (rule.type == IPTYPE_V4) {
    return GetSubnetFormat(rule.ip.ToString(), rule.mask.ToString(), destination) == 0 ? 0 : -1;
  }
  if (rule.type != IPTYPE_V6) return -1;
  int const prefix = ParsePrefix(rule.prefix_length, 128);
  if (prefix < 0) {
    VORN_LOG(LOG_ERR, "Invalid prefix length [%.16s]", rule.prefix_length.c_str());
    return -1;
  }
  std::string const network =
      vornwireless::utils::IPAddress::GetIPv6NetworkPart(rule.ip.ToString(), prefix);
  if (network.empty()) return -1;
  destination = network + "/" + rule.prefix_length;
  return 0;
}

bool StaticRoute::FromJson(IP_TYPE const& type, Json::Value const& value, StaticRouteRule& rule,
                           std::string* why) {
  auto fail = [why](std::string const& text) {
    if (why != nullptr) *why = text;
    return false;
  };
  if (!value.isObject()) return fail("a rule is not a JSON object");
  std::string ifname, ip, gateway, mask;
  if (!MemberText(value, "ifname", false, ifname)) return fail("bad \"ifname\"");
  if (!MemberText(value, "ip", false, ip)) return fail("bad \"ip\"");
  if (!MemberText(value, "gateway", false, gateway)) return fail("bad \"gateway\"");
  if (!MemberText(value, "mask", true, mask)) return fail("bad \"mask\"");
  Json::Value const& enable = value["enable"];
  if (!enable.isNull() && !enable.isBool()) return fail("\"enable\" is not true or false");
  rule = StaticRouteRule();
  rule.type = type;
  rule.ifname = ifname;
  rule.ip = ip;
  rule.gateway = gateway;
  if (type == IPTYPE_V6) {
    rule.prefix_length = mask;
  } else {
    rule.mask = mask;
  }
  rule.enable = enable.isBool() && enable.asBool();
  return true;
}

int StaticRoute::AddRule(StaticRouteRule const& rule) {
  std::string destination;
  if (Destination(rule, destination) != 0) return -1;
  std::string text;
  if (RunIp(text, Family(rule.type), "route", "add", "to", destination.c_str(), "via",
            rule.gateway.ToCString(), "dev", rule.ifname.c_str(), "table", kStaticTable) != 0) {
    VORN_LOG(LOG_ERR, "Failed to execute command[%s]", text.c_str());
    return -1;
  }
  return 0;
}

int StaticRoute::DeleteRule(StaticRouteRule const& rule) {
  std::string destination;
  if (Destination(rule, destination) != 0) return -1;
  std::string text;
  if (RunIp(text, Family(rule.type), "route", "del", "to", destination.c_str(), "via",
            rule.gateway.ToCString(), "dev", rule.ifname.c_str(), "table", kStaticTable) != 0) {
    return -1;
  }
  return 0;
}

int StaticRoute::TestRuleVaild(StaticRouteRule const& rule, Json::Value& result) {
  // The kernel is the validator: the probe route lives only for this moment.
  if (AddRule(rule) != 0) return -1;
  if (DeleteRule(rule) != 0) return -1;
  std::string destination;
  if (Destination(rule, destination) != 0) return -1;
  char address[kLineSize] = "";
  int prefix = 0;
  if (std::sscanf(destination.c_str(), "%1023[^/]/%d", address, &prefix) < 1) return -1;
  result["ip"] = address;
  return 0;
}

int StaticRoute::CheckRuleExist(StaticRouteRule const& rule) {
  std::string first;
  if (rule.type == IPTYPE_V6) {
    // The address as given, not cut to its network part.
    first = rule.prefix_length == "128" ? rule.ip.ToString()
                                        : rule.ip.ToString() + "/" + rule.prefix_length;
  } else {
    if (Destination(rule, first) != 0) return -1;
    std::string::size_type slash = first.find('/');
    if (slash != std::string::npos && first.substr(slash + 1) == "32") first.erase(slash);
  }
  FILE* fp = VLIBCPopen(kIp, "r", Family(rule.type), "route", "show", "table", kStaticTable,
                        static_cast<char const*>(nullptr));
  if (fp == nullptr) {
    VORN_LOG(LOG_ERR, "Failed to execute cmd [/sbin/ip route show table static-table]");
    return -1;
  }
  std::string const pattern =
      first + " via " + rule.gateway.ToString() + " dev " + rule.ifname;
  int result = -1;
  char line[kLineSize];
  while (std::fgets(line, sizeof line, fp) != nullptr) {
    if (std::strstr(line, pattern.c_str()) != nullptr) {
      result = 0;
      break;
    }
  }
  VLIBCPclose(fp);
  return result;
}

int StaticRoute::GetRules(IP_TYPE const& type, Json::Value& rules) {
  char const* path = RuleFile(type);
  if (VLIBCFileExist(path) != 1) return 0;
  ConfigSection config(path);
  if (config.Read() != 0) {
    VORN_LOG(LOG_ERR, "Failed to read config [%s]", VORN_STATIC_RULE_FILE);
    return -1;
  }
  if (!rules.isArray()) rules = Json::Value(Json::arrayValue);
  // String order of the section names: "0", "1", "10", "2", ...
  for (auto const& section : config.GetKeyValues()) {
    std::map<std::string, std::string> keys = section.second;
    StaticRouteRule rule;
    rule.type = type;
    rule.ifname = keys["ifname"];
    rule.ip = keys["ip"];
    rule.gateway = keys["gateway"];
    if (type == IPTYPE_V6) {
      rule.prefix_length = keys["prefix_length"];
    } else {
      rule.mask = keys["mask"];
    }
    rule.enable = keys["enable"] == "yes";
    // A disabled rule is inactive without the kernel being asked.
    bool const active = rule.enable && CheckRuleExist(rule) == 0;
    Json::Value entry(Json::objectValue);
    entry["ifname"] = keys["ifname"];
    entry["ip"] = keys["ip"];
    entry["gateway"] = keys["gateway"];
    entry["mask"] = keys[MaskKey(type)];
    entry["enable"] = rule.enable;
    entry["active"] = active ? "Enabled" : "Disabled";
    rules.append(entry);
  }
  return 0;
}

int StaticRoute::SetRules(IP_TYPE const& type, Json::Value& rules) {
  if (type != IPTYPE_V4 && type != IPTYPE_V6) return -1;
  // The whole array is checked before the table or the file is touched.
  if (!rules.isNull() && !rules.isArray()) {
    VORN_LOG(LOG_ERR, "Bad parameter: the rules are not an array");
    return -1;
  }
  std::vector<StaticRouteRule> parsed;
  for (Json::ArrayIndex i = 0; i < rules.size(); ++i) {
    StaticRouteRule rule;
    std::string why;
    if (!FromJson(type, rules[i], rule, &why)) {
      VORN_LOG(LOG_ERR, "Bad parameter: rule %u: %s", i, why.c_str());
      return -1;
    }
    parsed.push_back(rule);
  }

  std::string text;
  if (RunIp(text, Family(type), "route", "flush", "table", kStaticTable) < 0) {
    VORN_LOG(LOG_ERR, "Failed to execute command[%s]", text.c_str());
    return -1;
  }
  // A fresh file replaces the old one whole (atomically, so a failed write keeps the old one).
  char const* path = RuleFile(type);
  ConfigSection config(path);
  for (size_t i = 0; i < parsed.size(); ++i) {
    StaticRouteRule const& rule = parsed[i];
    // A rule the kernel refuses stays in the file, inactive.
    if (rule.enable) AddRule(rule);
    std::string const section = std::to_string(i);
    config.AddKeyValue(section, "ifname", rule.ifname);
    config.AddKeyValue(section, "ip", rule.ip.ToString());
    config.AddKeyValue(section, "gateway", rule.gateway.ToString());
    config.AddKeyValue(section, MaskKey(type),
                       type == IPTYPE_V6 ? rule.prefix_length : rule.mask.ToString());
    config.AddKeyValue(section, "enable", rule.enable);
  }
  if (config.Write() != 0) {
    VORN_LOG(LOG_ERR, "Failed to set topology file[%s]", path);
    return -1;
  }
  return 0;
}

int StaticRoute::RefreshIpv4Rules() {
  std::string text;
  if (RunIp(text, "route", "flush", "table", kStaticTable) < 0) return -1;
  Json::Value rules(Json::arrayValue);
  if (GetRules(IPTYPE_V4, rules) != 0) return -1;
  for (Json::Value const& value : rules) {
    StaticRouteRule rule;
    if (!FromJson(IPTYPE_V4, value, rule, nullptr) || !rule.enable) continue;
    AddRule(rule);
  }
  return 0;
}

int StaticRoute::RefreshIpv6Rules() {
  std::string text;
  if (RunIp(text, "-6", "route", "flush", "table", kStaticTable) < 0) return -1;
  Json::Value rules(Json::arrayValue);
  if (GetRules(IPTYPE_V6, rules) != 0) return -1;
  for (Json::Value const& value : rules) {
    StaticRouteRule rule;
    if (!FromJson(IPTYPE_V6, value, rule, nullptr) || !rule.enable) continue;
    AddRule(rule);
  }
  return 0;
}

int StaticRoute::RefreshRules() {
  if (RefreshIpv4Rules() != 0) {
    VORN_LOG(LOG_ERR, "Failed to refresh ipv4 rules");
    return -1;
  }
  if (RefreshIpv6Rules() != 0) {
    VORN_LOG(LOG_ERR, "Failed to refresh ipv6 rules");
    return -1;
  }
  return 0;
}

int StaticRoute::GetRouteTables(IP_TYPE const& type, Json::Value& tables) {
  Json::Value enabled(Json::arrayValue);
  PolicyRoute policyRoute;
  if (policyRoute.GetEnableTables(enabled) != 0) return -1;
  std::vector<std::pair<int, std::string>> sorted;
  for (Json::Value const& table : enabled) {
    sorted.emplace_back(std::atoi(table["id"].asString().c_str()), table["name"].asString());
  }
  std::stable_sort(sorted.begin(), sorted.end(),
                   [](std::pair<int, std::string> const& a,
                      std::pair<int, std::string> const& b) { return a.first < b.first; });
  std::vector<std::string> names;
  for (auto const& entry : sorted) names.push_back(entry.second);
  names.push_back("main");
  if (!tables.isArray()) tables = Json::Value(Json::arrayValue);
  for (std::string const& name : names) {
    Json::Value info(Json::objectValue);
    if (GetTableInfo(type, name, info) != 0) return -1;
    tables.append(info);
  }
  return 0;
}

bool StaticRoute::ParseRouteLine(IP_TYPE const& type, std::string const& line,
                                 Json::Value& route) {
  char words[5][kLineSize];
  for (auto& w : words) w[0] = '\0';
  std::sscanf(line.c_str(), "%1023s %1023s %1023s %1023s %1023s", words[0], words[1], words[2],
              words[3], words[4]);
  std::string const destination = words[0];
  if (type == IPTYPE_V4) {
    if (destination.compare(0, 7, "default") == 0) {
      route["ip"] = destination;
      route["mask"] = "0.0.0.0";
    } else {
      char address[kLineSize] = "";
      int prefix = 0;
      std::sscanf(destination.c_str(), "%1023[^/]/%d", address, &prefix);
      // A missing prefix is a host route.
      if (prefix == 0) prefix = 32;
      route["ip"] = address;
      route["mask"] = NetmaskText(prefix);
    }
  } else {
    route["ip"] = destination;
  }
  std::string const w2(words[1], std::min<size_t>(3, std::strlen(words[1])));
  if (w2 == "via") {
    route["gateway"] = words[2];
    route["ifname"] = words[4];
  } else if (w2 == "dev") {
    route["gateway"] = type == IPTYPE_V6 ? "::" : "0.0.0.0";
    route["ifname"] = words[2];
  }
  // Any other word sets neither: the keys keep what an earlier line left.

  std::vector<std::string> tokens;
  std::string token;
  for (char c : line) {
    if (c == ' ' || c == '\t' || c == '\n' || c == '\r') {
      if (!token.empty()) tokens.push_back(token);
      token.clear();
    } else {
      token += c;
    }
  }
  if (!token.empty()) tokens.push_back(token);
  std::string metric = "0";
  for (size_t i = 0; i < tokens.size(); ++i) {
    if (tokens[i] == "metric") {
      if (i + 1 < tokens.size()) metric = tokens[i + 1];
      break;
    }
  }
  route["metric"] = metric;
  // The cluster heartbeat interface is never shown.
  return !(route.isMember("ifname") && route["ifname"].isString() &&
           route["ifname"].asString() == "mon.hb0");
}

int StaticRoute::GetTableInfo(IP_TYPE const& type, std::string const& table, Json::Value& info) {
  if (!info.isObject()) info = Json::Value(Json::objectValue);
  info["name"] = table;
  info["class"] = ClassOfTable(table);
  info["rules"] = Json::Value(Json::arrayValue);
  FILE* fp = VLIBCPopen(kIp, "r", Family(type), "route", "show", "table", table.c_str(),
                        static_cast<char const*>(nullptr));
  if (fp == nullptr) {
    VORN_LOG(LOG_ERR, "Failed to execute cmd [/sbin/ip]");
    return -1;
  }
  Json::Value& rules = info["rules"];
  Json::Value route(Json::objectValue);
  char line[kLineSize];
  while (std::fgets(line, sizeof line, fp) != nullptr) {
    if (ParseRouteLine(type, line, route)) rules.append(route);
  }
  // A table without routes makes ip fail ("FIB table does not exist"): it is shown empty.
  VLIBCPclose(fp);
  return 0;
}

}  // namespace network
}  // namespace vornnetwork
