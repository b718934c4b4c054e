// Small string helpers: trimming, splitting into a list, UTF-8 validation.
#include "vornplatform/str.h"

#include <cctype>
#include <cstdlib>
#include <cstring>

#include "vornplatform/err.h"

char* VLIBCStrTrimSpace(char* text) {
  if (text == nullptr) return nullptr;
  char* start = text;
  while (*start != '\0' && std::isspace(static_cast<unsigned char>(*start))) ++start;
  std::size_t len = std::strlen(start);
  while (len > 0 && std::isspace(static_cast<unsigned char>(start[len - 1]))) --len;
  if (start != text) std::memmove(text, start, len);
  text[len] = '\0';
  return text;
}

int VLIBCStrSep(const char* text, const char* separators, PVLIBSZLIST* list) {
  if (text == nullptr || separators == nullptr || list == nullptr) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  if (*list == nullptr) {
    *list = VLIBCSzListAlloc(0);
    if (*list == nullptr) return -1;
  } else {
    VLIBCSzListClean(*list);
  }
  char* copy = strdup(text);
  if (copy == nullptr) {
    VLIBC_ERR_SET(VLIBC_ERR_NO_MEMORY);
    return -1;
  }
  int count = 0;
  char* rest = copy;
  char* piece = nullptr;
  while ((piece = strsep(&rest, separators)) != nullptr) {
    if (VLIBCSzListPush(list, piece) < 0) {
      std::free(copy);
      VLIBCSzListClean(*list);
      return -1;
    }
    ++count;
  }
  std::free(copy);
  return count;
}

int VLIBCUnicodeIsUTF8(const char* text) {
  if (text == nullptr) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return 0;
  }
  const auto* p = reinterpret_cast<const unsigned char*>(text);
  if (p[0] == 0xEF && p[1] == 0xBB && p[2] == 0xBF) p += 3;
  while (*p != 0) {
    const unsigned char c = *p;
    int more = 0;
    unsigned long cp = 0;
    if (c < 0x80) {
      ++p;
      continue;
    } else if (c >= 0xC2 && c <= 0xDF) {
      more = 1;
      cp = c & 0x1F;
    } else if (c >= 0xE0 && c <= 0xEF) {
      more = 2;
      cp = c & 0x0F;
    } else if (c >= 0xF0 && c <= 0xF4) {
      more = 3;
      cp = c & 0x07;
    } else {
      return 0;  // continuation byte out of place, overlong lead (C0, C1) or beyond U+10FFFF
    }
    for (int i = 1; i <= more; ++i) {
      if ((p[i] & 0xC0) != 0x80) return 0;  // also stops at the terminating NUL
      cp = (cp << 6) | (p[i] & 0x3F);
    }
    if ((more == 2 && cp < 0x800) || (more == 3 && cp < 0x10000)) return 0;  // overlong
    if (cp >= 0xD800 && cp <= 0xDFFF) return 0;                              // surrogate
    if (cp > 0x10FFFF) return 0;
    p += more + 1;
  }
  return 1;
}
