// The link watcher fed datagrams through its own socket.
#include <cstddef>
#include <cstdint>

#include "entries/netlink_datagrams.h"

namespace {
vornnetwork::network::module::NetlinkModule* module = nullptr;
vornfuzz::DatagramSender* sender = nullptr;
}  // namespace

extern "C" int LLVMFuzzerInitialize(int*, char***) {
  vornfuzz::QuietSyslog();
  vornfuzz::RemoveEventPrograms();
  module = new vornnetwork::network::module::NetlinkModule();
  vornfuzz::Require(module->Initialize() == 0, "the watcher's socket");
  sender = new vornfuzz::DatagramSender();
  return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  vornfuzz::FeedDatagram(*module, *sender, data, size);
  return 0;
}
