// The registry of plugged modems. A dongle exists for us while its information file
// /tmp/usbmodem.info<N> exists; the hot-plug side writes and removes that file.
#include "vornwireless/usbmodem_lib/usbmodem_list.h"

#include <cerrno>
#include <cstdlib>
#include <string>
#include <vector>

#include "vornplatform/vlibc.h"
#include "vornplatform/log.h"

namespace vornwireless {
namespace usbmodem_lib {

namespace {

const char kInfoDir[] = "/tmp/";
const char kInfoPrefix[] = "usbmodem.info";

// The id in "usbmodem.info<N>" when the name is exactly that with N in plain decimal (no sign,
// no leading zero, nothing behind), else -1.
long ParseInfoName(std::string const& name) {
  std::string const prefix = kInfoPrefix;
  if (name.compare(0, prefix.size(), prefix) != 0) return -1;
  std::string digits = name.substr(prefix.size());
  if (digits.empty() || digits.size() > 10) return -1;
  for (char c : digits) {
    if (c < '0' || c > '9') return -1;
  }
  errno = 0;
  long n = std::strtol(digits.c_str(), nullptr, 10);
  if (errno != 0 || n < 0 || n > 0x7fffffffL) return -1;
  if (prefix + std::to_string(n) != name) return -1;
  return n;
}

}  // namespace

USBModemNull USBModemList::nullObject;

USBModemList::USBModemList() {}

USBModemList::~USBModemList() {}

USBModem& USBModemList::FindUSBModem(int ifid) {
  for (USBModem& modem : *this) {
    if (static_cast<long long>(modem.GetIfid()) == ifid) return modem;
  }
  return nullObject;
}

USBModem& USBModemList::FindUSBModem(std::string const& devid) {
  for (USBModem& modem : *this) {
    if (modem.GetDevId() == devid) return modem;
  }
  return nullObject;
}

int USBModemList::SearchInfoPath() {
  PVLIBSZLIST list = VLIBCSzListAlloc(1024);
  if (!list) {
    VORN_LOG(LOG_ERR, "Failed to alloc for pFolderList");
    VLIBC_ERR_SET(VLIBC_ERR_NO_MEMORY);
    return -1;
  }
  if (VLIBCFileEnumDir(kInfoDir, kInfoPrefix, &list, VLIBC_ENUM_DIR_ANY) < 0) {
    VORN_LOG(LOG_ERR, "Failed to enum all files under %s", kInfoDir);
    VLIBCSzListFree(list);
    return -1;
  }
  int count = VLIBCSzListCount(list);
  for (int i = 0; i < count; ++i) {
    const char* item = VLIBCSzListGet(list, i);
    if (!item) continue;
    std::string name = item;
    long n = ParseInfoName(name);
    if (n < 0) continue;
    if (FindUSBModem(static_cast<int>(n)).IsNull()) {
      push_back(USBModem(static_cast<unsigned int>(n), kInfoDir + name));
    }
  }
  VLIBCSzListFree(list);
  return 0;
}

int USBModemList::Update() {
  if (SearchInfoPath() < 0) {
    VORN_LOG(LOG_ERR, "Failed to search info path");
    return -1;
  }
  std::vector<size_type> gone;
  for (size_type i = 0; i < size(); ++i) {
    if (!(*this)[i].IsInfoExist()) gone.push_back(i);
  }
  // Each erase takes the index as collected: with two modems gone in one tick a neighbour may
  // go instead; the next tick finds the vanished one again and the other through its file.
  for (size_type index : gone) {
    if (index < size()) erase(begin() + static_cast<difference_type>(index));
  }
  for (USBModem& modem : *this) {
    if (modem.IsInited()) continue;
    if (modem.InitInfo() < 0) {
      VORN_LOG(LOG_ERR, "Failed to init info [%d]", modem.GetIfid());
      return -1;
    }
  }
  return 0;
}

}  // namespace usbmodem_lib
}  // namespace vornwireless
