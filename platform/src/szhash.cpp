// String hash (ordered slots) and string list. Plain C memory: the records are walked by callers.
#include "vornplatform/szhash.h"

#include <climits>
#include <cstdlib>
#include <cstring>

#include "vornplatform/err.h"

namespace {

constexpr int kDefaultCapacity = 16;

char* DupString(const char* s) {
  const std::size_t n = std::strlen(s);
  char* p = static_cast<char*>(std::malloc(n + 1));
  if (p != nullptr) std::memcpy(p, s, n + 1);
  return p;
}

int StartCapacity(int capacity) {
  if (capacity <= 0) return kDefaultCapacity;
  // A capacity is a hint: never reserve absurd amounts up front.
  return capacity > 4096 ? 4096 : capacity;
}

int FindSlot(const VLIBSZHASH* hash, const char* key) {
  for (int i = 0; i < hash->nSlot; ++i) {
    const char* k = hash->pSlots[i].szKey;
    if (k != nullptr && std::strcmp(k, key) == 0) return i;
  }
  return -1;
}

// Makes room for one more slot at the end: squeezes out emptied slots (order kept) or grows.
bool ReserveSlot(VLIBSZHASH* hash) {
  if (hash->nSlot < hash->nCapacity) return true;
  int used = 0;
  for (int i = 0; i < hash->nSlot; ++i) {
    if (hash->pSlots[i].szKey != nullptr) hash->pSlots[used++] = hash->pSlots[i];
  }
  for (int i = used; i < hash->nSlot; ++i) hash->pSlots[i] = VLIBSZHASH_SLOT{nullptr, nullptr};
  hash->nSlot = used;
  if (used < hash->nCapacity) return true;
  if (hash->nCapacity > INT_MAX / 2) return false;
  const int newCapacity = hash->nCapacity > 0 ? hash->nCapacity * 2 : kDefaultCapacity;
  void* p =
      std::realloc(hash->pSlots, sizeof(VLIBSZHASH_SLOT) * static_cast<std::size_t>(newCapacity));
  if (p == nullptr) return false;
  hash->pSlots = static_cast<VLIBSZHASH_SLOT*>(p);
  for (int i = hash->nCapacity; i < newCapacity; ++i)
    hash->pSlots[i] = VLIBSZHASH_SLOT{nullptr, nullptr};
  hash->nCapacity = newCapacity;
  return true;
}

bool ReserveItem(VLIBSZLIST* list) {
  if (list->nItem < list->nCapacity) return true;
  if (list->nCapacity > INT_MAX / 2) return false;
  const int newCapacity = list->nCapacity > 0 ? list->nCapacity * 2 : kDefaultCapacity;
  void* p = std::realloc(list->pszItem, sizeof(char*) * static_cast<std::size_t>(newCapacity));
  if (p == nullptr) return false;
  list->pszItem = static_cast<char**>(p);
  for (int i = list->nCapacity; i < newCapacity; ++i) list->pszItem[i] = nullptr;
  list->nCapacity = newCapacity;
  return true;
}

}  // namespace

PVLIBSZHASH VLIBCSzHashAlloc(int capacity) {
  auto* hash = static_cast<PVLIBSZHASH>(std::calloc(1, sizeof(VLIBSZHASH)));
  if (hash == nullptr) {
    VLIBC_ERR_SET(VLIBC_ERR_NO_MEMORY);
    return nullptr;
  }
  const int cap = StartCapacity(capacity);
  hash->pSlots = static_cast<VLIBSZHASH_SLOT*>(
      std::calloc(static_cast<std::size_t>(cap), sizeof(VLIBSZHASH_SLOT)));
  if (hash->pSlots == nullptr) {
    std::free(hash);
    VLIBC_ERR_SET(VLIBC_ERR_NO_MEMORY);
    return nullptr;
  }
  hash->nCapacity = cap;
  return hash;
}

void VLIBCSzHashFree(PVLIBSZHASH hash) {
  if (hash == nullptr) return;
  VLIBCHashRemoveAll(hash);
  std::free(hash->pSlots);
  std::free(hash);
}

int VLIBCSzHashSetValue(PVLIBSZHASH hash, const char* key, const char* value) {
  // An empty key could never be written to or read from a key file.
  if (hash == nullptr || key == nullptr || *key == '\0') {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  char* newValue = DupString(value != nullptr ? value : "");
  if (newValue == nullptr) {
    VLIBC_ERR_SET(VLIBC_ERR_NO_MEMORY);
    return -1;
  }
  const int found = FindSlot(hash, key);
  if (found >= 0) {
    std::free(hash->pSlots[found].szValue);
    hash->pSlots[found].szValue = newValue;
    return 0;
  }
  char* newKey = DupString(key);
  if (newKey == nullptr || !ReserveSlot(hash)) {
    std::free(newKey);
    std::free(newValue);
    VLIBC_ERR_SET(VLIBC_ERR_NO_MEMORY);
    return -1;
  }
  hash->pSlots[hash->nSlot].szKey = newKey;
  hash->pSlots[hash->nSlot].szValue = newValue;
  ++hash->nSlot;
  return 0;
}

const char* VLIBCSzHashGetValue(PVLIBSZHASH hash, const char* key) {
  if (hash == nullptr || key == nullptr) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return nullptr;
  }
  const int found = FindSlot(hash, key);
  return found >= 0 ? hash->pSlots[found].szValue : nullptr;
}

int VLIBCSzHashRemoveKey(PVLIBSZHASH hash, const char* key) {
  if (hash == nullptr || key == nullptr) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  const int found = FindSlot(hash, key);
  if (found >= 0) {
    std::free(hash->pSlots[found].szKey);
    std::free(hash->pSlots[found].szValue);
    hash->pSlots[found] = VLIBSZHASH_SLOT{nullptr, nullptr};
  }
  return 0;
}

int VLIBCHashRemoveAll(PVLIBSZHASH hash) {
  if (hash == nullptr) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  for (int i = 0; i < hash->nSlot; ++i) {
    std::free(hash->pSlots[i].szKey);
    std::free(hash->pSlots[i].szValue);
    hash->pSlots[i] = VLIBSZHASH_SLOT{nullptr, nullptr};
  }
  hash->nSlot = 0;
  return 0;
}

int VLIBCSzHashCount(PVLIBSZHASH hash) {
  if (hash == nullptr) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  int count = 0;
  for (int i = 0; i < hash->nSlot; ++i) {
    if (hash->pSlots[i].szKey != nullptr) ++count;
  }
  return count;
}

PVLIBSZLIST VLIBCSzListAlloc(int capacity) {
  auto* list = static_cast<PVLIBSZLIST>(std::calloc(1, sizeof(VLIBSZLIST)));
  if (list == nullptr) {
    VLIBC_ERR_SET(VLIBC_ERR_NO_MEMORY);
    return nullptr;
  }
  const int cap = StartCapacity(capacity);
  list->pszItem = static_cast<char**>(std::calloc(static_cast<std::size_t>(cap), sizeof(char*)));
  if (list->pszItem == nullptr) {
    std::free(list);
    VLIBC_ERR_SET(VLIBC_ERR_NO_MEMORY);
    return nullptr;
  }
  list->nCapacity = cap;
  return list;
}

void VLIBCSzListFree(PVLIBSZLIST list) {
  if (list == nullptr) return;
  VLIBCSzListClean(list);
  std::free(list->pszItem);
  std::free(list);
}

int VLIBCSzListPush(PVLIBSZLIST* list, const char* item) {
  if (list == nullptr || item == nullptr) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  if (*list == nullptr) {
    *list = VLIBCSzListAlloc(0);
    if (*list == nullptr) return -1;
  }
  PVLIBSZLIST l = *list;
  char* copy = DupString(item);
  if (copy == nullptr || !ReserveItem(l)) {
    std::free(copy);
    VLIBC_ERR_SET(VLIBC_ERR_NO_MEMORY);
    return -1;
  }
  l->pszItem[l->nItem++] = copy;
  return l->nItem;
}

int VLIBCSzListSet(PVLIBSZLIST* list, int index, const char* item) {
  if (list == nullptr || item == nullptr) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  const int count = *list != nullptr ? (*list)->nItem : 0;
  if (index < 0 || index > count) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  if (index == count) return VLIBCSzListPush(list, item) < 0 ? -1 : 0;
  char* copy = DupString(item);
  if (copy == nullptr) {
    VLIBC_ERR_SET(VLIBC_ERR_NO_MEMORY);
    return -1;
  }
  std::free((*list)->pszItem[index]);
  (*list)->pszItem[index] = copy;
  return 0;
}

const char* VLIBCSzListGet(PVLIBSZLIST list, int index) {
  if (list == nullptr || index < 0 || index >= list->nItem) return nullptr;
  return list->pszItem[index];
}

int VLIBCSzListClean(PVLIBSZLIST list) {
  if (list == nullptr) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  for (int i = 0; i < list->nItem; ++i) {
    std::free(list->pszItem[i]);
    list->pszItem[i] = nullptr;
  }
  list->nItem = 0;
  return 0;
}

int VLIBCSzListCount(PVLIBSZLIST list) {
  if (list == nullptr) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  return list->nItem;
}
