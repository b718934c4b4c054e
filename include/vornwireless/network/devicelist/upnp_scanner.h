// UpnpScanner: UPnP devices found by an SSDP search "ssdp:all" in the background, each with the
// data of its description document. A search runs about 13 seconds; what it finds is handed out
// by the next GetData.
#ifndef VORNWIRELESS_NETWORK_DEVICELIST_UPNP_SCANNER_H
#define VORNWIRELESS_NETWORK_DEVICELIST_UPNP_SCANNER_H

#include <json/json.h>
#include <pthread.h>

#include <cstdint>
#include <string>

#include "vornwireless/network/devicelist/client_list.h"

struct _IXML_Document;

namespace vornnetwork {
namespace network {
namespace module {

class UpnpScanner {
 public:
  static UpnpScanner* Inst();
  int Start();  // 0
  // Ends a running search early and waits until its thread has let go of the library and the
  // list. 0, -1 when the search did not end in time.
  int Stop();
  // Starts a search when none runs; gives what earlier searches found and forgets it.
  Json::Value GetData();

  int StartUpnp();  // 0, -1
  int StopUpnp();   // 0, -1
  // The search thread: start, search, wait the window out (or a Stop), stop, exit.
  static void* WaitBoardcastFinish(void* scanner);
  // The text of the first element named tag; "" when there is none.
  static std::string SearchValueByTagName(_IXML_Document* document, char const* tag);
  // One discovery event (an UpnpDiscovery): 0 or the library's error code, -1 for no event.
  int HandleDiscovery(void const* event, int type);
  // The library's callback: discoveries go to the scanner passed as cookie. Always 0.
  static int CallbackEventHandler(int type, void const* event, void* cookie);
  // Starts the search thread unless one runs. 0, -1 when the thread cannot be made.
  int BoardcastUpnp();

  static bool IsBoardCasting;

 private:
  UpnpScanner();
  // Makes the library's search leave through the LAN bridge whatever the routing table says.
  void PinSearchToLan(int const* socketsBefore, int count);

  uint16_t _port;
  int _handle;
  ClientList _clientList;
  pthread_t _thread;
  pthread_mutex_t _stateMutex;  // round IsBoardCasting, _stopRequested and the wake-up
  pthread_cond_t _stateCond;
  bool _stopRequested;
  std::string _lanIf;  // the bridge the search uses, "" to let the library choose
};

}  // namespace module
}  // namespace network
}  // namespace vornnetwork

#endif
