// Dotted IPv4 texts: octets and subnet forms.
#ifndef VORNPLATFORM_IPADDR_H
#define VORNPLATFORM_IPADDR_H

// Splits a dotted IPv4 text at "." into decimal octets (0..255, at most the first four stored in
// octets). The number of parts, or -1 when a part is not a decimal octet or a parameter is NULL.
int cVLIBISepIP(const char* text, unsigned int octets[4]);

// "ip/mask" (a dotted contiguous netmask or a prefix length 0..32) to "network/prefix", written
// to out (at least 32 bytes). 0 on success, -1 on bad input.
int ErrVLIBIpMaskToSubnet(const char* ipmask, char* out);

#endif
