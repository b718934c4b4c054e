#ifndef VORNPLATFORM_KMOD_H
#define VORNPLATFORM_KMOD_H

#include "vornplatform/szhash.h"

// 1 when /sys/module/<name> exists (loaded or built in; '-' and '_' are the same), else 0.
int VORNCheckModule(const char* name);
// Inserts each "NAME.ko" (or bare "NAME") of list that is not there yet: it must be listed in
// /lib/modules/$(uname -r)/modules.dep (as .ko, .ko.xz, .ko.zst or .ko.gz); then
// "/sbin/modprobe NAME" runs, or without modprobe the file and its dependencies are loaded with
// finit_module. owner only names the caller in log lines. 0 when all are there, -1 when one
// failed (the others are still tried).
int VLIBIptablesModInsert(const char* owner, PVLIBSZLIST list);

#endif
