#ifndef VORNPLATFORM_KMOD_H
#define VORNPLATFORM_KMOD_H

#include "vornplatform/szhash.h"

// 1 when /sys/module/<name> exists (loaded or built in), else 0.
int VORNCheckModule(const char* name);
// Inserts each "NAME.ko" of list (found through modules.dep of the running kernel). 0, -1.
int VLIBIptablesModInsert(const char* owner, PVLIBSZLIST list);

#endif
