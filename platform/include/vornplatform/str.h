#ifndef VORNPLATFORM_STR_H
#define VORNPLATFORM_STR_H

#include "vornplatform/szhash.h"

// Trims isspace() characters at both ends in place; returns text (NULL stays NULL).
char* VLIBCStrTrimSpace(char* text);

// Splits text with strsep() at any of the separator characters and pushes every piece (empty
// pieces included, untrimmed) onto *list after cleaning it (allocated when *list is NULL).
// The number of pieces, -1 on failure.
int VLIBCStrSep(const char* text, const char* separators, PVLIBSZLIST* list);

// 1 when text is valid UTF-8 (a leading BOM is allowed), else 0.
int VLIBCUnicodeIsUTF8(const char* text);

#endif
