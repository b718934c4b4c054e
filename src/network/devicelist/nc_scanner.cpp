// The NC scanner: the host finder runs in a detached thread; its list file is read on request.
#include "vornwireless/network/devicelist/nc_scanner.h"

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <new>
#include <string>
#include <vector>

#include "network/devicelist/scanner_util.h"
#include "vornplatform/devicelist.h"
#include "vornplatform/err.h"
#include "vornplatform/file.h"
#include "vornplatform/log.h"

namespace vornnetwork {
namespace network {
namespace module {

namespace {
NCScanner* _gNCScanner = nullptr;
pthread_mutex_t gCastingMutex = PTHREAD_MUTEX_INITIALIZER;  // round IsBoardCasting

std::vector<std::string> SplitComma(std::string const& line) {
  std::vector<std::string> fields;
  std::string field;
  for (char c : line) {
    if (c == '\n' || c == '\r') continue;
    if (c == ',') {
      fields.push_back(field);
      field.clear();
    } else {
      field += c;
    }
  }
  fields.push_back(field);
  return fields;
}
}  // namespace

bool NCScanner::IsBoardCasting = false;

NCScanner* NCScanner::Inst() {
  if (_gNCScanner == nullptr) _gNCScanner = new (std::nothrow) NCScanner();
  return _gNCScanner;
}

int NCScanner::Start() { return 0; }
int NCScanner::Stop() { return 0; }

Json::Value NCScanner::GetData() {
  BoardcastFindHost();
  ReadFHOSTListFile();
  Json::Value data = _clientList.GetClientList();
  _clientList.EraseList();
  return data;
}

int NCScanner::BoardcastFindHost() {
  pthread_mutex_lock(&gCastingMutex);
  if (IsBoardCasting) {
    pthread_mutex_unlock(&gCastingMutex);
    return 0;
  }
  IsBoardCasting = true;
  pthread_mutex_unlock(&gCastingMutex);
  if (pthread_create(&_thread, nullptr, WaitBoardcastFinish, this) != 0) {
    VORN_LOG(LOG_ERR, "failed to create thread");
    pthread_mutex_lock(&gCastingMutex);
    IsBoardCasting = false;
    pthread_mutex_unlock(&gCastingMutex);
    return -1;
  }
  return 0;
}

void* NCScanner::WaitBoardcastFinish(void* /*scanner*/) {
  if (VORNFHOSTDumpHost() < 0) {
    VORN_LOG(LOG_ERR, "VORNFHOSTDumpHost() failed!! vornerr=[0x%04X]",
             static_cast<unsigned int>(VLIBCErrGet()));
  }
  pthread_detach(pthread_self());
  pthread_mutex_lock(&gCastingMutex);
  IsBoardCasting = false;
  pthread_mutex_unlock(&gCastingMutex);
  return nullptr;
}

int NCScanner::ReadFHOSTListFile() {
  bool const source = VLIBCFileExist(VORN_FHOST_LIST_FILE) == 1;
  if (!source && VLIBCFileExist(VORN_NC_PRIVATE_LIST_FILE) != 1) return 0;
  // The private copy survives while the next search rewrites the source.
  if (source && VORNFileCopy(VORN_FHOST_LIST_FILE, VORN_NC_PRIVATE_LIST_FILE, 0, 0) != 0) {
    VORN_LOG(LOG_ERR, "failed to copy (%s) to (%s)", VORN_FHOST_LIST_FILE,
             VORN_NC_PRIVATE_LIST_FILE);
  }
  FILE* fp = std::fopen(VORN_NC_PRIVATE_LIST_FILE, "r");
  if (fp == nullptr) {
    int err = errno;
    VORN_LOG(LOG_ERR, "ncscanner failed to open %s, error (%d):(%s)", VORN_NC_PRIVATE_LIST_FILE,
             err, std::strerror(err));
    return -1;
  }
  std::string line;
  while (ReadLine(fp, line)) {
    std::vector<std::string> fields = SplitComma(line);
    if (fields.size() < 5) {
      VORN_LOG(LOG_ERR, "field number < 5");
      continue;
    }
    if (std::atoi(fields[0].c_str()) == 0) {
      VORN_LOG(LOG_ERR, "model number == 0");
      continue;
    }
    if (std::atoi(fields[1].c_str()) < 240) continue;
    Json::Value object(Json::objectValue);
    object["deviceType"] = "nas";
    object["modelName"] = fields[1];
    object["manufacturer"] = "Vornlink";
    object["friendlyName"] = fields[2];
    object["ipAddr"] = fields[3];
    object["macAddr"] = fields[4];
    if (!_clientList.UpdateKeysByMac(fields[4], object, true)) {
      VORN_LOG(LOG_ERR, "failed to update key for nc scanner");
    }
  }
  std::fclose(fp);
  return 0;
}

}  // namespace module
}  // namespace network
}  // namespace vornnetwork
