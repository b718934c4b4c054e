// The ARP scanner: bridge neighbours from /proc/net/arp, named from the lease file or NetBIOS.
#include "vornwireless/network/devicelist/arp_scanner.h"

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <exception>
#include <new>

#include "network/devicelist/scanner_util.h"
#include "vornplatform/devicelist.h"
#include "vornplatform/log.h"
#include "vornplatform/proc.h"

namespace vornnetwork {
namespace network {
namespace module {

namespace {
ArpScanner* _gArpScanner = nullptr;
}  // namespace

ArpScanner::ArpScanner() : _topology(0) {}

ArpScanner* ArpScanner::Inst() {
  if (_gArpScanner == nullptr) _gArpScanner = new (std::nothrow) ArpScanner();
  return _gArpScanner;
}

int ArpScanner::Start() { return 0; }
int ArpScanner::Stop() { return 0; }

Json::Value ArpScanner::GetData() {
  _clientList.EraseList();
  GetArpTable();
  return _clientList.GetClientList();
}

int ArpScanner::GetArpTable() {
  _topology = VLIBNetTopologyGet(0);
  if (_topology <= 1) return 0;  // no LAN of our own to look at
  FILE* fp = std::fopen(VORN_ARP_TABLE_FILE, "r");
  if (fp == nullptr) {
    VORN_LOG(LOG_ERR, "failed to open file (%s)", VORN_ARP_TABLE_FILE);
    return -1;
  }
  std::string line;
  while (ReadLine(fp, line)) AppendClientList(line);
  std::fclose(fp);
  return 0;
}

int ArpScanner::AppendClientList(std::string const& line) {
  // IP address, HW type, Flags, HW address, Mask, Device
  std::vector<std::string> words = SplitBlanks(line);
  std::string const device = words.size() > 5 ? words[5] : std::string();
  // Only bridge members are listed; the heading line has "Device" here.
  if (device.empty() || device.find("br") == std::string::npos) return 0;
  std::string const& ip = words[0];
  std::string const& mac = words[3];
  std::string name;
  if (_topology == 3) GetDHCPInfoByMAC(mac, name);
  if (name.empty()) GetNmbInfoByIP(ip, name);
  Json::Value object(Json::objectValue);
  if (!name.empty()) object["friendlyName"] = name;
  object["netif"] = device;
  object["ipAddr"] = ip;
  object["macAddr"] = mac;
  if (!_clientList.UpdateKeysByMac(mac, object, true)) {
    VORN_LOG(LOG_ERR, "failed to update key for arp data");
    return -1;
  }
  return 0;
}

int ArpScanner::GetDHCPInfoByMAC(std::string const& mac, std::string& name) {
  FILE* fp = std::fopen(VORN_DHCP_LEASES_FILE, "r");
  if (fp == nullptr) {
    VORN_LOG(LOG_ERR, "Failed to open dhcp leases file");
    return -1;
  }
  std::string line;
  while (ReadLine(fp, line)) {
    if (mac.empty() || line.find(mac) == std::string::npos) continue;
    // expiry mac ip name clientid
    std::vector<std::string> words = SplitBlanks(line);
    if (words.size() > 3) name = words[3];
    break;
  }
  std::fclose(fp);
  return 0;
}

bool ArpScanner::IsUniqueActiveLine(char const* line) {
  if (std::strstr(line, "#ACTIVE$") != nullptr && std::strstr(line, "#GROUP$") == nullptr) {
    return true;
  }
  return std::strstr(line, "<ACTIVE>") != nullptr && std::strstr(line, "<GROUP>") == nullptr;
}

int ArpScanner::GetNmbInfoByIP(std::string const& ip, std::string& name) {
  FILE* fp = VLIBCPopen(VORN_NMBLOOKUP, "r", "-A", ip.c_str(), static_cast<char const*>(nullptr));
  if (fp == nullptr) {
    VORN_LOG(LOG_ERR, "Failed to execute cmd [%s -A %s]", VORN_NMBLOOKUP, ip.c_str());
    return -1;
  }
  // The unique active name, or failing one the last line read.
  std::string line;
  std::string last;
  while (ReadLine(fp, line)) {
    last = line;
    if (IsUniqueActiveLine(line.c_str())) break;
  }
  VLIBCPclose(fp);
  std::vector<std::string> words = SplitBlanks(last);
  if (!words.empty()) name = words[0];
  return 0;
}

}  // namespace module
}  // namespace network
}  // namespace vornnetwork
