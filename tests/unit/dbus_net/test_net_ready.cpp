// vorn-test-net-ready: prints 1 or 0, NetClient::IsServerReady() on the bus of the environment.
#include <cstdio>

#include "vornwireless/dbus_net/net_client.h"

int main() {
  vornnetwork::dbus::NetClient client;
  std::printf("%d\n", client.IsServerReady() ? 1 : 0);
  return 0;
}
