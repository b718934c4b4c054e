// The modem information file /tmp/usbmodem.info<N>: the registry finds it, and its keys are read
// as the modem, its dialect and its node handler read them.
#ifndef VORN_FUZZ_ENTRIES_INFO_FILES_H
#define VORN_FUZZ_ENTRIES_INFO_FILES_H

#include <cstring>
#include <memory>
#include <string>

#include "entries/fuzz_input.h"
#include "entries/route_files.h"
#include "vornplatform/file.h"
#include "vornwireless/usbmodem_lib/usbmodem_atif.h"
#include "vornwireless/usbmodem_lib/usbmodem_devicenodehandler.h"
#include "vornwireless/usbmodem_lib/usbmodem_list.h"

namespace vornwireless {
namespace usbmodem_lib {
// Reaches the node handler's file readers without opening a serial node.
class USBModem_DeviceNodeHandlerTestPeer {
 public:
  static int RetryTimes(USBModem_DeviceNodeHandler& h, std::string const& info, int& times) {
    h._infoPath = info;
    return h.GetModemCmdRetryTimes(times);
  }
  // The node list of the file; nodes are opened, so only under a prefix with no nodes in it.
  static int NodeList(USBModem_DeviceNodeHandler& h, std::string const& info, size_t& count) {
    h._infoPath = info;
    h._queryCommand = "AT";
    const int r = h.InitDeviceNodeList();
    count = h._nodes.size();
    return r;
  }
};
}  // namespace usbmodem_lib
}  // namespace vornwireless

namespace vornfuzz {

const char kInfoFile[] = "/tmp/usbmodem.info7";
// Serial nodes are only looked for below this empty directory.
const char kNodePrefix[] = "/tmp/vorn-fuzz-nodes/";

inline void ReadInfoFile(const uint8_t* data, size_t size) {
  using namespace vornwireless::usbmodem_lib;
  Require(WriteWhole(kInfoFile, data, size), "the information file is written");
  USBModemList list;
  Require(list.SearchInfoPath() == 0, "the information files are searched");
  Require(!list.FindUSBModem(7).IsNull() && list.FindUSBModem("usbmodem7").GetIfid() == 7,
          "the modem of the file is listed");
  char buf[1024];
  std::string vendor;
  std::string prefix;
  for (const char* key : {"USB_VENDOR", "USB_PRODUCT", "DEVICENODE_PREFIX", "DEVICENODE",
                          "CONNECTNODE"}) {
    std::memset(buf, 0, sizeof buf);
    const int r = VLIBCFileGetKeyValue(kInfoFile, key, buf, sizeof buf, 0);
    if (r > 0) Require(std::strlen(buf) <= static_cast<size_t>(r), "a key's value");
    if (r > 0 && std::strcmp(key, "USB_VENDOR") == 0) vendor = buf;
    if (r > 0 && std::strcmp(key, "DEVICENODE_PREFIX") == 0) prefix = buf;
  }
  USBModem_ATIF::DeleteATIF(USBModem_ATIF::CreateATIF(vendor));
  USBModem_DeviceNodeHandler handler(7);
  int times = 0;
  if (USBModem_DeviceNodeHandlerTestPeer::RetryTimes(handler, kInfoFile, times) == 0) {
    Require(times == 1 || times == 3, "one or three tries");
  }
  if (prefix.compare(0, sizeof kNodePrefix - 1, kNodePrefix) == 0 &&
      prefix.find("..") == std::string::npos) {
    size_t count = 99;
    USBModem_DeviceNodeHandlerTestPeer::NodeList(handler, kInfoFile, count);
    Require(count == 0, "no node answers where there is none");
  }
}

}  // namespace vornfuzz

#endif
