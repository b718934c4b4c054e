// What the device list asks of the platform: the unit's network topology and the host finder.
#ifndef VORNPLATFORM_DEVICELIST_H
#define VORNPLATFORM_DEVICELIST_H

// The unit's topology code from "net_topology" in /etc/vorninfo.conf: "client" 1, "bridge" 2,
// "router" 3 (the unit runs the LAN's DHCP server), anything else or no file 0. These are not
// the Wi-Fi topology numbers. flags is unused (0).
int VLIBNetTopologyGet(int flags);

// The action "VORNFHOSTDumpHost": searches the network for the maker's units and writes
// /tmp/vornnc.list.tmp with lines "model,number,name,ip,mac". 0 (a missing action included),
// negative on failure (error register set).
int VORNFHOSTDumpHost();

#endif
