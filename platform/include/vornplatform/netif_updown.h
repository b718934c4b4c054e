// Bringing a network interface up or down (the administrative IFF_UP flag).
#ifndef VORNPLATFORM_NETIF_UPDOWN_H
#define VORNPLATFORM_NETIF_UPDOWN_H

// Non-zero (1) on success, 0 on failure (bad name, no such interface, no permission; error
// register set). An interface already in the wanted state is a success.
int VLIBNetIfUp(const char* ifname);
int VLIBNetIfDown(const char* ifname);

#endif
