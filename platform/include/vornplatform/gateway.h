// The system's IPv4 default gateway: the live route of the main table (rtnetlink) and the
// configured value kept in a key file of ours.
#ifndef VORNPLATFORM_GATEWAY_H
#define VORNPLATFORM_GATEWAY_H

// The configured gateway: key VORN_GATEWAY_CONF_KEY of the key file VORN_GATEWAY_CONF_FILE.
#define VORN_GATEWAY_CONF_FILE "/usr/vorn/etc/gateway.conf"
#define VORN_GATEWAY_CONF_KEY "default_gateway"
// The gateway that VORNNetDefaultGatewaySet(NULL) deleted, so that it can be put back later.
#define VORN_GATEWAY_DELETED_FILE "/run/vornplatform/deleted_default_gateway"

// The current default gateway as text into buf (size bytes, 20 is enough for IPv4): the gateway
// of the lowest-metric default route of the main table; when the kernel has none, the gateway
// that VORNNetDefaultGatewaySet(NULL) last deleted; "" when there is neither. 0; -1 on failure
// (bad parameter, kernel not reachable, buffer too small), error register set.
int VORNNetDefaultGatewayGet(char* buf, int size);
// The configured gateway as text ("" when none is configured). 0; -1 on failure.
int VORNNetDefaultGatewayGetConf(char* buf, int size);
// NULL: deletes every IPv4 default route of the main table and remembers the gateway of the
// lowest-metric one (when there was one). "": deletes them and forgets any remembered gateway.
// An IPv4 address: makes it the default gateway (route 0.0.0.0/0 metric 0 via it, replacing one
// that is there; the kernel picks the device) and forgets any remembered gateway.
// 0; -1 on failure (not an IPv4 address, the kernel refused), error register set.
int VORNNetDefaultGatewaySet(const char* gateway);
// Stores the configured gateway: an IPv4 address, or "" / NULL for none. 0; -1 on failure.
int VORNNetDefaultGatewaySetConf(const char* gateway);

#endif
