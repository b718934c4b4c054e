// The UPnP scanner: one SSDP search at a time in its own thread, with libupnp alive only for the
// length of that search. Discoveries arrive on the library's threads and go into the scanner's
// own list; GetData hands that list out and empties it.
#include "vornwireless/network/devicelist/upnp_scanner.h"

#include <arpa/inet.h>
#include <dirent.h>
#include <ifaddrs.h>
#include <net/if.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <time.h>
#include <upnp.h>
#include <upnptools.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <new>
#include <vector>

#include "vornplatform/log.h"

namespace vornnetwork {
namespace network {
namespace module {

namespace {

UpnpScanner* _gUpnpScanner = nullptr;
const int kSearchSeconds = 10;
// The search window plus a margin for late answers and description downloads.
const int kWaitSeconds = 13;
const int kStopWaitSeconds = 120;
char const kSearchTarget[] = "ssdp:all";

// The open descriptors of this process, sorted.
std::vector<int> OpenDescriptors() {
  std::vector<int> fds;
  DIR* dir = opendir("/proc/self/fd");
  if (dir == nullptr) return fds;
  int const own = dirfd(dir);
  while (struct dirent* entry = readdir(dir)) {
    char* end = nullptr;
    long fd = std::strtol(entry->d_name, &end, 10);
    if (end == entry->d_name || *end != '\0' || fd == own) continue;
    fds.push_back(static_cast<int>(fd));
  }
  closedir(dir);
  std::sort(fds.begin(), fds.end());
  return fds;
}

// The first bridge (a name holding "br", as the neighbour scan reads it) that is up with an IPv4
// address: the LAN the search is meant for. "" when there is none.
std::string FindLanBridge(std::string* address) {
  struct ifaddrs* all = nullptr;
  if (getifaddrs(&all) != 0) return std::string();
  std::string found;
  for (struct ifaddrs* a = all; a != nullptr; a = a->ifa_next) {
    if (a->ifa_addr == nullptr || a->ifa_addr->sa_family != AF_INET) continue;
    if ((a->ifa_flags & IFF_UP) == 0) continue;
    if (std::strstr(a->ifa_name, "br") == nullptr) continue;
    char text[INET_ADDRSTRLEN] = "";
    inet_ntop(AF_INET, &reinterpret_cast<struct sockaddr_in*>(a->ifa_addr)->sin_addr, text,
              sizeof(text));
    found = a->ifa_name;
    if (address != nullptr) *address = text;
    break;
  }
  freeifaddrs(all);
  return found;
}

// The library's callback type, forwarded to the scanner's handler.
int LibraryCallback(Upnp_EventType type, void const* event, void* cookie) {
  return UpnpScanner::CallbackEventHandler(static_cast<int>(type), event, cookie);
}

}  // namespace

bool UpnpScanner::IsBoardCasting = false;

UpnpScanner::UpnpScanner() : _port(49500), _handle(-1), _thread(), _stopRequested(false) {
  pthread_mutex_init(&_stateMutex, nullptr);
  pthread_condattr_t attr;
  pthread_condattr_init(&attr);
  // Waits count on the monotonic clock: setting the wall clock must not stretch a search.
  pthread_condattr_setclock(&attr, CLOCK_MONOTONIC);
  pthread_cond_init(&_stateCond, &attr);
  pthread_condattr_destroy(&attr);
}

UpnpScanner* UpnpScanner::Inst() {
  if (_gUpnpScanner == nullptr) _gUpnpScanner = new (std::nothrow) UpnpScanner();
  return _gUpnpScanner;
}

int UpnpScanner::Start() { return 0; }

int UpnpScanner::Stop() {
  pthread_mutex_lock(&_stateMutex);
  _stopRequested = true;
  pthread_cond_broadcast(&_stateCond);
  struct timespec deadline;
  clock_gettime(CLOCK_MONOTONIC, &deadline);
  deadline.tv_sec += kStopWaitSeconds;
  int rc = 0;
  while (IsBoardCasting && rc == 0) rc = pthread_cond_timedwait(&_stateCond, &_stateMutex, &deadline);
  bool const ended = !IsBoardCasting;
  _stopRequested = false;
  pthread_mutex_unlock(&_stateMutex);
  if (!ended) {
    VORN_LOG(LOG_ERR, "Error: upnp search did not end");
    return -1;
  }
  return 0;
}

Json::Value UpnpScanner::GetData() {
  BoardcastUpnp();
  // Taken and emptied in one step: an answer arriving meanwhile waits for the next request.
  return _clientList.TakeClientList();
}

int UpnpScanner::BoardcastUpnp() {
  pthread_mutex_lock(&_stateMutex);
  if (IsBoardCasting) {
    pthread_mutex_unlock(&_stateMutex);
    return 0;
  }
  IsBoardCasting = true;
  int rc = pthread_create(&_thread, nullptr, WaitBoardcastFinish, this);
  if (rc != 0) {
    VORN_LOG(LOG_ERR, "failed to create thread");
    IsBoardCasting = false;
  }
  pthread_mutex_unlock(&_stateMutex);
  return rc == 0 ? 0 : -1;
}

void* UpnpScanner::WaitBoardcastFinish(void* arg) {
  UpnpScanner* self = static_cast<UpnpScanner*>(arg);
  if (self->StartUpnp() != 0) {
    VORN_LOG(LOG_ERR, "Error: cannot start upnp");
  } else {
    int rc = UpnpSearchAsync(self->_handle, kSearchSeconds, kSearchTarget, self);
    if (rc != UPNP_E_SUCCESS) VORN_LOG(LOG_ERR, "Error UpnpSearchAsync : %d", rc);
    // The search window; a Stop ends it early.
    struct timespec deadline;
    clock_gettime(CLOCK_MONOTONIC, &deadline);
    deadline.tv_sec += kWaitSeconds;
    pthread_mutex_lock(&self->_stateMutex);
    int wait = 0;
    while (!self->_stopRequested && wait == 0) {
      wait = pthread_cond_timedwait(&self->_stateCond, &self->_stateMutex, &deadline);
    }
    pthread_mutex_unlock(&self->_stateMutex);
    // The library's threads (and their callbacks into the list) end here.
    if (self->StopUpnp() != 0) VORN_LOG(LOG_ERR, "Error: cannot stop upnp");
  }
  pthread_detach(pthread_self());
  pthread_mutex_lock(&self->_stateMutex);
  IsBoardCasting = false;
  pthread_cond_broadcast(&self->_stateCond);
  pthread_mutex_unlock(&self->_stateMutex);
  return nullptr;
}

int UpnpScanner::StartUpnp() {
  std::string address;
  _lanIf = FindLanBridge(&address);
  std::vector<int> before = OpenDescriptors();
  int rc = UpnpInit(_lanIf.empty() ? nullptr : address.c_str(), _port);
  if (rc != UPNP_E_SUCCESS) {
    VORN_LOG(LOG_ERR, "Failed to init UPNP, err=%d, port=%d", rc, static_cast<int>(_port));
    UpnpFinish();
    return -1;
  }
  PinSearchToLan(before.data(), static_cast<int>(before.size()));
  UpnpClient_Handle handle = -1;
  rc = UpnpRegisterClient(LibraryCallback, this, &handle);
  if (rc != UPNP_E_SUCCESS) {
    VORN_LOG(LOG_ERR, "Error registering as client : %d", rc);
    UpnpFinish();
    return -1;
  }
  _handle = handle;
  return 0;
}

void UpnpScanner::PinSearchToLan(int const* before, int count) {
  // libupnp 1.8 sets the search socket's multicast interface with a value the kernel reads as
  // "none", so its M-SEARCH would follow the routing table (out through the WAN when that holds
  // the default route). Binding the library's new, unbound UDP socket to the bridge keeps the
  // search and its answers on the LAN.
  if (_lanIf.empty()) return;
  for (int fd : OpenDescriptors()) {
    if (std::binary_search(before, before + count, fd)) continue;
    int type = 0;
    socklen_t len = sizeof(type);
    if (getsockopt(fd, SOL_SOCKET, SO_TYPE, &type, &len) != 0 || type != SOCK_DGRAM) continue;
    struct sockaddr_storage local;
    socklen_t localLen = sizeof(local);
    if (getsockname(fd, reinterpret_cast<struct sockaddr*>(&local), &localLen) != 0) continue;
    if (local.ss_family != AF_INET) continue;
    if (reinterpret_cast<struct sockaddr_in*>(&local)->sin_port != 0) continue;  // a listener
    if (setsockopt(fd, SOL_SOCKET, SO_BINDTODEVICE, _lanIf.c_str(),
                   static_cast<socklen_t>(_lanIf.size() + 1)) != 0) {
      int err = errno;
      VORN_LOG(LOG_ERR, "Error: cannot bind the upnp search to %s: %s", _lanIf.c_str(),
               std::strerror(err));
    }
  }
}

int UpnpScanner::StopUpnp() {
  int rc = UpnpUnRegisterClient(_handle);
  _handle = -1;
  if (rc != UPNP_E_SUCCESS) {
    VORN_LOG(LOG_ERR, "Error unregistering as client : %d", rc);
    UpnpFinish();
    return -1;
  }
  UpnpFinish();
  return 0;
}

int UpnpScanner::CallbackEventHandler(int type, void const* event, void* cookie) {
  switch (type) {
    case UPNP_DISCOVERY_ADVERTISEMENT_ALIVE:
    case UPNP_DISCOVERY_SEARCH_RESULT: {
      UpnpScanner* self = static_cast<UpnpScanner*>(cookie);
      if (self != nullptr) self->HandleDiscovery(event, type);
      break;
    }
    default:
      if (type < 0 || type > 12) {
        VORN_LOG(LOG_ERR, "Error in TvDeviceCallbackEventHandler: unknown event type %d", type);
      }
      break;
  }
  return 0;
}

std::string UpnpScanner::SearchValueByTagName(_IXML_Document* document, char const* tag) {
  std::string value;
  if (document == nullptr || tag == nullptr) return value;
  IXML_NodeList* nodes = ixmlDocument_getElementsByTagName(document, tag);
  if (nodes == nullptr) return value;
  IXML_Node* element = ixmlNodeList_item(nodes, 0);
  if (element != nullptr) {
    IXML_Node* text = ixmlNode_getFirstChild(element);
    if (text != nullptr) {
      char const* content = ixmlNode_getNodeValue(text);
      if (content != nullptr) value = content;
    }
  }
  ixmlNodeList_free(nodes);
  return value;
}

int UpnpScanner::HandleDiscovery(void const* event, int /*type*/) {
  UpnpDiscovery const* discovery = static_cast<UpnpDiscovery const*>(event);
  if (discovery == nullptr) {
    VORN_LOG(LOG_ERR, "Warning: null event for handlediscovery");
    return -1;
  }
  int err = UpnpDiscovery_get_ErrCode(discovery);
  if (err != 0) return err;
  struct sockaddr_storage const* source = UpnpDiscovery_get_DestAddr(discovery);
  std::string ip;
  if (source != nullptr && source->ss_family == AF_INET) {
    char text[INET_ADDRSTRLEN] = "";
    inet_ntop(AF_INET, &reinterpret_cast<struct sockaddr_in const*>(source)->sin_addr, text,
              sizeof(text));
    ip = text;
  }
  if (ip.empty()) return 0;
  char const* location = UpnpDiscovery_get_Location_cstr(discovery);
  if (location == nullptr || location[0] == '\0') return 0;
  IXML_Document* document = nullptr;
  err = UpnpDownloadXmlDoc(location, &document);
  if (err != UPNP_E_SUCCESS) {
    VORN_LOG(LOG_DEBUG, "description at %s not read: %d", location, err);
    return err;
  }
  Json::Value object(Json::objectValue);
  static char const* const kTags[] = {"deviceType", "modelName", "modelDescription",
                                      "friendlyName", "manufacturer"};
  for (char const* tag : kTags) {
    std::string value = SearchValueByTagName(document, tag);
    if (!value.empty()) object[tag] = value;
  }
  object["ipAddr"] = ip;
  if (!_clientList.UpdateKeysByIP(ip, object, true)) {
    VORN_LOG(LOG_ERR, "failed to update key for upnp data");
  }
  ixmlDocument_free(document);
  return 0;
}

}  // namespace module
}  // namespace network
}  // namespace vornnetwork
