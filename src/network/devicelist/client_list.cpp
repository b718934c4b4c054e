// The device store: one JSON document with an array of device objects, a mutex round the writers.
#include "vornwireless/network/devicelist/client_list.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <ctime>
#include <exception>
#include <fstream>
#include <sstream>

#include "vornplatform/log.h"

// jsoncpp marks Json::Reader and Json::StyledStreamWriter deprecated; they give the file text
// our readers expect.
#pragma GCC diagnostic ignored "-Wdeprecated-declarations"

namespace vornnetwork {
namespace network {
namespace module {

namespace {

const char kListKey[] = "ClientList";

// Unlocks on every path out of a scope.
class ScopedLock {
 public:
  explicit ScopedLock(pthread_mutex_t* mutex) : _mutex(mutex) { pthread_mutex_lock(_mutex); }
  ~ScopedLock() { pthread_mutex_unlock(_mutex); }
  ScopedLock(ScopedLock const&) = delete;
  ScopedLock& operator=(ScopedLock const&) = delete;

 private:
  pthread_mutex_t* _mutex;
};

// The device array, or null when the document holds none (a file without "ClientList").
Json::Value* DeviceArray(Json::Value& document) {
  if (!document.isObject() || !document.isMember(kListKey)) return nullptr;
  Json::Value* list = &document[kListKey];
  return list->isArray() ? list : nullptr;
}

// A member's value as text: strings as they are, numbers and booleans printed, others "".
std::string MemberText(Json::Value const& object, char const* key) {
  if (!object.isObject()) return std::string();
  Json::Value const* value = object.find(key, key + std::strlen(key));
  if (value == nullptr) return std::string();
  if (value->isString() || value->isNumeric() || value->isBool()) return value->asString();
  return std::string();
}

bool HasMember(Json::Value const& object, char const* key) {
  return object.isObject() && object.isMember(key);
}

void SetIfDifferent(Json::Value& device, char const* key, std::string const& text) {
  Json::Value& member = device[key];
  char const* begin = nullptr;
  char const* end = nullptr;
  if (member.isString() && member.getString(&begin, &end) &&
      static_cast<size_t>(end - begin) == text.size() &&
      std::memcmp(begin, text.data(), text.size()) == 0) {
    return;
  }
  member = text;
}

std::string DisplayName(Json::Value const& device) {
  std::string name;
  ClientList::DetermineDisplayName(device, name);
  return name;
}

}  // namespace

ClientList::ClientList() : _document(Json::objectValue) {
  pthread_mutex_init(&_mutex, nullptr);
  EraseList();
}

ClientList::~ClientList() { pthread_mutex_destroy(&_mutex); }

Json::Value ClientList::GetClientList() {
  ScopedLock lock(&_mutex);
  return _document;
}

Json::Value ClientList::TakeClientList() {
  ScopedLock lock(&_mutex);
  Json::Value copy = _document;
  if (!_document.isObject()) _document = Json::Value(Json::objectValue);
  _document[kListKey] = Json::Value(Json::arrayValue);
  _indexValid = false;
  return copy;
}

void ClientList::EraseList() {
  ScopedLock lock(&_mutex);
  if (!_document.isObject()) _document = Json::Value(Json::objectValue);
  _document[kListKey] = Json::Value(Json::arrayValue);
  _indexValid = false;
}

bool ClientList::Load(std::string const& path) { return LoadClientList(path); }

bool ClientList::LoadClientList(std::string const& path) {
  std::ifstream in(path.c_str());
  if (!in.is_open()) {
    VORN_LOG(LOG_ERR, "Error: LoadClientList - %s could not open", path.c_str());
    return false;
  }
  Json::Value parsed;
  Json::Reader reader;
  bool ok = false;
  try {
    ok = reader.parse(in, parsed, true);
  } catch (std::exception const&) {
    ok = false;
  }
  if (!ok) {
    VORN_LOG(LOG_ERR, "Error: LoadClientList - Json::Reader::parse failed");
    return false;
  }
  // Only an object can hold the list; anything else would leave no store to work on.
  if (!parsed.isObject()) {
    VORN_LOG(LOG_ERR, "Error: LoadClientList - %s holds no client list object", path.c_str());
    return false;
  }
  ScopedLock lock(&_mutex);
  _document.swap(parsed);
  _indexValid = false;
  return true;
}

bool ClientList::WriteToFile(std::string const& path) {
  ScopedLock lock(&_mutex);
  std::string text;
  try {
    std::ostringstream out;
    Json::StyledStreamWriter writer("\t");
    writer.write(out, _document);
    text = out.str();
  } catch (std::exception const&) {
    VORN_LOG(LOG_ERR, "Error - %s could not open", path.c_str());
    return false;
  }
  // A reader (or a crash) sees the old file or the new one, never half of it.
  std::string tmp = path + ".XXXXXX";
  int fd = mkstemp(&tmp[0]);
  if (fd < 0) {
    VORN_LOG(LOG_ERR, "Error - %s could not open", path.c_str());
    return false;
  }
  bool ok = fchmod(fd, 0644) == 0;
  size_t done = 0;
  while (ok && done < text.size()) {
    ssize_t n = write(fd, text.data() + done, text.size() - done);
    if (n < 0 && errno == EINTR) continue;
    if (n <= 0) {
      ok = false;
      break;
    }
    done += static_cast<size_t>(n);
  }
  if (ok && fsync(fd) != 0) ok = false;
  if (close(fd) != 0) ok = false;
  if (ok && rename(tmp.c_str(), path.c_str()) != 0) ok = false;
  if (!ok) {
    unlink(tmp.c_str());
    VORN_LOG(LOG_ERR, "Error - %s could not open", path.c_str());
    return false;
  }
  return true;
}

bool ClientList::UpdateKeysByMac(std::string const& mac, Json::Value const& object,
                                 bool const& create) {
  return UpdateKeys("macAddr", mac, object, create, "MAC address is empty");
}

bool ClientList::UpdateKeysByIP(std::string const& ip, Json::Value const& object,
                                bool const& create) {
  return UpdateKeys("ipAddr", ip, object, create, "IP address is empty");
}

bool ClientList::UpdateKeys(char const* key, std::string const& value, Json::Value const& object,
                            bool create, char const* emptyMessage) {
  std::string const now = GetLocalTime();
  ScopedLock lock(&_mutex);
  if (value.empty()) {
    VORN_LOG(LOG_ERR, "Error: UpdateKeys - %s", emptyMessage);
    return false;
  }
  size_t const members = object.isObject() ? object.size() : 0;
  if (members == 0) {
    VORN_LOG(LOG_ERR, "Error: UpdateKeys - json object member number (%zd)",
             static_cast<ssize_t>(members));
    return false;
  }
  try {
    unsigned int index = 0;
    if (VerifyIsExist(key, value, index)) {
      // Changed in place; members whose value is already the same are left untouched.
      Json::Value& device = (*DeviceArray(_document))[index];
      for (auto it = object.begin(); it != object.end(); ++it) {
        char const* end = nullptr;
        char const* name = it.memberName(&end);
        Json::Value& member = *device.demand(name, end);
        if (member == *it) continue;
        // A changed key moves the device in the lookup index.
        size_t const length = static_cast<size_t>(end - name);
        if ((length == 7 && std::memcmp(name, "macAddr", 7) == 0) ||
            (length == 6 && std::memcmp(name, "ipAddr", 6) == 0)) {
          _indexValid = false;
        }
        member = *it;
      }
      SetIfDifferent(device, "displayName", DisplayName(device));
      SetIfDifferent(device, "asso_time", now);
      return true;
    }
    if (!create) return true;
    Json::Value device = object;
    device[key] = value;
    std::string name;
    DetermineDisplayName(device, name);
    device["displayName"] = name;
    device["asso_time"] = now;
    Json::Value* list = DeviceArray(_document);
    if (list == nullptr) {
      // A loaded file without the array: the first new device starts it.
      if (!_document.isObject()) _document = Json::Value(Json::objectValue);
      _document[kListKey] = Json::Value(Json::arrayValue);
      list = DeviceArray(_document);
      _indexValid = false;
    }
    unsigned int const at = list->size();
    list->append(std::move(device));
    IndexAppended((*list)[at], at);
  } catch (std::exception const& e) {
    VORN_LOG(LOG_ERR, "Error: UpdateKeys - %s", e.what());
    return false;
  }
  return true;
}

void ClientList::RebuildIndex() {
  _macIndex = KeyIndex();
  _ipIndex = KeyIndex();
  _indexValid = true;
  Json::Value const* list = DeviceArray(_document);
  if (list == nullptr) return;
  for (Json::ArrayIndex i = 0; i < list->size(); ++i) IndexAppended((*list)[i], i);
}

void ClientList::IndexAppended(Json::Value const& device, unsigned int index) {
  if (!_indexValid) return;
  struct {
    char const* key;
    KeyIndex* index;
  } const keys[] = {{"macAddr", &_macIndex}, {"ipAddr", &_ipIndex}};
  for (auto const& k : keys) {
    if (!HasMember(device, k.key)) {
      if (k.index->limit == ~0u) k.index->limit = index;
      continue;
    }
    Json::Value const& stored = device[k.key];
    if (stored.isString()) k.index->first.emplace(stored.asString(), index);
  }
}

bool ClientList::VerifyIsExist(char const* key, std::string const& value, unsigned int& index) {
  if (DeviceArray(_document) == nullptr) return false;
  if (!_indexValid) RebuildIndex();
  KeyIndex const& keyIndex = std::strcmp(key, "macAddr") == 0 ? _macIndex : _ipIndex;
  auto found = keyIndex.first.find(value);
  // The walk stops at the first device without the key: what lies behind it stays hidden.
  if (found == keyIndex.first.end() || found->second >= keyIndex.limit) return false;
  index = found->second;
  return true;
}

bool ClientList::VerifyMacIsExist(std::string const& mac, unsigned int& index) {
  ScopedLock lock(&_mutex);
  return VerifyIsExist("macAddr", mac, index);
}

bool ClientList::VerifyIPIsExist(std::string const& ip, unsigned int& index) {
  ScopedLock lock(&_mutex);
  return VerifyIsExist("ipAddr", ip, index);
}

bool ClientList::GetObject(std::string const& mac, Json::Value& object) {
  ScopedLock lock(&_mutex);
  unsigned int index = 0;
  if (!VerifyIsExist("macAddr", mac, index)) return false;
  object = (*DeviceArray(_document))[index];
  return true;
}

std::string ClientList::FindKey(std::string const& mac, std::string const& key) {
  ScopedLock lock(&_mutex);
  unsigned int index = 0;
  if (!VerifyIsExist("macAddr", mac, index)) return std::string();
  return MemberText((*DeviceArray(_document))[index], key.c_str());
}

std::string ClientList::FindMacByIP(std::string const& ip) {
  ScopedLock lock(&_mutex);
  unsigned int index = 0;
  if (!VerifyIsExist("ipAddr", ip, index)) return std::string();
  return MemberText((*DeviceArray(_document))[index], "macAddr");
}

bool ClientList::EraseObject(std::string const& mac) {
  // The lock is released on every path: a failed erase must not stall the next update.
  ScopedLock lock(&_mutex);
  Json::Value* list = DeviceArray(_document);
  if (list == nullptr || list->empty()) return false;
  unsigned int index = 0;
  if (!VerifyIsExist("macAddr", mac, index)) return false;
  Json::ArrayIndex const last = list->size() - 1;
  if (index != last) (*list)[index].swap((*list)[last]);
  list->resize(last);
  _indexValid = false;
  return true;
}

void ClientList::DetermineDisplayName(Json::Value const& object, std::string& name) {
  static char const* const kKeys[] = {"friendlyName", "modelDescription", "modelName"};
  for (char const* key : kKeys) {
    std::string text = MemberText(object, key);
    if (!text.empty()) {
      name = text;
      return;
    }
  }
  name = "General DMA";
}

std::string ClientList::GetLocalTime() {
  // The text changes once a second; a merge of many devices formats it once.
  thread_local time_t cachedAt = static_cast<time_t>(-1);
  thread_local std::string cached;
  time_t now = time(nullptr);
  if (now == cachedAt) return cached;
  struct tm local;
  char text[64] = "";
  if (localtime_r(&now, &local) == nullptr) return std::string();
  strftime(text, sizeof(text), "%T %G/%m/%d", &local);
  cachedAt = now;
  cached = text;
  return cached;
}

}  // namespace module
}  // namespace network
}  // namespace vornnetwork
