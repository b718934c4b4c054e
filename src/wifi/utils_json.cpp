// JSON forms of the Wi-Fi records and the schedule text. A reader works on a copy and hands it
// over only when every member could be read, so a bad document never leaves half a record.
#include <cstdio>
#include <exception>

#include "vornplatform/log.h"
#include "vornwireless/wifi/utils.h"

// jsoncpp marks Json::Reader deprecated; it is the parser whose leniency our clients rely on.
#pragma GCC diagnostic ignored "-Wdeprecated-declarations"

namespace vornwireless {
namespace wifi {
namespace utils {

namespace {

template <typename E>
std::string Text(E value) {
  return EnumMap<E>::EnumToString(value);
}

template <typename E>
E Enum(const Json::Value& value) {
  return EnumMap<E>::StringToEnum(value.asString());
}

template <typename E>
Json::Value TextArray(const std::vector<E>& values) {
  Json::Value array(Json::arrayValue);
  for (E v : values) array.append(Text(v));
  return array;
}

bool Parse(const std::string& json, Json::Value& root) {
  Json::Reader reader;
  return reader.parse(json, root, false);
}

// Reads a station of "station_list": every key of its JSON form but "signal".
void ReadStation(const Json::Value& item, AdapterConfig::StationInfo& station) {
  station.essid = item.get("essid", "").asString();
  station.bssid = item.get("bssid", "").asString();
  station.opmode = Enum<WIFI_OPMODE>(item.get("opmode", ""));
  station.security = Enum<WIFI_SECURITY>(item.get("security", ""));
  station.encryption = Enum<WIFI_ENCRYPTION>(item.get("encryption", ""));
  station.user = item.get("user", "").asString();
  station.password = item.get("password", "").asString();
  station.access_time = item.get("access_time", 0).asUInt();
  station.is_dhcp = item.get("is_dhcp", false).asBool();
  station.ip = item.get("ip", "").asString();
  station.netmask = item.get("netmask", "").asString();
  station.gateway = item.get("gateway", "").asString();
  station.channel = item.get("channel", 0).asInt();
  station.hwmode = Enum<WIFI_MODE>(item.get("hwmode", ""));
}

}  // namespace

std::string itoa(int value) {
  char text[16];
  std::snprintf(text, sizeof text, "%d", value);
  return text;
}

std::string rgbltoa(const bool* cells, unsigned count) {
  std::string text;
  text.reserve(count);
  for (unsigned i = 0; i < count; ++i) text += cells[i] ? '1' : '0';
  return text;
}

int SetScheduleValue(bool* cells, const std::string& text) {
  if (text.size() != kScheduleCells) return -1;
  for (unsigned i = 0; i < kScheduleCells; ++i) cells[i] = text[i] == '1';
  return 0;
}

std::string ToStyledText(const Json::Value& value) { return value.toStyledString(); }

Json::Value StationInfoToJson(const AdapterConfig::StationInfo& s) {
  Json::Value json(Json::objectValue);
  json["essid"] = s.essid;
  json["bssid"] = s.bssid.ToString();
  json["opmode"] = Text(s.opmode);
  json["security"] = Text(s.security);
  json["encryption"] = Text(s.encryption);
  json["user"] = s.user;
  json["password"] = s.password;
  json["access_time"] = Json::UInt(s.access_time);
  json["is_dhcp"] = s.is_dhcp;
  json["ip"] = s.ip.ToString();
  json["netmask"] = s.netmask.ToString();
  json["gateway"] = s.gateway.ToString();
  json["channel"] = Json::Int(s.channel);
  json["signal"] = Json::Int(s.signal);
  json["hwmode"] = Text(s.hwmode);
  return json;
}

Json::Value GetJsonValue(const AdapterConfig& c) {
  Json::Value json(Json::objectValue);
  json["interface"] = c.interface;
  json["bssid"] = c.bssid.ToString();
  json["driver"] = Text(c.driver);
  json["enabled"] = c.enabled;
  json["clientenabled"] = c.clientenabled;
  json["ssid"] = c.ssid;
  json["display_ssid"] = c.display_ssid;
  json["mode"] = Text(c.mode);
  json["bandwidth"] = Text(c.bandwidth);
  json["channel"] = Json::UInt(c.channel);
  json["tx_power"] = Text(c.tx_power);
  json["max_num_client"] = Json::UInt(c.max_num_client);
  json["wmm_enabled"] = c.wmm_enabled;
  json["schedule_enabled"] = c.schedule_enabled;
  json["is_pci_interface"] = c.is_pci_interface;
  json["CountryCode"] = c.CountryCode;
  json["CountryRegion"] = Json::Int(c.CountryRegion);
  json["CountryRegionABand"] = Json::Int(c.CountryRegionABand);
  json["schedule"] = rgbltoa(c.schedule, kScheduleCells);
  json["security"] = Text(c.security);
  json["encryption"] = Text(c.encryption);
  // D-Bus is the trusted side of the border: secrets go out in plain.
  json["password"] = c.password;
  json["auth_server_ip"] = c.auth_server_ip.ToString();
  json["auth_server_Port"] = Json::UInt(c.auth_server_Port);
  json["auth_server_shared_secret"] = c.auth_server_shared_secret;
  json["guest_support"] = c.guest_support;
  json["guest_enabled"] = c.guest_enabled;
  json["guest_ssid"] = c.guest_ssid;
  json["guest_display_ssid"] = c.guest_display_ssid;
  json["guest_bssid"] = c.guest_bssid.ToString();
  json["guest_max_num_client"] = Json::UInt(c.guest_max_num_client);
  json["guest_security"] = Text(c.guest_security);
  json["guest_encryption"] = Text(c.guest_encryption);
  json["guest_password"] = c.guest_password;
  json["guest_allow_access_guest"] = c.guest_allow_access_guest;
  json["guest_allow_access_lan"] = c.guest_allow_access_lan;
  json["guest_allow_access_http_https_only"] = c.guest_allow_access_http_https_only;
  json["guest_schedule_enabled"] = c.guest_schedule_enabled;
  json["guest_schedule"] = rgbltoa(c.guest_schedule, kScheduleCells);
  json["mac_filter_policy"] = Text(c.mac_filter_policy);
  Json::Value rules(Json::arrayValue);
  for (const AdapterConfig::MacFilterRule& r : c.mac_filter_list) {
    Json::Value rule(Json::objectValue);
    rule["mac_filter_enabled"] = r.enabled;
    rule["mac"] = r.mac.ToString();
    rule["desc"] = r.desc;
    rules.append(rule);
  }
  json["mac_filter_list"] = rules;
  Json::Value stations(Json::arrayValue);
  for (const AdapterConfig::StationInfo& s : c.station_list) stations.append(StationInfoToJson(s));
  json["station_list"] = stations;
  return json;
}

int ConnectionJsonToStationInfo(const Json::Value& json, AdapterConfig::StationInfo& station) {
  AdapterConfig::StationInfo s = station;
  try {
    if (!json.isObject()) return 0;
    if (json.isMember("essid")) s.essid = json["essid"].asString();
    if (json.isMember("bssid")) s.bssid = json["bssid"].asString();
    if (json.isMember("opmode")) s.opmode = Enum<WIFI_OPMODE>(json["opmode"]);
    if (json.isMember("security")) s.security = Enum<WIFI_SECURITY>(json["security"]);
    if (json.isMember("encryption")) s.encryption = Enum<WIFI_ENCRYPTION>(json["encryption"]);
    if (json.isMember("user")) s.user = json["user"].asString();
    if (json.isMember("password")) s.password = json["password"].asString();
    if (json.isMember("access_time")) s.access_time = json["access_time"].asUInt();
  } catch (const std::exception& e) {
    VORN_LOG(LOG_ERR, "Failed to parse connection (%s)", e.what());
    return -1;
  }
  station = s;
  return 0;
}

Json::Value GetJsonValue(const AdapterCapability& capability) {
  Json::Value json(Json::objectValue);
  std::vector<WIFI_TOPOLOGY> topology = capability.GetTopology();
  if (!topology.empty()) json["net_topology"] = TextArray(topology);
  std::vector<WIFI_FEATURE> feature = capability.GetFeature();
  if (!feature.empty()) json["feature"] = TextArray(feature);
  std::vector<WIFI_MODE> mode = capability.GetMode();
  if (!mode.empty()) json["mode"] = TextArray(mode);
  std::vector<WIFI_BANDWIDTH> bandwidth = capability.GetBandwidth();
  if (!bandwidth.empty()) json["bandwidth"] = TextArray(bandwidth);
  std::vector<AdapterCapability::Channel> channels = capability.GetChannel();
  if (!channels.empty()) {
    Json::Value array(Json::arrayValue);
    for (const AdapterCapability::Channel& ch : channels) {
      Json::Value item(Json::objectValue);
      item["id"] = Json::UInt(ch.id);
      item["frequency"] = ch.frequency;
      array.append(item);
    }
    json["channel"] = array;
  }
  std::vector<WIFI_POWER> power = capability.GetPower();
  if (!power.empty()) json["tx_power"] = TextArray(power);
  std::vector<WIFI_SECURITY> security = capability.GetSecurity();
  if (!security.empty()) json["security"] = TextArray(security);
  std::vector<WIFI_ENCRYPTION> encryption = capability.GetEncryption();
  if (!encryption.empty()) json["encryption"] = TextArray(encryption);
  std::vector<WIFI_MAC_FILTER_POLICY> policy = capability.GetMacFilterPolicy();
  if (!policy.empty()) json["mac_filter_policy"] = TextArray(policy);
  return json;
}

int GetConfig(const std::string& json, AdapterConfig& config) {
  Json::Value root;
  AdapterConfig c = config;
  try {
    if (!Parse(json, root)) {
      VORN_LOG(LOG_ERR, "Failed to parse config");
      return -1;
    }
    c.interface = root["interface"].asString();
    c.bssid = root["bssid"].asString();
    c.driver = Enum<WIFI_DRIVER>(root["driver"]);
    c.enabled = root["enabled"].asBool();
    // A client that does not know the key leaves the client side on.
    c.clientenabled = root.isMember("clientenabled") ? root["clientenabled"].asBool() : true;
    c.ssid = root["ssid"].asString();
    c.display_ssid = root["display_ssid"].asBool();
    c.mode = Enum<WIFI_MODE>(root["mode"]);
    c.bandwidth = Enum<WIFI_BANDWIDTH>(root["bandwidth"]);
    c.channel = root["channel"].asUInt();
    c.tx_power = Enum<WIFI_POWER>(root["tx_power"]);
    c.max_num_client = root["max_num_client"].asUInt();
    c.wmm_enabled = root["wmm_enabled"].asBool();
    c.schedule_enabled = root["schedule_enabled"].asBool();
    c.is_pci_interface = root["is_pci_interface"].asBool();
    c.CountryCode = root["CountryCode"].asString();
    c.CountryRegion = root["CountryRegion"].asInt();
    c.CountryRegionABand = root["CountryRegionABand"].asInt();
    if (root.isMember("schedule") && root["schedule"].isString()) {
      const std::string text = root["schedule"].asString();
      if (SetScheduleValue(c.schedule, text) < 0) {
        VORN_LOG(LOG_ERR, "Failed to set [%s] to scheduler", text.c_str());
        return -1;
      }
    }
    c.security = Enum<WIFI_SECURITY>(root["security"]);
    c.encryption = Enum<WIFI_ENCRYPTION>(root["encryption"]);
    c.password = root["password"].asString();
    c.auth_server_ip = root["auth_server_ip"].asString();
    c.auth_server_Port = root["auth_server_Port"].asUInt();
    c.auth_server_shared_secret = root["auth_server_shared_secret"].asString();
    c.guest_support = root["guest_support"].asBool();
    c.guest_enabled = root["guest_enabled"].asBool();
    c.guest_ssid = root["guest_ssid"].asString();
    c.guest_display_ssid = root["guest_display_ssid"].asBool();
    c.guest_bssid = root["guest_bssid"].asString();
    c.guest_max_num_client = root["guest_max_num_client"].asUInt();
    c.guest_security = Enum<WIFI_SECURITY>(root["guest_security"]);
    c.guest_encryption = Enum<WIFI_ENCRYPTION>(root["guest_encryption"]);
    c.guest_password = root["guest_password"].asString();
    c.guest_allow_access_guest = root["guest_allow_access_guest"].asBool();
    c.guest_allow_access_lan = root["guest_allow_access_lan"].asBool();
    c.guest_allow_access_http_https_only = root["guest_allow_access_http_https_only"].asBool();
    c.guest_schedule_enabled = root["guest_schedule_enabled"].asBool();
    if (root.isMember("guest_schedule") && root["guest_schedule"].isString()) {
      const std::string text = root["guest_schedule"].asString();
      if (SetScheduleValue(c.guest_schedule, text) < 0) {
        VORN_LOG(LOG_ERR, "Failed to set [%s] to scheduler", text.c_str());
        return -1;
      }
    }
    c.mac_filter_policy = Enum<WIFI_MAC_FILTER_POLICY>(root["mac_filter_policy"]);
    const Json::Value& rules = root["mac_filter_list"];
    if (rules.isArray()) {
      for (Json::ArrayIndex i = 0; i < rules.size(); ++i) {
        AdapterConfig::MacFilterRule rule;
        rule.enabled = rules[i].get("mac_filter_enabled", false).asBool();
        rule.mac = rules[i].get("mac", "").asString();
        rule.desc = rules[i].get("desc", "").asString();
        c.mac_filter_list.push_back(rule);
      }
    }
    const Json::Value& stations = root["station_list"];
    if (stations.isArray()) {
      for (Json::ArrayIndex i = 0; i < stations.size(); ++i) {
        AdapterConfig::StationInfo station;
        ReadStation(stations[i], station);
        c.station_list.push_back(station);
      }
    }
  } catch (const std::exception& e) {
    VORN_LOG(LOG_ERR, "Failed to parse config (%s)", e.what());
    return -1;
  }
  config = c;
  return 0;
}

int GetConfig(const std::string& json, BridgeConfig& config) {
  Json::Value root;
  BridgeConfig c = config;
  try {
    if (!Parse(json, root)) {
      VORN_LOG(LOG_ERR, "Failed to parse config");
      return -1;
    }
    c.ap_ip_address = root["ap_ip_address"].asString();
    c.ap_netmask = root["ap_netmask"].asString();
    c.dhcp_enabled = root["dhcp_enabled"].asBool();
    c.dhcp_range_begin = root["dhcp_range_begin"].asString();
    c.dhcp_range_end = root["dhcp_range_end"].asString();
    c.ap_ipv6_prefix = root["ap_ipv6_prefix"].asString();
    c.ipv6_pdns = root["ipv6_pdns"].asString();
    c.ipv6_sdns = root["ipv6_sdns"].asString();
    c.dhcpv6_type = root["dhcpv6_type"].asString();
    c.dhcpv6_range_begin = root["dhcpv6_range_begin"].asString();
    c.dhcpv6_range_end = root["dhcpv6_range_end"].asString();
    const Json::Value& slaves = root["slave_list"];
    for (Json::ArrayIndex i = 0; i < slaves.size(); ++i) {
      c.slave_list.push_back(slaves[i].asString());
    }
  } catch (const std::exception& e) {
    VORN_LOG(LOG_ERR, "Failed to parse config (%s)", e.what());
    return -1;
  }
  config = c;
  return 0;
}

}  // namespace utils
}  // namespace wifi
}  // namespace vornwireless
