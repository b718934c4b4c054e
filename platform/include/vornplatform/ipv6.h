// IPv6 settings of interfaces, IPv4 address tests and the PPPoE interface: what the IPv6 router
// watch and the IPv6 router modes ask of the platform.
#ifndef VORNPLATFORM_IPV6_H
#define VORNPLATFORM_IPV6_H

// Link types of VORNNetIsDevTypeMatch (the kernel's /sys/class/net/IF/type, read as a family).
#define VORN_DEV_TYPE_ETHERNET 1  // ARPHRD_ETHER
#define VORN_DEV_TYPE_PPP 2       // ARPHRD_PPP, ARPHRD_NONE (tun) and ARPHRD_SIT: links that
                                  // carry no Ethernet frames and may come up without IPv6

// IPv6 address modes of VORNNetIPv6ConfGet/Set.
#define VORN_IPV6_MODE_STATELESS 0        // router advertisements, SLAAC
#define VORN_IPV6_MODE_STATIC 1           // manual address: does not follow RAs
#define VORN_IPV6_MODE_MANAGED 2          // DHCPv6
#define VORN_IPV6_MODE_OFF 3              // IPv6 disabled: does not follow RAs
#define VORN_IPV6_MODE_STATELESS_DHCP 4   // SLAAC plus other configuration by DHCPv6

// The platform action "VORNNetIPv6ConfGet" with argv IF; its first stdout line is
// "MODE [ADDR [PREFIX [GW]]]". A missing action gives mode 0 and empty texts. The mode, or -1 on
// failure (bad parameter, the action failed or printed no mode).
int VORNNetIPv6ConfGet(const char* ifname, int* mode, char* addr, int addrSize, int* prefix,
                       char* gateway, int gatewaySize);
// The platform action "VORNNetIPv6ConfSet" with argv MODE IF ADDR PREFIX GW (a NULL text is
// passed as ""). 0, or -1 on failure.
int VORNNetIPv6ConfSet(int mode, const char* ifname, const char* addr, int prefix,
                       const char* gateway);

// The current PPPoE interface from the platform action "VORNPPPoeIntfGet" (first stdout line)
// into buf. 0; -1 when there is none (a missing action included) or on failure.
int VORNPPPoeIntfGet(char* buf, int size);

// 1 when ip is a private or local IPv4 address (10/8, 172.16/12, 192.168/16, 100.64/10,
// 127/8, 169.254/16); 0 when public; -1 when it is not an IPv4 address.
int VORNNetIsPrivateIP(const char* ip);
// 1 when text is a dotted IPv4 address, else 0.
int BlVLIBIsIpAddr(const char* text);

// 1 when ifname is administratively up, else 0 (missing interface included).
int VORNNetIsIFUp(const char* ifname);
// 1 when the interface's link type belongs to `type` (VORN_DEV_TYPE_...), else 0.
int VORNNetIsDevTypeMatch(const char* ifname, int type);
// Writes 0 (action 0: enable) or 1 (action 1: disable) to
// /proc/sys/net/ipv6/conf/IF/disable_ipv6. 0 on success, -1 on failure.
int VORNLnxIPv6ProcAction(const char* ifname, int action);
// Adds ("add") or deletes ("del") an address on a device through rtnetlink. family "-6" or
// "-4". 0, or -1 on failure.
int VORNNetSetIP(const char* family, const char* ifname, const char* address, int prefixLength,
                 const char* action);

#endif
