// Per-interface routing tables: the registry, the kernel's table names, lookup rules and routes.
// Table numbers are also the priorities of the lookup rules, so a later table has a lower
// precedence; the static table is always number 2.
#include "vornwireless/network/route/policy_route.h"

#include <arpa/inet.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <boost/algorithm/string/classification.hpp>
#include <boost/algorithm/string/split.hpp>
#include <cstdlib>
#include <exception>
#include <string>
#include <vector>

#include "vornplatform/file.h"
#include "vornplatform/log.h"
#include "vornplatform/proc.h"
#include "vornwireless/dbus_net/net_client.h"
#include "vornwireless/network/route/static_route.h"
#include "vornwireless/network/utils.h"
#include "vornwireless/utils/config.h"
#include "vornwireless/utils/file.h"

namespace vornnetwork {
namespace network {

using vornwireless::utils::ConfigSection;

namespace {

const char kIp[] = "/sbin/ip";
const int kExeclFlags = 187;
const char kStaticName[] = "static";
const char kStaticTable[] = "static-table";
const char kTableSuffix[] = "-table";

char const* Family(IP_TYPE const& type) { return type == IPTYPE_V6 ? "-6" : "-4"; }

// The command line of a run, for the log.
std::string CommandText(std::initializer_list<char const*> args) {
  std::string text = kIp;
  for (char const* a : args) {
    text += ' ';
    text += a;
  }
  return text;
}

// "/sbin/ip -4|-6 args...": the exit status, negative when it could not run.
template <typename... Args>
int RunIp(IP_TYPE const& type, std::string& text, Args... args) {
  text = CommandText({Family(type), args...});
  return VLIBCExecl(kIp, kExeclFlags, Family(type), args..., static_cast<char const*>(nullptr));
}

std::vector<std::string> SplitSources(std::string const& list) {
  std::vector<std::string> parts;
  boost::algorithm::split(parts, list, boost::algorithm::is_any_of(","));
  return parts;
}

char const* SourceKey(IP_TYPE const& type) { return type == IPTYPE_V6 ? "source_v6" : "source"; }
char const* EnableKey(IP_TYPE const& type) { return type == IPTYPE_V6 ? "enable_v6" : "enable"; }

bool IsStaticRuleFile(std::string const& ruleFile) {
  return ruleFile == "static-table-rule" || ruleFile == "static-table-rule-v6";
}

// A section name of a rule file: not empty; no control character, '[', ']' or '='.
bool IsValidSection(std::string const& name) {
  if (name.empty()) return false;
  for (unsigned char c : name) {
    if (c < ' ' || c == 0x7f || c == '[' || c == ']' || c == '=') return false;
  }
  return true;
}

// A value stored in a rule file: no control character (a line break would end the line).
bool IsValidValue(std::string const& value) {
  for (unsigned char c : value) {
    if (c < ' ' || c == 0x7f) return false;
  }
  return true;
}

// Replaces path with content: a temporary file beside it, fsync, rename.
int ReplaceFileAtomically(std::string const& path, std::string const& content) {
  std::string tmp = path + ".tmp.XXXXXX";
  std::vector<char> name(tmp.begin(), tmp.end());
  name.push_back('\0');
  int fd = mkstemp(name.data());
  if (fd < 0) return -1;
  bool ok = fchmod(fd, 0644) == 0;
  size_t done = 0;
  while (ok && done < content.size()) {
    ssize_t n = write(fd, content.data() + done, content.size() - done);
    if (n < 0 && errno == EINTR) continue;
    if (n <= 0) {
      ok = false;
      break;
    }
    done += static_cast<size_t>(n);
  }
  ok = fsync(fd) == 0 && ok;
  ok = close(fd) == 0 && ok;
  if (ok && rename(name.data(), path.c_str()) == 0) return 0;
  unlink(name.data());
  return -1;
}

// Creates a file of the configuration directory when it is missing.
void TouchIfMissing(std::string const& path) {
  if (VLIBCFileExist(path.c_str()) == 1) return;
  vornwireless::utils::CheckAndMakeDir(VORN_ROUTE_CONFIG_DIR, 0755);
  vornnetsdk::sdk_s::VLIBCExec_S("/bin/touch", path.c_str(), nullptr, nullptr, nullptr);
}

// The interface of a kernel table name: the text before the first "-".
std::string InterfaceOfTable(std::string const& table) { return table.substr(0, table.find('-')); }

}  // namespace

PolicyRoute::PolicyRoute() : _maxId(2), _lock(VORN_RT_TABLES_LOCK, true) {}

std::string PolicyRoute::RuleFileName(IP_TYPE const& type, std::string const& name) {
  if (type == IPTYPE_V4) return name + "-table-rule";
  if (type == IPTYPE_V6) return name + "-table-rule-v6";
  return std::string();
}

bool PolicyRoute::IsValidName(std::string const& name) {
  if (name.empty() || name == "." || name == "..") return false;
  for (unsigned char c : name) {
    if (c <= ' ' || c == 0x7f || c == '[' || c == ']' || c == '=' || c == '/') return false;
  }
  return true;
}

bool PolicyRoute::IsValidSource(IP_TYPE const& type, std::string const& source) {
  if (source == "all" || source == "any" || source == "default") return true;
  std::string address = source;
  int maxPrefix = type == IPTYPE_V6 ? 128 : 32;
  std::string::size_type slash = source.find('/');
  if (slash != std::string::npos) {
    address = source.substr(0, slash);
    std::string prefix = source.substr(slash + 1);
    if (prefix.empty() || prefix.size() > 3 ||
        prefix.find_first_not_of("0123456789") != std::string::npos ||
        std::atoi(prefix.c_str()) > maxPrefix) {
      return false;
    }
  }
  unsigned char buffer[sizeof(struct in6_addr)];
  return inet_pton(type == IPTYPE_V6 ? AF_INET6 : AF_INET, address.c_str(), buffer) == 1;
}

int PolicyRoute::InitMaxID() {
  char const* path = VORN_MULTI_TABLE_CONFIG;
  if (VLIBCFileExist(path) != 1) {
    _maxId = 2;
    return 0;
  }
  ConfigSection config(path);
  if (config.Read() != 0) {
    VORN_LOG(LOG_ERR, "Failed to read config [%s]", path);
    return -1;
  }
  int highest = 0;
  for (auto const& section : config.GetKeyValues()) {
    auto it = section.second.find("id");
    if (it == section.second.end()) continue;
    int id = std::atoi(it->second.c_str());
    if (id > highest) highest = id;
  }
  _maxId = highest;
  return 0;
}

int PolicyRoute::EnableTable(IP_TYPE const& type, std::string const& name,
                             std::string const& source) {
  if (!_lock.Lock()) {
    VORN_LOG(LOG_ERR, "Failed to lock in EnableTable");
    _lock.Unlock();
    return -1;
  }
  int result = 0;
  try {
    bool good = !name.empty() && !source.empty() && IsValidName(name);
    if (good) {
      for (std::string const& one : SplitSources(source)) good = good && IsValidSource(type, one);
    }
    if (!good) {
      VORN_LOG(LOG_ERR, "Bad parameter.");
      result = -1;
    } else {
      InitMaxID();
      std::string const table = name + kTableSuffix;
      std::string const ruleFile = RuleFileName(type, name);
      if (ruleFile.empty()) {
        VORN_LOG(LOG_ERR, "unknown type for IP format");
        result = -1;
      } else if (name != kStaticName && IsRulesEmpty(ruleFile)) {
        // A table without rules is not turned on.
        result = 0;
      } else if (ConfigWrite(type, table, source, true) != 0) {
        result = -1;
      } else if (SetTableLookupRule(type, table) != 0) {
        result = -1;
      } else {
        result = SetTableRouteRule(type, ruleFile);
      }
    }
  } catch (std::exception const& e) {
    VORN_LOG(LOG_ERR, "Failed to enable table [%s]: %s", name.c_str(), e.what());
    result = -1;
  }
  _lock.Unlock();
  return result;
}

int PolicyRoute::DisableTable(IP_TYPE const& type, std::string const& name) {
  if (!_lock.Lock()) {
    VORN_LOG(LOG_ERR, "Failed to lock in DisableTable");
    _lock.Unlock();
    return -1;
  }
  int result = 0;
  try {
    if (name.empty() || !IsValidName(name)) {
      VORN_LOG(LOG_ERR, "Bad parameter.");
      result = -1;
    } else if (type != IPTYPE_V4 && type != IPTYPE_V6) {
      VORN_LOG(LOG_ERR, "unknown type for IP format");
      result = -1;
    } else {
      InitMaxID();
      std::string const table = name + kTableSuffix;
      FlushTableRule(type, table);
      if (FlushTableLookupRule(type, table) != 0) result = -1;
      if (ConfigWrite(type, table, "", false) != 0) result = -1;
    }
  } catch (std::exception const& e) {
    VORN_LOG(LOG_ERR, "Failed to disable table [%s]: %s", name.c_str(), e.what());
    result = -1;
  }
  _lock.Unlock();
  return result;
}

int PolicyRoute::ConfigWrite(IP_TYPE const& type, std::string const& table,
                             std::string const& source, bool const& enable) {
  char const* path = VORN_MULTI_TABLE_CONFIG;
  TouchIfMissing(path);
  ConfigSection config(path);
  if (config.Read() != 0) {
    VORN_LOG(LOG_ERR, "Failed to read config [%s]", path);
    return -1;
  }
  std::string value;
  if (!config.Find(table)) {
    int id;
    if (table == kStaticTable) {
      id = 2;
    } else {
      id = ++_maxId;
    }
    config.AddKeyValue(table, "id", id);
  } else {
    value = config.GetKeyValue(table, SourceKey(type));
  }
  if (!enable) {
    value.clear();
  } else if (value.empty()) {
    value = source;
  } else {
    // No test for a repeat: enabling twice with one source lists it twice.
    value += "," + source;
  }
  config.AddKeyValue(table, EnableKey(type), enable);
  config.AddKeyValue(table, SourceKey(type), value);
  if (config.Write() != 0) {
    VORN_LOG(LOG_ERR, "Failed to set topology file[%s]", path);
    return -1;
  }

  // The kernel's name file holds exactly the tables that are on for either family.
  std::string names;
  for (auto const& section : config.GetKeyValues()) {
    auto const& keys = section.second;
    auto on = [&keys](char const* key) {
      auto it = keys.find(key);
      return it != keys.end() && it->second == "yes";
    };
    if (!on("enable") && !on("enable_v6")) continue;
    auto id = keys.find("id");
    names += (id == keys.end() ? std::string() : id->second) + " " + section.first + "\n";
  }
  if (ReplaceFileAtomically(VORN_RT_TABLES_FILE, names) != 0) {
    VORN_LOG(LOG_ERR, "Failed to open file[%s]", VORN_RT_TABLES_FILE);
    return -1;
  }
  return 0;
}

int PolicyRoute::SetTableLookupRule(IP_TYPE const& type, std::string const& table) {
  char const* path = VORN_MULTI_TABLE_CONFIG;
  if (VLIBCFileExist(path) != 1) {
    VORN_LOG(LOG_ERR, "File [%s] doesn't exist.", path);
    return -1;
  }
  ConfigSection config(path);
  if (config.Read() != 0) {
    VORN_LOG(LOG_ERR, "Failed to read config [%s]", path);
    return -1;
  }
  if (!config.Find(table)) {
    VORN_LOG(LOG_ERR, "Can't find [%s] in file [%s].", table.c_str(), path);
    return -1;
  }
  std::string const id = config.GetKeyValue(table, "id");
  for (std::string const& source : SplitSources(config.GetKeyValue(table, SourceKey(type)))) {
    if (source.empty()) continue;
    std::string text;
    // Deleting first makes the step repeatable on a kernel that already holds the rule; a
    // positive result (no such rule) is the usual one.
    if (RunIp(type, text, "rule", "delete", "from", source.c_str(), "lookup", table.c_str()) <
        0) {
      return -1;
    }
    if (RunIp(type, text, "rule", "add", "from", source.c_str(), "lookup", table.c_str(),
              "priority", id.c_str()) < 0) {
      VORN_LOG(LOG_ERR, "Failed to execute command [%s]", text.c_str());
      return -1;
    }
  }
  return 0;
}

int PolicyRoute::SetTableRouteRule(IP_TYPE const& type, std::string const& ruleFile) {
  std::string const path = VORN_ROUTE_CONFIG_DIR + ruleFile;
  if (VLIBCFileExist(path.c_str()) != 1) return 0;
  ConfigSection config(path);
  if (config.Read() != 0) {
    VORN_LOG(LOG_ERR, "Failed to read config [%s]", path.c_str());
    return -1;
  }
  bool const isStatic = IsStaticRuleFile(ruleFile);
  StaticRoute staticRoute;
  for (auto const& section : config.GetKeyValues()) {
    std::map<std::string, std::string> keys = section.second;
    std::string const ifname = keys["ifname"];
    std::string const ip = keys["ip"];
    std::string const mask = keys[type == IPTYPE_V6 ? "prefix_length" : "mask"];
    std::string const gateway = keys["gateway"];
    if (ifname.empty()) {
      VORN_LOG(LOG_ERR, "Wrong parameter.");
      continue;
    }
    if (isStatic) {
      // The static table holds exactly the enabled static rules, each as StaticRoute adds it.
      if (keys["enable"] != "yes") continue;
      StaticRouteRule rule;
      rule.type = type;
      rule.ifname = ifname;
      rule.ip = ip;
      rule.gateway = gateway;
      if (type == IPTYPE_V6) {
        rule.prefix_length = mask;
      } else {
        rule.mask = mask;
      }
      rule.enable = true;
      staticRoute.AddRule(rule);
      continue;
    }
    std::string const tableOfRule = ifname + kTableSuffix;
    std::string text;
    if (!ip.empty() && !mask.empty()) {
      std::string destination;
      if (type == IPTYPE_V6) {
        destination = ip + "/" + mask;
      } else if (GetSubnetFormat(ip, mask, destination) != 0) {
        continue;
      }
      int rc;
      if (gateway.empty()) {
        rc = RunIp(type, text, "route", "add", "to", destination.c_str(), "dev", ifname.c_str(),
                   "table", tableOfRule.c_str());
      } else {
        rc = RunIp(type, text, "route", "add", "to", destination.c_str(), "via", gateway.c_str(),
                   "dev", ifname.c_str(), "table", tableOfRule.c_str());
      }
      if (rc < 0) VORN_LOG(LOG_ERR, "Failed to execute command [%s]", text.c_str());
    } else {
      if (RunIp(type, text, "route", "add", "default", "via", gateway.c_str(), "dev",
                ifname.c_str(), "table", tableOfRule.c_str()) < 0) {
        VORN_LOG(LOG_DEBUG, "Failed to execute command [%s]", text.c_str());
      }
    }
  }
  return 0;
}

int PolicyRoute::FlushTableRule(IP_TYPE const& type, std::string const& table) {
  std::string text;
  if (RunIp(type, text, "route", "flush", "table", table.c_str()) != 0) {
    VORN_LOG(LOG_INFO, "flush policy route table rule failed");
  }
  return 0;
}

int PolicyRoute::FlushTableLookupRule(IP_TYPE const& type, std::string const& table) {
  char const* path = VORN_MULTI_TABLE_CONFIG;
  if (VLIBCFileExist(path) != 1) return 0;
  ConfigSection config(path);
  if (config.Read() != 0) {
    VORN_LOG(LOG_ERR, "Failed to read config [%s]", path);
    return -1;
  }
  if (!config.Find(table)) return 0;
  for (std::string const& source : SplitSources(config.GetKeyValue(table, SourceKey(type)))) {
    if (source.empty()) continue;
    std::string text;
    if (RunIp(type, text, "rule", "delete", "from", source.c_str(), "lookup", table.c_str()) !=
        0) {
      VORN_LOG(LOG_INFO, "detele lookup rule failed");
    }
  }
  return 0;
}

bool PolicyRoute::IsRulesEmpty(std::string const& ruleFile) {
  std::string const path = VORN_ROUTE_CONFIG_DIR + ruleFile;
  if (VLIBCFileExist(path.c_str()) != 1) return true;
  ConfigSection config(path);
  if (config.Read() != 0) {
    VORN_LOG(LOG_ERR, "Failed to read config [%s]", path.c_str());
    return false;
  }
  return config.Empty();
}

int PolicyRoute::AddRule(PolicyRouteRule const& rule) {
  std::string const file = RuleFileName(rule.type, rule.ifname);
  if (file.empty()) {
    VORN_LOG(LOG_ERR, "unknown type for IP format");
    return -1;
  }
  if (!IsValidName(rule.ifname) || !IsValidSection(rule.name) ||
      !IsValidValue(rule.prefix_length)) {
    VORN_LOG(LOG_ERR, "Bad parameter.");
    return -1;
  }
  std::string const path = VORN_ROUTE_CONFIG_DIR + file;
  TouchIfMissing(path);
  ConfigSection config(path);
  if (config.Read() != 0) {
    VORN_LOG(LOG_ERR, "Failed to read config [%s]", path.c_str());
    return -1;
  }
  config.AddKeyValue(rule.name, "ifname", rule.ifname);
  config.AddKeyValue(rule.name, "ip", rule.ip.ToString());
  if (rule.type == IPTYPE_V6) {
    config.AddKeyValue(rule.name, "prefix_length", rule.prefix_length);
  } else {
    config.AddKeyValue(rule.name, "mask", rule.mask.ToString());
  }
  config.AddKeyValue(rule.name, "gateway", rule.gateway.ToString());
  if (config.Write() != 0) {
    VORN_LOG(LOG_ERR, "Failed to set topology file[%s]", path.c_str());
    return -1;
  }
  return 0;
}

int PolicyRoute::DeleteRule(IP_TYPE const& type, std::string const& name,
                            std::string const& section) {
  std::string const file = RuleFileName(type, name);
  if (file.empty()) {
    VORN_LOG(LOG_ERR, "unknown type for IP format");
    return -1;
  }
  if (!IsValidName(name) || !IsValidSection(section)) {
    VORN_LOG(LOG_ERR, "Bad parameter.");
    return -1;
  }
  std::string const path = VORN_ROUTE_CONFIG_DIR + file;
  if (VLIBCFileExist(path.c_str()) != 1) return 0;
  ConfigSection config(path);
  if (config.Read() != 0) {
    VORN_LOG(LOG_ERR, "Failed to read config [%s]", path.c_str());
    return -1;
  }
  config.DeleteSection(section);
  if (config.Write() != 0) {
    VORN_LOG(LOG_ERR, "Failed to set topology file[%s]", path.c_str());
    return -1;
  }
  return 0;
}

int PolicyRoute::GetEnableTables(Json::Value& tables) {
  char const* path = VORN_MULTI_TABLE_CONFIG;
  TouchIfMissing(path);
  ConfigSection config(path);
  if (config.Read() != 0) {
    VORN_LOG(LOG_ERR, "Failed to read config [%s]", path);
    return -1;
  }
  if (!tables.isArray()) tables = Json::Value(Json::arrayValue);
  vornnetwork::dbus::NetClient client;
  for (auto const& section : config.GetKeyValues()) {
    std::map<std::string, std::string> keys = section.second;
    if (keys["enable"] != "yes" && keys["enable_v6"] != "yes") continue;
    std::string const& table = section.first;
    if (table != kStaticTable) {
      Json::Value request(Json::objectValue);
      Json::Value answer;
      request["type"] = "GTYPE_V4";
      request["ifname"] = InterfaceOfTable(table);
      if (client.GetGatewayDataByInterface(request, answer) < 0) {
        VORN_LOG(LOG_ERR, "Failed to get interface data from gateway list");
        continue;
      }
      if (!answer.isObject() || !answer["exist"].isBool() || !answer["exist"].asBool()) {
        request["type"] = "GTYPE_V6";
        answer = Json::Value();
        if (client.GetGatewayDataByInterface(request, answer) < 0) {
          VORN_LOG(LOG_ERR, "Failed to get interface data from gateway list");
          continue;
        }
        // A table whose interface is in neither list is left out.
        if (!answer.isObject() || !answer["exist"].isBool() || !answer["exist"].asBool()) {
          continue;
        }
      }
    }
    Json::Value entry(Json::objectValue);
    entry["name"] = table;
    entry["id"] = keys["id"];
    tables.append(entry);
  }
  return 0;
}

}  // namespace network
}  // namespace vornnetwork
