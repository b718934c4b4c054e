// Reads of the machine's state for the Wi-Fi code: the built-in radio, kernel modules,
// interfaces and bridges, topology keys, signal strength and station data; the password cipher
// and the section test of the stored files.
#include "vornwireless/wifi/utils.h"

#include <glob.h>
#include <unistd.h>

#include <cstdio>
#include <cstring>
#include <memory>
#include <sstream>

#include "vornplatform/crypt.h"
#include "vornplatform/file.h"
#include "vornplatform/log.h"
#include "vornplatform/netif.h"
#include "vornplatform/netif_events.h"
#include "vornplatform/ovs.h"
#include "vornplatform/proc.h"
#include "vornplatform/szhash.h"
#include "vornwireless/utils/is_sky_model.h"

namespace vornwireless {
namespace wifi {
namespace utils {

namespace {

const char kInfoFile[] = "/etc/vorninfo.conf";
const char kTopologyKey[] = "net_topology";

struct ListDeleter {
  void operator()(PVLIBSZLIST l) const { VLIBCSzListFree(l); }
};
typedef std::unique_ptr<VLIBSZLIST, ListDeleter> List;

struct FileCloser {
  void operator()(FILE* fp) const { std::fclose(fp); }
};
typedef std::unique_ptr<FILE, FileCloser> File;

struct PipeCloser {
  void operator()(FILE* fp) const { VLIBCPclose(fp); }
};
typedef std::unique_ptr<FILE, PipeCloser> Pipe;

bool KeyIsYes(const char* key) { return VLIBCFileCheckKeyValue(kInfoFile, key, "yes", 1) == 1; }

}  // namespace

// ---- stored passwords and section files ----------------------------------------------------

int EncryptPlainText(const std::string& plain, std::string& out) {
  char buf[1024];
  if (VLIBCCryptSzEncrypt(plain.c_str(), buf, sizeof buf) == 0) {
    VORN_LOG(LOG_ERR, "VLIBCCryptSzEncrypt failed");
    return -1;
  }
  out = buf;
  return 0;
}

int DecryptCipherText(const std::string& cipher, std::string& out) {
  char buf[1024];
  if (VLIBCCryptSzDecrypt(cipher.c_str(), buf, sizeof buf) == 0) {
    VORN_LOG(LOG_ERR, "VLIBCCryptSzDecrypt failed");
    return -1;
  }
  out = buf;
  return 0;
}

int IsSectionExist(const std::string& path, const std::string& name) {
  if (path.empty() || name.empty()) {
    VORN_LOG(LOG_ERR, "Wrong Parameter.");
    return -1;
  }
  if (access(path.c_str(), R_OK) != 0) {
    VORN_LOG(LOG_ERR, "File %s doesn't exist", path.c_str());
    return 0;
  }
  List list(VLIBCSzListAlloc(1024));
  PVLIBSZLIST l = list.get();
  if (l == nullptr) {
    VORN_LOG(LOG_ERR, "Failed to allocate memory");
    return -1;
  }
  if (VLIBCFileEnumSection(path.c_str(), &l) < 0) {
    VORN_LOG(LOG_ERR, "Failed to enum sections of [%s]", path.c_str());
    return -1;
  }
  for (int i = 0; i < VLIBCSzListCount(l); ++i) {
    if (std::strncmp(VLIBCSzListGet(l, i), name.c_str(), 1024) == 0) return 1;
  }
  return 0;
}

// ---- identity of the built-in radio ---------------------------------------------------------

bool Is715SkyBuiltInWlan(const std::string& ifname) {
  File fp(std::fopen("/proc/pcie_wifi_ifname", "r"));
  if (!fp) return false;
  char word[256];
  if (std::fscanf(fp.get(), "%255s", word) != 1) return false;
  return ifname == word;
}

bool Is713SkyBuiltInWlan(const std::string& ifname) {
  if (!vornwireless::utils::Is713SkyModel()) return false;
  const std::string dir = "/sys/devices/pci0000:00/0000:00:01.0/net/" + ifname;
  return VLIBCFileCheckDir(dir.c_str()) == 1;
}

bool IsSkyBuiltInWlan(const std::string& ifname) {
  return Is715SkyBuiltInWlan(ifname) || Is713SkyBuiltInWlan(ifname);
}

bool IsGuestNetworkSupport(const std::string& ifname) {
  return ifname == "wlan0" && vornwireless::utils::IsSkyModel();
}

int Get715SkyWlanMacAddress(MacAddress& mac) {
  Pipe fp(VLIBCPopen("/bin/cat", "r", "/proc/sys/kernel/vorn_mac_address3", nullptr));
  if (!fp) {
    VORN_LOG(LOG_ERR, "Failed to get vorn_mac_address3");
    return -1;
  }
  char line[256] = "";
  if (std::fgets(line, sizeof line, fp.get()) == nullptr) line[0] = '\0';
  std::istringstream stream(line);
  MacAddress address;
  stream >> address;
  if (!address.IsFormalized()) {
    VORN_LOG(LOG_ERR, "Bad mac address");
    return -1;
  }
  mac = address;
  return 0;
}

// ---- kernel modules of the RLT driver -------------------------------------------------------

int InsertRLTKernelModule(const std::string& file) {
  MacAddress mac;
  if (Get715SkyWlanMacAddress(mac) < 0) {
    VORN_LOG(LOG_ERR, "Failed to get mac");
    return -1;
  }
  const std::string path = "/lib/modules/" + file;
  const std::string arg = "mac=" + mac.ToString();
  if (VLIBCExec("/sbin/insmod", path.c_str(), arg.c_str(), nullptr, nullptr) < 0) {
    VORN_LOG(LOG_ERR, "Failed to load rlt_wifi");
    return -1;
  }
  return 0;
}

int RemoveRLTKernelModule(const std::string& name) {
  if (VLIBCExec("/sbin/rmmod", name.c_str(), nullptr, nullptr, nullptr) < 0) {
    VORN_LOG(LOG_ERR, "Failed to remove module");
    return -1;
  }
  return 0;
}

// ---- interfaces -----------------------------------------------------------------------------

int GetAdapterNum() {
  glob64_t found;
  std::memset(&found, 0, sizeof found);
  int ret = glob64("/sys/class/net/wlan*", GLOB_ONLYDIR, nullptr, &found);
  int count = 0;
  switch (ret) {
    case 0:
      count = static_cast<int>(found.gl_pathc);
      break;
    case GLOB_NOSPACE:
      VORN_LOG(LOG_ERR, "Failed to allocate memory to hold the result");
      count = -1;
      break;
    case GLOB_ABORTED:
      VORN_LOG(LOG_ERR, "There was an error opening a directory");
      count = -1;
      break;
    default:  // no match
      count = 0;
      break;
  }
  globfree64(&found);
  return count;
}

int GetWirelessIndex(const std::string& ifname) {
  int index = -1;
  return std::sscanf(ifname.c_str(), "wlan%d", &index) == 1 ? index : -1;
}

int GetGuestBridgeIndex(const std::string& name) {
  int index = -1;
  return std::sscanf(name.c_str(), "gbr%d", &index) == 1 ? index : -1;
}

std::string GetBssid(const std::string& ifname) {
  const std::string path = "/sys/class/net/" + ifname + "/address";
  // An interface name never climbs out of the directory.
  File fp(ifname.empty() || ifname.find('/') != std::string::npos || ifname == "." ||
                  ifname == ".."
              ? nullptr
              : std::fopen(path.c_str(), "r"));
  if (!fp) {
    VORN_LOG(LOG_ERR, "Failed to open [%s]", path.c_str());
    return "";
  }
  char word[256];
  if (std::fscanf(fp.get(), "%255s", word) != 1) {
    VORN_LOG(LOG_INFO, "search string %s return EOF", path.c_str());
    return "";
  }
  return word;
}

bool IsNetActivate(const std::string& ifname) {
  VORN_NETIF_INFO info;
  std::memset(&info, 0, sizeof info);
  if (VORNNetIFGetInfo(ifname.c_str(), &info, nullptr) != 1) return false;
  return (info.uFlags & 1u) != 0 && info.iLink != 0;
}

int GetFirstExistentSlaveByBridge(const std::string& bridge, std::string& out) {
  Pipe fp(VLIBCPopen("/usr/bin/brctl", "r", "show", nullptr));
  if (!fp) {
    VORN_LOG(LOG_ERR, "Failed to execute command");
    return -1;
  }
  out.clear();
  char line[1024];
  while (std::fgets(line, sizeof line, fp.get()) != nullptr) {
    // A plain substring test: "br0" also finds the line of "lbr0".
    if (std::strstr(line, bridge.c_str()) == nullptr) continue;
    char w1[1024], w2[1024], w3[1024], w4[1024];
    if (std::sscanf(line, "%1023s %1023s %1023s %1023s", w1, w2, w3, w4) == 4) out = w4;
    break;
  }
  return 0;
}

std::string GetBridgeName(WIFI_TOPOLOGY topology) {
  switch (topology) {
    case WIFI_TOPOLOGY_BRIDGE:
      return VORN::OVS::IsOVSRunning() ? "ovs_eth0" : "br0";
    case WIFI_TOPOLOGY_ROUTER:
      return "lbr0";
    case WIFI_TOPOLOGY_ERROR:
    case WIFI_TOPOLOGY_CLIENT:
    case WIFI_TOPOLOGY_REPEATER:
      break;
  }
  return "";
}

void GetBridgeConfigName(WIFI_TOPOLOGY topology, std::ostream& stream) {
  if (topology == WIFI_TOPOLOGY_BRIDGE && VORN::OVS::IsOVSRunning()) {
    stream << "/usr/vorn/etc/wifi/wifi_topology_bridge_ovs_nc";
  } else {
    stream << "/usr/vorn/etc/wifi/wifi_topology_" << EnumMap<WIFI_TOPOLOGY>::EnumToString(topology);
  }
}

// ---- topology keys of /etc/vorninfo.conf ----------------------------------------------------

WIFI_TOPOLOGY ReadTopology() {
  char buf[256] = "";
  int ret = VLIBCFileGetKeyValue(kInfoFile, kTopologyKey, buf, sizeof buf, 0);
  if (ret < 0) {
    VORN_LOG(LOG_ERR, "Failed to Get Key [%s] from config [%s]", kTopologyKey, kInfoFile);
    return WIFI_TOPOLOGY_ERROR;
  }
  if (ret == 0) {
    // A unit without the key is a client.
    return WriteTopology(WIFI_TOPOLOGY_CLIENT) < 0 ? WIFI_TOPOLOGY_ERROR : WIFI_TOPOLOGY_CLIENT;
  }
  return EnumMap<WIFI_TOPOLOGY>::StringToEnum(buf);
}

int WriteTopology(WIFI_TOPOLOGY topology) {
  const std::string text = EnumMap<WIFI_TOPOLOGY>::EnumToString(topology);
  if (VLIBCFileSetKeyValue(kInfoFile, kTopologyKey, text.c_str(), "%s=\"%s\"\n") < 0) {
    VORN_LOG(LOG_ERR, "Failed to write value [%s] to key [%s] for config [%s]", text.c_str(),
             kTopologyKey, kInfoFile);
    return -1;
  }
  return 0;
}

int GetTopologyString(std::string& out) {
  if (VLIBCProcAliveByPidFile("/var/run/vornwifid.pid") != 1) {
    out = "none";
    return 0;
  }
  WIFI_TOPOLOGY topology = ReadTopology();
  if (topology == WIFI_TOPOLOGY_ERROR) {
    VORN_LOG(LOG_ERR, "Failed to read current topology");
    return -1;
  }
  out = EnumMap<WIFI_TOPOLOGY>::EnumToString(topology);
  return 0;
}

int SetSupportNetTopology(bool support) {
  if (VLIBCINFOSetKeyValue("support_net_topology", support ? "yes" : "no") < 0) {
    VORN_LOG(LOG_ERR, "Failed to set key [%s] in file [%s]", "support_net_topology", kInfoFile);
    return -1;
  }
  return 0;
}

bool IsSupportTopology() { return KeyIsYes("support_net_topology"); }
bool HasWifiDongle() { return KeyIsYes("has_wifi_dongle"); }

int GetSupportedMode(std::string& out) {
  List list(VLIBCSzListAlloc(1024));
  PVLIBSZLIST l = list.get();
  if (l == nullptr || VLIBCFileEnumDir("/tmp/", "wireless.info", &l, VLIBC_ENUM_DIR_ANY) < 0) {
    VORN_LOG(LOG_ERR, "Failed to enum all files under (%s)", "/tmp/");
    return -1;
  }
  out.clear();
  if (VLIBCSzListCount(l) <= 0) return 0;
  // Every dongle must have a module for a role.
  bool ap = true, client = true;
  for (int i = 0; i < VLIBCSzListCount(l); ++i) {
    const std::string path = std::string("/tmp/") + VLIBCSzListGet(l, i);
    char buf[1024];
    if (VLIBCFileGetKeyValue(path.c_str(), "AP_MODULE", buf, sizeof buf, 0) <= 0) ap = false;
    if (VLIBCFileGetKeyValue(path.c_str(), "CLIENT_MODULE", buf, sizeof buf, 0) <= 0) {
      client = false;
    }
  }
  if (ap) out += "bridge router ";
  if (client) out += "client";
  return 0;
}

// ---- signal and station data ----------------------------------------------------------------

int GetSignalStrength(const std::string& ifname) {
  Pipe fp(VLIBCPopen("/sbin/iwconfig", "r", ifname.c_str(), nullptr));
  if (!fp) {
    VORN_LOG(LOG_ERR, "Failed on command iwconfig to get singal quality");
    return -1;
  }
  char line[1024];
  while (std::fgets(line, sizeof line, fp.get()) != nullptr) {
    if (std::strstr(line, "Link Quality") == nullptr) continue;
    int value = 0, maximum = 0;
    int got = std::sscanf(line, " Link Quality=%d/%d", &value, &maximum);
    // A maximum of 0 cannot scale: the value stands as it is.
    if (got == 2 && maximum != 0) return value * 100 / maximum;
    if (got >= 1) return value;
    break;
  }
  return 70;
}

int GetDHCPInfoByMAC(const MacAddress& mac, IPAddress& ip, std::string& hostname) {
  File fp(std::fopen("/etc/dhcpd/dhcpd.conf.leases", "r"));
  if (!fp) {
    VORN_LOG(LOG_ERR, "Failed to open dhcp leases file");
    return -1;
  }
  const std::string text = mac.ToString();
  char line[1024];
  while (!text.empty() && std::fgets(line, sizeof line, fp.get()) != nullptr) {
    if (std::strstr(line, text.c_str()) == nullptr) continue;
    char w1[1024], w2[1024], w3[1024], w4[1024];
    int got = std::sscanf(line, "%1023s %1023s %1023s %1023s", w1, w2, w3, w4);
    if (got >= 3) ip = std::string(w3);
    if (got >= 4) hostname = w4;
    break;
  }
  return 0;
}

int GetArpInfoByMAC(const MacAddress& mac, IPAddress& ip, std::string& /*hostname*/) {
  File fp(std::fopen("/proc/net/arp", "r"));
  if (!fp) {
    VORN_LOG(LOG_ERR, "failed to open file (%s)", "/proc/net/arp");
    return -1;
  }
  const std::string text = mac.ToString();
  char line[1024];
  while (!text.empty() && std::fgets(line, sizeof line, fp.get()) != nullptr) {
    if (std::strstr(line, text.c_str()) == nullptr) continue;
    char w1[1024];
    if (std::sscanf(line, "%1023s", w1) != 1) continue;
    ip = std::string(w1);
    return 0;
  }
  return -1;
}

Json::Value ParseConnectionList(const std::vector<ConnectionInfo>& list) {
  Json::Value array(Json::arrayValue);
  for (const ConnectionInfo& c : list) {
    Json::Value item(Json::objectValue);
    item["netif"] = c.netif;
    item["mac"] = c.mac.ToString();
    item["asso_time"] = c.asso_time;
    item["ip"] = c.ip.ToString();
    item["hostname"] = c.hostname;
    array.append(item);
  }
  return array;
}

int GetConnectedAPInfo(const AdapterConfig& config, Json::Value& json) {
  std::string bssid;
  const std::string conf = "/usr/vorn/etc/wpa_supplicant.conf." + config.interface;
  if (access(conf.c_str(), F_OK) == 0) {
    File fp(std::fopen(conf.c_str(), "r"));
    if (!fp) {
      VORN_LOG(LOG_ERR, "Failed to open file [%s]", conf.c_str());
    } else {
      char line[1024];
      while (std::fgets(line, sizeof line, fp.get()) != nullptr) {
        if (std::strstr(line, "bssid") == nullptr) continue;
        const char* eq = std::strchr(line, '=');
        if (eq != nullptr) bssid = std::string(eq + 1).substr(0, 17);
        break;
      }
    }
  }
  if (bssid.empty()) bssid = "00:00:00:00:00:00";

  for (const AdapterConfig::StationInfo& s : config.station_list) {
    if (s.bssid.ToString() == bssid) {
      json = StationInfoToJson(s);
      break;
    }
  }

  int signal = GetSignalStrength(config.interface);
  if (signal < 0 || signal > 100) {
    VORN_LOG(LOG_ERR, "Error value of signal strength for [%s]", config.interface.c_str());
    return -1;
  }
  json["signal"] = signal;

  if (BlVORNLnxIsDHCP(config.interface.c_str())) {
    const std::string info = "/etc/dhclient/ipv4/dhcpcd-" + config.interface + ".info";
    const char* keys[][2] = {{"IPADDR", "ip"}, {"NETMASK", "netmask"}, {"GATEWAY", "gateway"}};
    for (const auto& k : keys) {
      char buf[256] = "";
      if (VLIBCFileGetKeyValue(info.c_str(), k[0], buf, sizeof buf, 0) <= 0) buf[0] = '\0';
      json[k[1]] = buf;
    }
  }
  return 0;
}

}  // namespace utils
}  // namespace wifi
}  // namespace vornwireless
