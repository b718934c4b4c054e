// What the route module asks of the system beside routes: an interface's IPv4 address, the
// high-availability state, the gateway and DNS change hooks and the resolver update.
#ifndef VORNPLATFORM_ROUTE_ACTIONS_H
#define VORNPLATFORM_ROUTE_ACTIONS_H

#include "vornplatform/szhash.h"

// The interface's IPv4 address (SIOCGIFADDR) as text into buf. 0; on failure (bad parameter, no
// such interface, no address, buffer too small) buf holds "" and the result is -1, error register
// set.
int VORNILnxGetIP(const char* ifname, char* buf, int size);

// Platform action "VORNHAIsRunning": its first stdout line "1" means the cluster runs. Non-zero
// when it runs; 0 otherwise, a missing or failing action included. Never negative.
int VORNHAIsRunning();
// Platform action "VORNHAGetHeartbeatIF": its first stdout line is the heartbeat interface,
// copied into buf. 0 (a missing action gives ""); -1 when the action fails or the name does not
// fit (buf then holds ""), error register set.
int VORNHAGetHeartbeatIF(char* buf, int size);

// Platform action "VORNNetGatewayConfigChangeHook" with argv STAGE FAMILY IFNAME OLD NEW (NULL
// texts pass as ""). Stage 4 is before the change, 5 after it; family "ipv4" or "ipv6".
// 0 (a missing action included); -1 when it cannot run or exits non-zero, error register set.
int VORNNetGatewayConfigChangeHook(int stage, const char* family, const char* ifname,
                                   const char* oldGateway, const char* newGateway);
// Platform action "VORNNetDnsConfigChangeHook" with argv STAGE IFNAME DNS... (the list's items;
// a NULL list gives none). Results as above.
int VORNNetDnsConfigChangeHook(int stage, const char* ifname, PVLIBSZLIST dnsList);

namespace vornnetsdk {
namespace sdk_s {
// Platform action "VORNNetDNSUpdate": the system resolver takes the resolver files. 0 (a missing
// action included); -1 when it cannot run or exits non-zero, error register set.
int VORNNetDNSUpdate_S();
}  // namespace sdk_s
}  // namespace vornnetsdk

#endif
