// ClientList: the record of the network's devices, one JSON document {"ClientList": [device...]}
// held in memory. A device is found by its MAC text or its IP text; an update copies every member
// of the incoming object over the stored device and keeps the members the object lacks.
#ifndef VORNWIRELESS_NETWORK_DEVICELIST_CLIENT_LIST_H
#define VORNWIRELESS_NETWORK_DEVICELIST_CLIENT_LIST_H

#include <json/json.h>
#include <pthread.h>

#include <string>
#include <unordered_map>

namespace vornnetwork {
namespace network {
namespace module {

class ClientList {
 public:
  ClientList();
  ~ClientList();
  ClientList(ClientList const&) = delete;
  ClientList& operator=(ClientList const&) = delete;

  // A copy of the document (taken under the mutex: search threads may be writing).
  Json::Value GetClientList();
  // A copy of the document, and "ClientList" emptied, in one step.
  Json::Value TakeClientList();
  // Sets "ClientList" to an empty array.
  void EraseList();
  // Forwards to LoadClientList.
  bool Load(std::string const& path);
  // The whole document, tab-indented, replacing the file atomically.
  bool WriteToFile(std::string const& path);
  // Copies the object's members onto the device with that MAC (or IP); an unknown device is
  // appended only when create is true. False for an empty key or an object without members.
  bool UpdateKeysByMac(std::string const& mac, Json::Value const& object, bool const& create);
  bool UpdateKeysByIP(std::string const& ip, Json::Value const& object, bool const& create);
  // Walk from index 0; an object without the key ends the walk with false.
  bool VerifyMacIsExist(std::string const& mac, unsigned int& index);
  bool VerifyIPIsExist(std::string const& ip, unsigned int& index);
  bool GetObject(std::string const& mac, Json::Value& object);
  // The key's non-empty value as text, or "".
  std::string FindKey(std::string const& mac, std::string const& key);
  std::string FindMacByIP(std::string const& ip);
  // Swaps the device with the last one and drops it; false for an empty list or an unknown MAC.
  bool EraseObject(std::string const& mac);

  // "friendlyName", "modelDescription", "modelName": the first non-empty; else "General DMA".
  static void DetermineDisplayName(Json::Value const& object, std::string& name);
  // Now, as "%T %G/%m/%d" in local time.
  static std::string GetLocalTime();

 private:
  bool LoadClientList(std::string const& path);
  bool UpdateKeys(char const* key, std::string const& value, Json::Value const& object,
                  bool create, char const* emptyMessage);
  bool VerifyIsExist(char const* key, std::string const& value, unsigned int& index);
  void RebuildIndex();
  void IndexAppended(Json::Value const& device, unsigned int index);

  // Where each key text first occurs, and the first device lacking the key: a lookup finds what
  // a walk from index 0 would find, without walking. Rebuilt after changes that move devices.
  struct KeyIndex {
    std::unordered_map<std::string, unsigned int> first;
    unsigned int limit = ~0u;  // first device without the key; none: ~0u
  };

  pthread_mutex_t _mutex;
  Json::Value _document;
  KeyIndex _macIndex;
  KeyIndex _ipIndex;
  bool _indexValid = false;
};

}  // namespace module
}  // namespace network
}  // namespace vornnetwork

#endif
