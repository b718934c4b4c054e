// String hash and string list of the platform. Capacities are hints: both grow on demand.
#ifndef VORNPLATFORM_SZHASH_H
#define VORNPLATFORM_SZHASH_H

// A slot with key == NULL is empty (removed keys leave empty slots); walkers skip such slots.
// The hash keeps insertion order; a replaced value keeps its slot.
typedef struct _VLIBSZHASH_SLOT {
  char* szKey;
  char* szValue;
} VLIBSZHASH_SLOT;

typedef struct _VLIBSZHASH {
  int nSlot;               // number of slots in use or emptied (walk 0 .. nSlot-1)
  int nCapacity;           // allocated slots
  VLIBSZHASH_SLOT* pSlots;
} VLIBSZHASH, *PVLIBSZHASH;

PVLIBSZHASH VLIBCSzHashAlloc(int capacity);               // NULL on no memory
void VLIBCSzHashFree(PVLIBSZHASH hash);                   // NULL is fine
// 0; -1 refused (NULL hash, NULL or empty key, no memory). A NULL value is stored as "".
int VLIBCSzHashSetValue(PVLIBSZHASH hash, const char* key, const char* value);
const char* VLIBCSzHashGetValue(PVLIBSZHASH hash, const char* key);          // NULL absent
int VLIBCSzHashRemoveKey(PVLIBSZHASH hash, const char* key); // 0 removed or absent, -1 bad param
int VLIBCHashRemoveAll(PVLIBSZHASH hash);                 // 0, -1 bad param
int VLIBCSzHashCount(PVLIBSZHASH hash);                   // keys present, -1 for NULL

typedef struct _VLIBSZLIST {
  int nItem;      // items in use
  int nCapacity;  // allocated items
  char** pszItem;
} VLIBSZLIST, *PVLIBSZLIST;

PVLIBSZLIST VLIBCSzListAlloc(int capacity);               // NULL on no memory
void VLIBCSzListFree(PVLIBSZLIST list);
// Push and Set allocate the list when *list is NULL. Set replaces item index; index == count
// appends (so Set(0) fills a fresh list).
int VLIBCSzListPush(PVLIBSZLIST* list, const char* item); // new count, -1 on failure
int VLIBCSzListSet(PVLIBSZLIST* list, int index, const char* item); // 0, -1 out of range/no memory
const char* VLIBCSzListGet(PVLIBSZLIST list, int index);  // NULL out of range
int VLIBCSzListClean(PVLIBSZLIST list);                   // empties it; 0, -1 bad param
int VLIBCSzListCount(PVLIBSZLIST list);                   // -1 for NULL

#endif
