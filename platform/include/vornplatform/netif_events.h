// Interface roles (bond, OVS bond, bridge port, DHCP), the interface list, and the system's
// reactions to link changes and to a renewed interface setting.
#ifndef VORNPLATFORM_NETIF_EVENTS_H
#define VORNPLATFORM_NETIF_EVENTS_H

#include "vornplatform/netif.h"

// Where the ifcfg files live: /etc/sysconfig/network-scripts/ifcfg-<IF>.
#define VORN_IFCFG_PREFIX "/etc/sysconfig/network-scripts/ifcfg-"

// 1 when ifname is a bonding member in the passive (backup) state, that is
// /sys/class/net/<IF>/bonding_slave/state reads "backup"; 0 otherwise (not a bond member, no such
// interface, bad name). Never negative.
int VORNNetIfIsBondingPassive(const char* ifname);

// 1 when ifname is a slave of an OVS bond: its ifcfg file has MASTER=<M> and the ifcfg file of M
// lists ifname in its blank-separated SLAVE_LIST. 0 otherwise. Never negative.
int VLIBNetOVSIfIsSlave(const char* ifname);

// 1 when ifname is the master of an OVS bond: its ifcfg file has a non-empty SLAVE_LIST.
// 0 otherwise. Never negative.
int VLIBNetOVSIfIsMaster(const char* ifname);

// 1 when ifname is a port of a Linux bridge (/sys/class/net/<IF>/brport exists), else 0.
int VLIBNetBridgeIfIsSlave(const char* ifname);

// Non-zero (1) when the interface takes its IPv4 address by DHCP: BOOTPROTO in its ifcfg file is
// "dhcp". 0 otherwise (static, no ifcfg file, bad name).
int BlVORNLnxIsDHCP(const char* ifname);

// One interface of VLIBNetGetInterfaceInfo.
typedef struct _VLIB_NET_IF_INFO {
  char szIfName[16];  // the interface name, NUL-terminated
  char szIP[20];      // its first IPv4 address as text, "" when it has none
  int iStatus;        // VLIB_NET_IF_STATUS_UP or VLIB_NET_IF_STATUS_DOWN
  unsigned int uFlags;  // the kernel's interface flags
} VLIB_NET_IF_INFO, *PVLIB_NET_IF_INFO;

#define VLIB_NET_IF_STATUS_DOWN 1  // not running
#define VLIB_NET_IF_STATUS_UP 2    // running (IFF_RUNNING: up and with carrier)

// Kinds of interfaces to list; a bit mask. Loopback interfaces are never listed.
#define VLIB_NET_IF_KIND_PHYSICAL 1  // interfaces with a device behind them (/sys/class/net/IF/device)
#define VLIB_NET_IF_KIND_VIRTUAL 2   // the others: veth, bridge, tap, ...
#define VLIB_NET_IF_KIND_ALL 3

// Fills info[0 .. capacity-1] with the interfaces of the given kinds, in the kernel's index order.
// The count of records written, or -1 (NULL array, capacity below 1, no kind bit, the kernel
// could not be asked; error register set). When there are more interfaces than capacity the
// first capacity ones are written and a LOG_WARNING line says how many were left out.
int VLIBNetGetInterfaceInfo(PVLIB_NET_IF_INFO info, int capacity, int kind);

namespace vornnetsdk {
namespace sdk_s {

// The system's reaction to a link coming up or going down: the platform actions
// "VLIBNetIfLinkUpEvent" and "VLIBNetIfLinkDownEvent" with argv IF. 0 on success (a missing
// action included); -1 for a bad name, an action that cannot run or exits non-zero (error
// register set).
int VLIBNetIfLinkUpEvent_S(const char* ifname);
int VLIBNetIfLinkDownEvent_S(const char* ifname);

}  // namespace sdk_s
}  // namespace vornnetsdk

// Same as BlVORNLnxIsDHCP.
int BlVORNLnxIsDHCP_S(const char* ifname);

// Hands an interface's settings back to the platform, which applies them: the platform action
// "VORNNetSetCard1" with argv IF FLAG IP MASK (FLAG is VORN_NETIF_DHCP or VORN_NETIF_STATIC in
// decimal; IP and MASK as in the record, possibly empty). For a DHCP interface that is what asks
// for a new lease. 0 on success (a missing action included); -1 for a NULL record, an empty or
// unterminated name, an action that cannot run or exits non-zero (error register set).
int VORNNetSetCard1_S(PVORN_NETIF_INFO info);

#endif
