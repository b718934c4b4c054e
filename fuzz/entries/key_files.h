// Key files and section files: the input becomes the file, the platform readers and the Config
// classes read it, and a write through each writer is read back.
#ifndef VORN_FUZZ_ENTRIES_KEY_FILES_H
#define VORN_FUZZ_ENTRIES_KEY_FILES_H

#include <unistd.h>

#include <cstring>
#include <string>

#include "entries/fuzz_input.h"
#include "entries/route_files.h"
#include "vornplatform/file.h"
#include "vornplatform/szhash.h"
#include "vornwireless/utils/config.h"

namespace vornfuzz {

struct HashGuard {
  PVLIBSZHASH h = nullptr;
  ~HashGuard() { VLIBCSzHashFree(h); }
};
struct ListGuard {
  PVLIBSZLIST l = nullptr;
  ~ListGuard() { VLIBCSzListFree(l); }
};

// A value read into a buffer: its length is the answer and it is NUL-terminated inside.
inline void CheckValue(int r, const char* buf, int size, const char* what) {
  // The length counts NUL bytes inside the value; the text stops at the first one.
  if (r > 0) Require(r < size && std::strlen(buf) <= static_cast<size_t>(r), what);
}

inline std::string FuzzFilePath(const char* kind) {
  return std::string("/tmp/vorn-fuzz-") + kind + "." + std::to_string(getpid());
}

// The key readers over the file, then one key set and removed through the writers.
inline void ReadKeyFile(const uint8_t* data, size_t size) {
  static const std::string path = FuzzFilePath("keys");
  Require(WriteWhole(path, data, size), "the key file is written");
  HashGuard keys;
  const int n = VLIBCFileGetKeys(path.c_str(), 0, &keys.h, nullptr);
  Require(n >= 0 && n == VLIBCSzHashCount(keys.h), "every key counted");
  char buf[VLIBC_VALUE_MAX + 1];
  for (int i = 0; i < keys.h->nSlot; ++i) {
    const char* key = keys.h->pSlots[i].szKey;
    if (key == nullptr) continue;
    const int r = VLIBCFileGetKeyValue(path.c_str(), key, buf, sizeof buf, 0);
    CheckValue(r, buf, sizeof buf, "a key's value");
    if (r > 0 && std::strlen(buf) == static_cast<size_t>(r)) {
      Require(VLIBCFileCheckKeyValue(path.c_str(), key, buf, 0) == 1,
              "the value read is the value checked");
    }
  }
  vornwireless::utils::ConfigNoSection config(path);
  if (config.Read() == 0) (void)config.GetKeyValues();
  // Written values are read back, whatever else the file holds.
  Require(VLIBCFileSetKeyValue(path.c_str(), "vorn_fuzz_key", "written value", "%s=%s\n") == 0,
          "a key is set");
  const int r = VLIBCFileGetKeyValue(path.c_str(), "vorn_fuzz_key", buf, sizeof buf, 0);
  Require(r > 0 && std::string(buf) == "written value", "the key set is read back");
  Require(VLIBCFileRemoveKey(path.c_str(), "vorn_fuzz_key") == 0, "a key is removed");
  Require(VLIBCFileGetKeyValue(path.c_str(), "vorn_fuzz_key", buf, sizeof buf, 0) == 0,
          "the key removed is gone");
}

// The section readers over the file, then one value set through the writer and read back.
inline void ReadSectionFile(const uint8_t* data, size_t size) {
  static const std::string path = FuzzFilePath("sections");
  Require(WriteWhole(path, data, size), "the section file is written");
  ListGuard sections;
  const int n = VLIBCFileEnumSection(path.c_str(), &sections.l);
  Require(n >= 0, "sections are listed");
  char buf[VLIBC_VALUE_MAX + 1];
  for (int i = 0; i < n; ++i) {
    const char* name = VLIBCSzListGet(sections.l, i);
    Require(name != nullptr, "a listed section has a name");
    if (name[0] == '\0') continue;  // "[]" is listed; the readers refuse an empty name
    HashGuard keys;
    const int k = VLIBCFileGetSection(path.c_str(), name, &keys.h);
    Require(k >= 0, "a listed section is read");
    for (int s = 0; keys.h != nullptr && s < keys.h->nSlot; ++s) {
      const char* key = keys.h->pSlots[s].szKey;
      if (key == nullptr) continue;
      const int r = VLIBCFileGetSectionValue(path.c_str(), name, key, buf, sizeof buf);
      CheckValue(r, buf, sizeof buf, "a section value");
    }
  }
  vornwireless::utils::ConfigSection config(path);
  if (config.Read() == 0) (void)config.GetKeyValues();
  Require(VLIBCFileSetSectionValue(path.c_str(), "vorn fuzz", "vorn_fuzz_key", "written") == 0,
          "a section value is set");
  const int r = VLIBCFileGetSectionValue(path.c_str(), "vorn fuzz", "vorn_fuzz_key", buf,
                                         sizeof buf);
  Require(r > 0 && std::string(buf) == "written", "the section value set is read back");
  Require(VLIBCFileRemoveSection(path.c_str(), "vorn fuzz") == 0, "a section is removed");
}

}  // namespace vornfuzz

#endif
