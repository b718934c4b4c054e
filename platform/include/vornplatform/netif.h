// Facts of one network interface: live address, netmask, flags, carrier and MAC, and the address
// configured in its ifcfg file (/etc/sysconfig/network-scripts/ifcfg-IF).
#ifndef VORNPLATFORM_NETIF_H
#define VORNPLATFORM_NETIF_H

// One record for reading an interface and for handing its settings back to the platform.
typedef struct _VORN_NETIF_INFO {
  char szIfName[16];        // the interface name, NUL-terminated
  int iFlag;                // address mode: VORN_NETIF_DHCP or VORN_NETIF_STATIC
  char szIP[20];            // IPv4 address as text, "" when none
  char szMask[20];          // IPv4 netmask as text, "" when none
  unsigned int uFlags;      // the kernel's interface flags (IFF_UP is bit 0)
  int iLink;                // 1 when the interface has carrier, else 0
  unsigned char mac[6];     // hardware address (zeros when it has none)
} VORN_NETIF_INFO, *PVORN_NETIF_INFO;

#define VORN_NETIF_DHCP 0    // BOOTPROTO=dhcp in the ifcfg file
#define VORN_NETIF_STATIC 1  // any other BOOTPROTO, or no ifcfg file

// Fills *info with the live state of ifname; info2 (may be NULL) gets the same record with the
// address and netmask configured in the ifcfg file instead of the live ones.
// 1 = the interface exists (its address may be empty), 0 = no such interface (records cleared),
// -1 = bad parameter or the kernel could not be asked.
int VORNNetIFGetInfo(const char* ifname, PVORN_NETIF_INFO info, PVORN_NETIF_INFO info2);
// The live record alone: 0 on success, -1 on failure, a missing interface included.
int VORNNetIFGetInfo_S(const char* ifname, PVORN_NETIF_INFO info);

#endif
