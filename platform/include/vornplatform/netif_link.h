// Link (carrier) state of a network interface.
#ifndef VORNPLATFORM_NETIF_LINK_H
#define VORNPLATFORM_NETIF_LINK_H

// 1 = the interface has link, 0 = no link (an administratively down interface included),
// -1 = error (bad name, no such interface; error register set). An OVS bond master (its ifcfg
// file has a non-empty SLAVE_LIST) has link when any member of that list has carrier.
int VORNNetIfIsLink(const char* ifname);

#endif
