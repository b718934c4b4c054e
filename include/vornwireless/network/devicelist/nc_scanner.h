// NCScanner: the maker's own units, found by the platform's host finder in the background; the
// list file it leaves is read at the next GetData.
#ifndef VORNWIRELESS_NETWORK_DEVICELIST_NC_SCANNER_H
#define VORNWIRELESS_NETWORK_DEVICELIST_NC_SCANNER_H

#include <json/json.h>
#include <pthread.h>

#include "vornwireless/network/devicelist/client_list.h"

#define VORN_FHOST_LIST_FILE "/tmp/vornnc.list.tmp"
#define VORN_NC_PRIVATE_LIST_FILE "/tmp/linkdesk_ncscanner_list.tmp"

namespace vornnetwork {
namespace network {
namespace module {

class NCScanner {
 public:
  static NCScanner* Inst();
  int Start();  // 0
  int Stop();   // 0
  // Starts a search when none runs, reads the last search's list, returns it, erases it.
  Json::Value GetData();

  static void* WaitBoardcastFinish(void* scanner);
  int ReadFHOSTListFile();  // 0, -1
  int BoardcastFindHost();  // 0, -1 when the thread cannot be made

  static bool IsBoardCasting;

 private:
  NCScanner() = default;
  pthread_t _thread{};
  ClientList _clientList;
};

}  // namespace module
}  // namespace network
}  // namespace vornnetwork

#endif
