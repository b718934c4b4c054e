// ArpScanner: the devices in the kernel's neighbour table that sit behind a bridge, named from
// the DHCP server's lease file (when the unit runs it) or by NetBIOS.
#ifndef VORNWIRELESS_NETWORK_DEVICELIST_ARP_SCANNER_H
#define VORNWIRELESS_NETWORK_DEVICELIST_ARP_SCANNER_H

#include <json/json.h>

#include <string>

#include "vornwireless/network/devicelist/client_list.h"

#define VORN_ARP_TABLE_FILE "/proc/net/arp"
#define VORN_DHCP_LEASES_FILE "/etc/dhcpd/dhcpd.conf.leases"
#define VORN_NMBLOOKUP "/usr/bin/nmblookup"

namespace vornnetwork {
namespace network {
namespace module {

class ArpScanner {
 public:
  static ArpScanner* Inst();
  int Start();  // 0
  int Stop();   // 0
  // Always fresh: the list is erased, the table read, and a copy returned.
  Json::Value GetData();

  // The fourth word of the first lease line holding the MAC. 0 (found or not), -1 without file.
  int GetDHCPInfoByMAC(std::string const& mac, std::string& name);
  // The unique active name "nmblookup -A ip" reports. 0, -1 when it cannot run.
  int GetNmbInfoByIP(std::string const& ip, std::string& name);
  // One line of the table: 0 listed or skipped, -1 when the update failed.
  int AppendClientList(std::string const& line);
  // 0 (also for a unit without LAN), -1 when the table cannot be read.
  int GetArpTable();

  // The name in one line of nmblookup's output: the first word of a unique active name line
  // ("<ACTIVE>" without "<GROUP>", or "#ACTIVE$" without "#GROUP$"); "" for other lines.
  static bool IsUniqueActiveLine(char const* line);

 private:
  ArpScanner();
  ClientList _clientList;
  int _topology;
};

}  // namespace module
}  // namespace network
}  // namespace vornnetwork

#endif
