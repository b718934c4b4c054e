// The stored configuration of one adapter and the reload flags of a change.
#include "vornwireless/wifi/adapter_data.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <new>

#include "vornplatform/file.h"
#include "vornplatform/log.h"
#include "vornplatform/proc.h"
#include "vornplatform/szhash.h"
#include "vornwireless/wifi/adapter.h"
#include "vornwireless/wifi/utils.h"

namespace vornwireless {
namespace wifi {

namespace {

const int kHashSize = 1024;
const char kLineFormat[] = "\t%s=%s\n";

struct HashDeleter {
  void operator()(PVLIBSZHASH h) const { VLIBCSzHashFree(h); }
};
struct ListDeleter {
  void operator()(PVLIBSZLIST l) const { VLIBCSzListFree(l); }
};
typedef std::unique_ptr<VLIBSZHASH, HashDeleter> Hash;
typedef std::unique_ptr<VLIBSZLIST, ListDeleter> List;

const char* YesNo(bool value) { return value ? "yes" : "no"; }

template <typename E>
std::string Text(E value) {
  return EnumMap<E>::EnumToString(value);
}

// A value of the hash; "" when absent.
std::string Value(PVLIBSZHASH hash, const char* key) {
  const char* v = VLIBCSzHashGetValue(hash, key);
  return v ? v : "";
}

// The value, or `fallback` when the key is absent.
std::string ValueOr(PVLIBSZHASH hash, const char* key, const char* fallback) {
  const char* v = VLIBCSzHashGetValue(hash, key);
  return v ? v : fallback;
}

bool Yes(PVLIBSZHASH hash, const char* key) { return Value(hash, key) == "yes"; }

unsigned long Number(const std::string& text) { return std::strtoul(text.c_str(), nullptr, 10); }
long SignedNumber(const std::string& text) { return std::strtol(text.c_str(), nullptr, 10); }

bool Readable(const std::string& path) { return access(path.c_str(), R_OK) == 0; }

// Makes dir and its missing parents with mode 0755. 0, -1 (logged).
int MakeDir(const std::string& dir) {
  struct stat st;
  if (stat(dir.c_str(), &st) == 0 && S_ISDIR(st.st_mode)) return 0;
  for (std::size_t pos = 1; pos <= dir.size(); ++pos) {
    if (pos != dir.size() && dir[pos] != '/') continue;
    const std::string part = dir.substr(0, pos);
    if (mkdir(part.c_str(), 0755) != 0 && errno != EEXIST) {
      VORN_LOG(LOG_ERR, "Failed to mkdir %s", part.c_str());
      return -1;
    }
  }
  return 0;
}

// The standards the radio reports through iwconfig decide the mode of a new record.
WIFI_MODE DefaultMode(const std::string& ifname) {
  FILE* fp = VLIBCPopen("/sbin/iwconfig", "r", ifname.c_str(), nullptr);
  if (fp == nullptr) {
    VORN_LOG(LOG_ERR, "Failed to get iwconfig (iwconfig), set default mode to gn");
    return WIFI_MODE_GN;
  }
  std::string standards;
  char line[256];
  while (std::fgets(line, sizeof line, fp) != nullptr) {
    if (std::strstr(line, "IEEE 802.11") == nullptr) continue;
    char w1[256], w2[256], w3[256];
    if (std::sscanf(line, "%255s %255s %255s", w1, w2, w3) == 3) standards += w3;
  }
  VLIBCPclose(fp);
  // Only the letters count; the digits of "802.11" never match one.
  if (standards.find('n') != std::string::npos) return WIFI_MODE_N;
  if (standards.find('g') != std::string::npos) return WIFI_MODE_G;
  if (standards.find('b') != std::string::npos) return WIFI_MODE_B;
  return WIFI_MODE_GN;
}

void FactoryDefaults(AdapterConfig& c) {
  c.enabled = true;
  c.ssid = "NetCupboard";
  c.display_ssid = true;
  c.mode = DefaultMode(c.interface);
  c.bandwidth = WIFI_BANDWIDTH_20_40MHZ;
  c.channel = 0;
  c.tx_power = WIFI_POWER_HIGH;
  c.max_num_client = 256;
  c.wmm_enabled = true;
  c.schedule_enabled = false;
  c.CountryCode.clear();
  c.CountryRegion = 5;
  c.CountryRegionABand = 7;
  std::fill(c.schedule, c.schedule + kScheduleCells, false);
  c.security = WIFI_SECURITY_DISABLED;
  c.encryption = WIFI_ENCRYPTION_AES;
  c.password.clear();
  c.guest_support = utils::IsGuestNetworkSupport(c.interface);
  c.guest_enabled = false;
  c.guest_ssid = "NetCupboardGuest";
  c.guest_display_ssid = true;
  c.guest_bssid = c.bssid + 1;
  c.guest_max_num_client = 256;
  c.guest_security = WIFI_SECURITY_DISABLED;
  c.guest_encryption = WIFI_ENCRYPTION_AES;
  c.guest_allow_access_guest = false;
  c.guest_allow_access_lan = false;
  c.guest_allow_access_http_https_only = false;
  c.guest_schedule_enabled = false;
  std::fill(c.guest_schedule, c.guest_schedule + kScheduleCells, false);
  c.mac_filter_policy = WIFI_MAC_FILTER_POLICY_DENY;
  c.is_pci_interface = utils::IsSkyBuiltInWlan(c.interface);
}

// A stored password back in plain; a key that is not there reads as no password.
int ReadPassword(PVLIBSZHASH hash, const char* key, std::string& out) {
  const char* cipher = VLIBCSzHashGetValue(hash, key);
  if (cipher == nullptr) {
    out.clear();
    return 0;
  }
  if (utils::DecryptCipherText(cipher, out) < 0) {
    VORN_LOG(LOG_ERR, "Failed to decrypt cipher text");
    return -1;
  }
  return 0;
}

// The access point settings of the wifi_ap file. 0, -1.
int ReadAP(const std::string& path, AdapterConfig& c) {
  Hash hash(VLIBCSzHashAlloc(kHashSize));
  PVLIBSZHASH h = hash.get();
  if (h == nullptr || VLIBCFileGetSection(path.c_str(), "general", &h) < 1) {
    VORN_LOG(LOG_ERR, "Failed to get AP value");
    return -1;
  }
  c.enabled = Yes(h, "enabled");
  c.ssid = ValueOr(h, "ssid", "NetCupboard");
  c.display_ssid = Yes(h, "display_ssid");
  const char* mode = VLIBCSzHashGetValue(h, "mode");
  c.mode = mode ? EnumMap<WIFI_MODE>::StringToEnum(mode) : DefaultMode(c.interface);
  c.bandwidth = EnumMap<WIFI_BANDWIDTH>::StringToEnum(ValueOr(h, "bandwidth", "20_40MHZ"));
  c.channel = Number(ValueOr(h, "channel", "0"));
  c.tx_power = EnumMap<WIFI_POWER>::StringToEnum(ValueOr(h, "tx_power", "high"));
  c.max_num_client = Number(ValueOr(h, "max_num_client", "256"));
  c.wmm_enabled = Yes(h, "wmm_enabled");
  c.schedule_enabled = Yes(h, "schedule_enabled");
  c.is_pci_interface = Yes(h, "is_pci_interface");
  c.CountryCode = Value(h, "CountryCode");
  c.CountryRegion = SignedNumber(ValueOr(h, "CountryRegion", "5"));
  c.CountryRegionABand = SignedNumber(ValueOr(h, "CountryRegionABand", "7"));
  const std::string off(kScheduleCells, '0');
  if (utils::SetScheduleValue(c.schedule, ValueOr(h, "schedule", off.c_str())) < 0) {
    VORN_LOG(LOG_ERR, "Failed to get AP value");
    return -1;
  }
  c.security = EnumMap<WIFI_SECURITY>::StringToEnum(ValueOr(h, "security", "PERSONAL_WPA2"));
  c.encryption = EnumMap<WIFI_ENCRYPTION>::StringToEnum(ValueOr(h, "encryption", "AES"));
  if (ReadPassword(h, "password", c.password) < 0) return -1;
  c.auth_server_ip = Value(h, "auth_server_ip");
  c.auth_server_Port = Number(ValueOr(h, "auth_server_Port", "0"));
  c.auth_server_shared_secret = Value(h, "auth_server_shared_secret");
  c.guest_support = Yes(h, "guest_support");
  c.guest_enabled = Yes(h, "guest_enabled");
  c.guest_ssid = ValueOr(h, "guest_ssid", "NetCupboardGuest");
  c.guest_display_ssid = Yes(h, "guest_display_ssid");
  c.guest_bssid = c.bssid + 1;
  c.guest_max_num_client = Number(ValueOr(h, "guest_max_num_client", "256"));
  c.guest_security =
      EnumMap<WIFI_SECURITY>::StringToEnum(ValueOr(h, "guest_security", "PERSONAL_WPA2"));
  c.guest_encryption = EnumMap<WIFI_ENCRYPTION>::StringToEnum(ValueOr(h, "guest_encryption", "AES"));
  if (ReadPassword(h, "guest_password", c.guest_password) < 0) return -1;
  c.guest_allow_access_guest = Yes(h, "guest_allow_access_guest");
  c.guest_allow_access_lan = Yes(h, "guest_allow_access_lan");
  c.guest_allow_access_http_https_only = Yes(h, "guest_allow_access_http_https_only");
  c.guest_schedule_enabled = Yes(h, "guest_schedule_enabled");
  if (utils::SetScheduleValue(c.guest_schedule, ValueOr(h, "guest_schedule", off.c_str())) < 0) {
    VORN_LOG(LOG_ERR, "Failed to get AP value");
    return -1;
  }
  c.mac_filter_policy =
      EnumMap<WIFI_MAC_FILTER_POLICY>::StringToEnum(ValueOr(h, "mac_filter_policy", "deny"));
  return 0;
}

// The rules of mf.conf, in file order. 0, -1.
int ReadMacFilter(AdapterConfig& c) {
  List list(VLIBCSzListAlloc(kHashSize));
  Hash hash(VLIBCSzHashAlloc(kHashSize));
  PVLIBSZLIST l = list.get();
  PVLIBSZHASH h = hash.get();
  if (l == nullptr || h == nullptr || VLIBCFileEnumSection(VORN_MAC_FILTER_CONF, &l) < 1) {
    VORN_LOG(LOG_ERR, "Failed to get MacFilter value");
    return -1;
  }
  for (int i = 0; i < VLIBCSzListCount(l); ++i) {
    if (VLIBCFileGetSection(VORN_MAC_FILTER_CONF, VLIBCSzListGet(l, i), &h) < 1) {
      VORN_LOG(LOG_ERR, "Failed to get MacFilter value");
      return -1;
    }
    AdapterConfig::MacFilterRule rule;
    rule.enabled = Yes(h, "enable");
    rule.mac = Value(h, "mac");
    rule.desc = Value(h, "desc");
    c.mac_filter_list.push_back(rule);
  }
  return 0;
}

// The client file: the client switch and the remembered networks. 0, -1.
int ReadClient(const std::string& path, AdapterConfig& c) {
  List list(VLIBCSzListAlloc(kHashSize));
  Hash hash(VLIBCSzHashAlloc(kHashSize));
  PVLIBSZLIST l = list.get();
  PVLIBSZHASH h = hash.get();
  if (l == nullptr || h == nullptr) {
    VORN_LOG(LOG_ERR, "Failed to get Client value");
    return -1;
  }
  // A missing section or key leaves the client side on.
  if (VLIBCFileGetSection(path.c_str(), "general", &h) > 0 &&
      VLIBCSzHashGetValue(h, "clientenabled") != nullptr) {
    c.clientenabled = Yes(h, "clientenabled");
  } else {
    c.clientenabled = true;
  }
  if (VLIBCFileEnumSection(path.c_str(), &l) < 1) {
    VORN_LOG(LOG_ERR, "Failed to get Client value");
    return -1;
  }
  for (int i = 0; i < VLIBCSzListCount(l); ++i) {
    const char* name = VLIBCSzListGet(l, i);
    if (std::strcmp(name, "general") == 0) continue;
    int keys = VLIBCFileGetSection(path.c_str(), name, &h);
    if (keys < 0) {
      VORN_LOG(LOG_ERR, "Failed to get Client value");
      return -1;
    }
    if (keys == 0) continue;
    AdapterConfig::StationInfo s;
    s.essid = Value(h, "essid");
    s.bssid = Value(h, "bssid");
    s.opmode = EnumMap<WIFI_OPMODE>::StringToEnum(Value(h, "opmode"));
    s.security = EnumMap<WIFI_SECURITY>::StringToEnum(Value(h, "security"));
    s.encryption = EnumMap<WIFI_ENCRYPTION>::StringToEnum(Value(h, "encryption"));
    s.user = Value(h, "user");
    if (ReadPassword(h, "password", s.password) < 0) {
      VORN_LOG(LOG_ERR, "Failed to get Client value");
      return -1;
    }
    s.access_time = Number(Value(h, "access_time"));
    s.is_dhcp = Yes(h, "is_dhcp");
    s.ip = Value(h, "ip");
    s.netmask = Value(h, "netmask");
    s.gateway = Value(h, "gateway");
    s.channel = SignedNumber(ValueOr(h, "channel", "0"));
    s.hwmode = EnumMap<WIFI_MODE>::StringToEnum(Value(h, "hwmode"));
    c.station_list.push_back(s);
  }
  return 0;
}

// Fills the hash with one station's keys; the password enciphered. 0, -1.
int FillStation(PVLIBSZHASH h, const AdapterConfig::StationInfo& s) {
  std::string cipher;
  if (utils::EncryptPlainText(s.password, cipher) < 0) {
    VORN_LOG(LOG_ERR, "Failed to Encrypt plain text");
    return -1;
  }
  VLIBCSzHashSetValue(h, "essid", s.essid.c_str());
  VLIBCSzHashSetValue(h, "bssid", s.bssid.ToCString());
  VLIBCSzHashSetValue(h, "opmode", Text(s.opmode).c_str());
  VLIBCSzHashSetValue(h, "security", Text(s.security).c_str());
  VLIBCSzHashSetValue(h, "encryption", Text(s.encryption).c_str());
  VLIBCSzHashSetValue(h, "user", s.user.c_str());
  VLIBCSzHashSetValue(h, "password", cipher.c_str());
  VLIBCSzHashSetValue(h, "access_time", std::to_string(s.access_time).c_str());
  VLIBCSzHashSetValue(h, "is_dhcp", YesNo(s.is_dhcp));
  VLIBCSzHashSetValue(h, "ip", s.ip.ToCString());
  VLIBCSzHashSetValue(h, "netmask", s.netmask.ToCString());
  VLIBCSzHashSetValue(h, "gateway", s.gateway.ToCString());
  VLIBCSzHashSetValue(h, "channel", utils::itoa(s.channel).c_str());
  VLIBCSzHashSetValue(h, "hwmode", Text(s.hwmode).c_str());
  return 0;
}

// A file rewritten whole goes to a temporary name first, so a failure halfway leaves the old
// file as it was.
std::string TempPath(const std::string& path) { return path + ".new"; }

int Publish(const std::string& temp, const std::string& path) {
  if (rename(temp.c_str(), path.c_str()) != 0) {
    VORN_LOG(LOG_ERR, "Failed to rename [%s] to [%s]", temp.c_str(), path.c_str());
    unlink(temp.c_str());
    return -1;
  }
  return 0;
}

// mf.info and mf.conf from the record. 0, -1.
int WriteMacFilter(const AdapterConfig& c) {
  if (MakeDir(VORN_MAC_FILTER_DIR) < 0) return -1;
  const std::string info = TempPath(VORN_MAC_FILTER_INFO);
  unlink(info.c_str());
  if (VLIBCFileSetKeyValue(info.c_str(), "policy", Text(c.mac_filter_policy).c_str(),
                           "%s=%s\n") < 0) {
    VORN_LOG(LOG_ERR, "Failed to write key [%s] to file [%s]", "policy", VORN_MAC_FILTER_INFO);
    unlink(info.c_str());
    return -1;
  }
  if (Publish(info, VORN_MAC_FILTER_INFO) < 0) return -1;

  const std::string conf = TempPath(VORN_MAC_FILTER_CONF);
  unlink(conf.c_str());
  Hash hash(VLIBCSzHashAlloc(kHashSize));
  if (!hash) {
    VORN_LOG(LOG_ERR, "Failed to allocate memory");
    return -1;
  }
  for (std::size_t i = 0; i < c.mac_filter_list.size(); ++i) {
    const AdapterConfig::MacFilterRule& r = c.mac_filter_list[i];
    VLIBCSzHashSetValue(hash.get(), "enable", YesNo(r.enabled));
    VLIBCSzHashSetValue(hash.get(), "desc", r.desc.c_str());
    VLIBCSzHashSetValue(hash.get(), "mac", r.mac.ToCString());
    const std::string name = utils::itoa(static_cast<int>(i));
    if (VLIBCFileAddSection(conf.c_str(), name.c_str(), hash.get(), kLineFormat) < 1) {
      VORN_LOG(LOG_ERR, "Failed to add section [%s] to file", name.c_str());
      unlink(conf.c_str());
      return -1;
    }
  }
  if (c.mac_filter_list.empty()) {
    unlink(VORN_MAC_FILTER_CONF);
    return 0;
  }
  return Publish(conf, VORN_MAC_FILTER_CONF);
}

// The name part of a stored file: only a formal address may reach a path.
bool UsableAddress(const MacAddress& mac) {
  if (mac.IsFormalized()) return true;
  VORN_LOG(LOG_ERR, "Bad mac address [%s]", mac.ToCString());
  return false;
}

}  // namespace

AdapterData::AdapterData(const std::string& ifname)
    : _config(new AdapterConfig()),
      blConfig(false),
      blPower(false),
      blSchedule(false),
      blGuestSchedule(false),
      blGuestRule(false) {
  _config->interface = ifname;
}

AdapterData::~AdapterData() { delete _config; }

AdapterData* AdapterData::Create(const std::string& ifname) {
  AdapterData* data = new (std::nothrow) AdapterData(ifname);
  if (data == nullptr) return nullptr;
  if (data->Read() < 0) {
    delete data;
    return nullptr;
  }
  data->EnableReloadStatus();
  return data;
}

void AdapterData::Delete(const AdapterData* data) { delete data; }

int AdapterData::Read() {
  std::unique_ptr<AdapterConfig> c(new AdapterConfig());
  const std::string& ifname = _config->interface;
  const std::string address = utils::GetBssid(ifname);
  int ret = -1;
  do {
    if (address.empty()) {
      VORN_LOG(LOG_ERR, "Failed to get BSSID[%s]", ifname.c_str());
      break;
    }
    c->interface = ifname;
    c->bssid = address;
    c->driver = WIFI_DRIVER_NL80211;

    const std::string ap = VORN_WIFI_AP_PREFIX + address;
    if (Readable(ap)) {
      if (ReadAP(ap, *c) < 0) break;
    } else {
      FactoryDefaults(*c);
    }

    if (Readable(VORN_MAC_FILTER_CONF) && ReadMacFilter(*c) < 0) break;

    const std::string client = VORN_WIFI_CLIENT_PREFIX + address;
    if (access(VORN_WIFI_CLIENT_OBSOLETE, F_OK) == 0 &&
        rename(VORN_WIFI_CLIENT_OBSOLETE, client.c_str()) != 0) {
      VORN_LOG(LOG_ERR, "Failed to change file name for obsolete file [%s]",
               VORN_WIFI_CLIENT_OBSOLETE);
    }
    if (Readable(client)) {
      if (ReadClient(client, *c) < 0) break;
    } else {
      c->clientenabled = false;
    }
    ret = 0;
  } while (false);

  if (ret < 0) {
    VORN_LOG(LOG_ERR, "Failed to get Config value");
    return -1;
  }
  delete _config;
  _config = c.release();
  return 0;
}

int AdapterData::WriteAP() const {
  const AdapterConfig& c = *_config;
  if (!UsableAddress(c.bssid)) return -1;
  std::string password, guestPassword;
  if (utils::EncryptPlainText(c.password, password) < 0 ||
      utils::EncryptPlainText(c.guest_password, guestPassword) < 0) {
    VORN_LOG(LOG_ERR, "Failed to Encrypt plain text");
    return -1;
  }
  Hash hash(VLIBCSzHashAlloc(kHashSize));
  PVLIBSZHASH h = hash.get();
  if (h == nullptr) {
    VORN_LOG(LOG_ERR, "Failed to allocate memory");
    return -1;
  }
  VLIBCSzHashSetValue(h, "bssid", c.bssid.ToCString());
  VLIBCSzHashSetValue(h, "driver", Text(c.driver).c_str());
  VLIBCSzHashSetValue(h, "enabled", YesNo(c.enabled));
  VLIBCSzHashSetValue(h, "ssid", c.ssid.c_str());
  VLIBCSzHashSetValue(h, "display_ssid", YesNo(c.display_ssid));
  VLIBCSzHashSetValue(h, "mode", Text(c.mode).c_str());
  VLIBCSzHashSetValue(h, "bandwidth", Text(c.bandwidth).c_str());
  VLIBCSzHashSetValue(h, "channel", std::to_string(c.channel).c_str());
  VLIBCSzHashSetValue(h, "tx_power", Text(c.tx_power).c_str());
  VLIBCSzHashSetValue(h, "max_num_client", std::to_string(c.max_num_client).c_str());
  VLIBCSzHashSetValue(h, "wmm_enabled", YesNo(c.wmm_enabled));
  VLIBCSzHashSetValue(h, "schedule_enabled", YesNo(c.schedule_enabled));
  VLIBCSzHashSetValue(h, "is_pci_interface", YesNo(c.is_pci_interface));
  VLIBCSzHashSetValue(h, "CountryCode", c.CountryCode.c_str());
  VLIBCSzHashSetValue(h, "CountryRegion", utils::itoa(c.CountryRegion).c_str());
  VLIBCSzHashSetValue(h, "CountryRegionABand", utils::itoa(c.CountryRegionABand).c_str());
  VLIBCSzHashSetValue(h, "schedule", utils::rgbltoa(c.schedule, kScheduleCells).c_str());
  VLIBCSzHashSetValue(h, "security", Text(c.security).c_str());
  VLIBCSzHashSetValue(h, "encryption", Text(c.encryption).c_str());
  VLIBCSzHashSetValue(h, "password", password.c_str());
  VLIBCSzHashSetValue(h, "auth_server_ip", c.auth_server_ip.ToCString());
  VLIBCSzHashSetValue(h, "auth_server_Port", std::to_string(c.auth_server_Port).c_str());
  // The RADIUS secret stands in plain beside the enciphered passwords: so it is kept.
  VLIBCSzHashSetValue(h, "auth_server_shared_secret", c.auth_server_shared_secret.c_str());
  VLIBCSzHashSetValue(h, "guest_support", YesNo(c.guest_support));
  VLIBCSzHashSetValue(h, "guest_enabled", YesNo(c.guest_enabled));
  VLIBCSzHashSetValue(h, "guest_ssid", c.guest_ssid.c_str());
  VLIBCSzHashSetValue(h, "guest_display_ssid", YesNo(c.guest_display_ssid));
  VLIBCSzHashSetValue(h, "guest_bssid", c.guest_bssid.ToCString());
  VLIBCSzHashSetValue(h, "guest_max_num_client", std::to_string(c.guest_max_num_client).c_str());
  VLIBCSzHashSetValue(h, "guest_security", Text(c.guest_security).c_str());
  VLIBCSzHashSetValue(h, "guest_encryption", Text(c.guest_encryption).c_str());
  VLIBCSzHashSetValue(h, "guest_password", guestPassword.c_str());
  VLIBCSzHashSetValue(h, "guest_allow_access_guest", YesNo(c.guest_allow_access_guest));
  VLIBCSzHashSetValue(h, "guest_allow_access_lan", YesNo(c.guest_allow_access_lan));
  VLIBCSzHashSetValue(h, "guest_allow_access_http_https_only",
                      YesNo(c.guest_allow_access_http_https_only));
  VLIBCSzHashSetValue(h, "guest_schedule_enabled", YesNo(c.guest_schedule_enabled));
  VLIBCSzHashSetValue(h, "guest_schedule", utils::rgbltoa(c.guest_schedule, kScheduleCells).c_str());
  VLIBCSzHashSetValue(h, "mac_filter_policy", Text(c.mac_filter_policy).c_str());

  if (MakeDir(VORN_WIFI_CONFIG_DIR) < 0) return -1;
  if (WriteMacFilter(c) < 0) return -1;

  const std::string path = VORN_WIFI_AP_PREFIX + c.bssid.ToString();
  int exists = utils::IsSectionExist(path, "general");
  if (exists < 0) return -1;
  int ret = exists == 0 ? VLIBCFileAddSection(path.c_str(), "general", h, kLineFormat)
                        : VLIBCFileSetSection(path.c_str(), "general", h, kLineFormat);
  if (ret < 1) {
    VORN_LOG(LOG_ERR, "Failed to write section [%s] to file [%s]", "general", path.c_str());
    return -1;
  }
  return 0;
}

int AdapterData::WriteClient() const {
  const AdapterConfig& c = *_config;
  if (!UsableAddress(c.bssid)) return -1;
  Hash hash(VLIBCSzHashAlloc(kHashSize));
  PVLIBSZHASH h = hash.get();
  if (h == nullptr) {
    VORN_LOG(LOG_ERR, "Failed to allocate memory");
    return -1;
  }
  VLIBCSzHashSetValue(h, "clientenabled", YesNo(c.clientenabled));
  if (MakeDir(VORN_WIFI_CONFIG_DIR) < 0) return -1;

  // Written from scratch every time.
  const std::string path = VORN_WIFI_CLIENT_PREFIX + c.bssid.ToString();
  const std::string temp = TempPath(path);
  unlink(temp.c_str());
  if (VLIBCFileAddSection(temp.c_str(), "general", h, kLineFormat) < 1) {
    VORN_LOG(LOG_ERR, "Failed to write client enabled");
    unlink(temp.c_str());
    return -1;
  }
  VLIBCSzHashRemoveKey(h, "clientenabled");
  for (const AdapterConfig::StationInfo& s : c.station_list) {
    if (FillStation(h, s) < 0 ||
        VLIBCFileAddSection(temp.c_str(), s.bssid.ToCString(), h, kLineFormat) < 1) {
      VORN_LOG(LOG_ERR, "Failed to add section [%s] to file", s.bssid.ToCString());
      unlink(temp.c_str());
      return -1;
    }
  }
  return Publish(temp, path);
}

int AdapterData::Write() {
  switch (Adapter::GetTopology()) {
    case WIFI_TOPOLOGY_BRIDGE:
    case WIFI_TOPOLOGY_ROUTER:
      WriteAP();
      return 0;
    case WIFI_TOPOLOGY_CLIENT:
      WriteClient();
      return 0;
    case WIFI_TOPOLOGY_ERROR:
    case WIFI_TOPOLOGY_REPEATER:
      return 0;
  }
  return 0;
}

int AdapterData::SetConfig(const AdapterConfig& config) {
  if (&config == _config) return 0;
  const WIFI_TOPOLOGY topology = Adapter::GetTopology();
  if (topology == WIFI_TOPOLOGY_BRIDGE || topology == WIFI_TOPOLOGY_ROUTER) {
    SetAPConfig(config);
  } else if (topology == WIFI_TOPOLOGY_CLIENT) {
    SetClientConfig(config);
  } else {
    VORN_LOG(LOG_ERR, "Bad topology [%d]", static_cast<int>(topology));
    return -1;
  }
  // The incoming record replaces the held one whole; what lasts of the comparison is its flags.
  AdapterConfig* fresh = new AdapterConfig(config);
  delete _config;
  _config = fresh;
  return 0;
}

int AdapterData::SetAPConfig(const AdapterConfig& n) {
  AdapterConfig& o = *_config;
#define VORN_TAKE(field, flags)  \
  if (o.field != n.field) {      \
    o.field = n.field;           \
    flags;                       \
  }
  VORN_TAKE(enabled, (blConfig = true, blGuestRule = true));
  VORN_TAKE(ssid, blConfig = true);
  VORN_TAKE(display_ssid, blConfig = true);
  VORN_TAKE(mode, blConfig = true);
  VORN_TAKE(bandwidth, blConfig = true);
  VORN_TAKE(channel, blConfig = true);
  VORN_TAKE(wmm_enabled, blConfig = true);
  VORN_TAKE(CountryCode, blConfig = true);
  VORN_TAKE(CountryRegion, blConfig = true);
  VORN_TAKE(CountryRegionABand, blConfig = true);
  // The schedule flag follows this change alone; a changed cell may only raise it.
  blSchedule = o.schedule_enabled != n.schedule_enabled;
  o.schedule_enabled = n.schedule_enabled;
  for (unsigned i = 0; i < kScheduleCells; ++i) {
    if (o.schedule[i] != n.schedule[i]) {
      o.schedule[i] = n.schedule[i];
      blSchedule = true;
    }
  }
  VORN_TAKE(security, blConfig = true);
  VORN_TAKE(encryption, blConfig = true);
  VORN_TAKE(password, blConfig = true);
  VORN_TAKE(auth_server_ip, blConfig = true);
  VORN_TAKE(auth_server_Port, blConfig = true);
  VORN_TAKE(auth_server_shared_secret, blConfig = true);
  VORN_TAKE(guest_support, blConfig = true);
  VORN_TAKE(guest_enabled, (blConfig = true, blGuestRule = true));
  VORN_TAKE(guest_ssid, blConfig = true);
  VORN_TAKE(guest_display_ssid, blConfig = true);
  VORN_TAKE(guest_max_num_client, blConfig = true);
  VORN_TAKE(guest_security, blConfig = true);
  VORN_TAKE(guest_encryption, blConfig = true);
  VORN_TAKE(guest_password, blConfig = true);
  VORN_TAKE(guest_allow_access_guest, blConfig = true);
  VORN_TAKE(guest_allow_access_lan, blGuestRule = true);
  VORN_TAKE(guest_allow_access_http_https_only, blGuestRule = true);
  VORN_TAKE(guest_schedule_enabled, blGuestSchedule = true);
  // A changed guest timetable alone moves no flag.
  std::copy(n.guest_schedule, n.guest_schedule + kScheduleCells, o.guest_schedule);
  VORN_TAKE(mac_filter_policy, blConfig = true);
  VORN_TAKE(mac_filter_list, blConfig = true);
  VORN_TAKE(tx_power, blPower = true);
#undef VORN_TAKE
  return 0;
}

int AdapterData::SetClientConfig(const AdapterConfig& n) {
  if (n.station_list.empty()) {
    VORN_LOG(LOG_ERR, "stationList is null");
    return -1;
  }
  const AdapterConfig::StationInfo& first = n.station_list.front();
  std::vector<AdapterConfig::StationInfo>& held = _config->station_list;
  for (std::vector<AdapterConfig::StationInfo>::iterator it = held.begin(); it != held.end();
       ++it) {
    if (it->bssid == first.bssid) {
      held.erase(it);
      break;
    }
  }
  held.push_back(first);
  return 0;
}

RELOAD_STATUS AdapterData::GetReloadStatus() const {
  RELOAD_STATUS status;
  status.blConfig = blConfig;
  status.blPower = blPower;
  status.blSchedule = blSchedule;
  status.blGuestSchedule = blGuestSchedule;
  status.blGuestRule = blGuestRule;
  return status;
}

int AdapterData::ResetReloadStatus() {
  blConfig = blPower = blSchedule = blGuestSchedule = blGuestRule = false;
  return 0;
}

int AdapterData::EnableReloadStatus() {
  blConfig = blPower = blSchedule = blGuestSchedule = blGuestRule = true;
  return 0;
}

}  // namespace wifi
}  // namespace vornwireless
