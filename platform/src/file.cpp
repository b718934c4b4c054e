// Files, key files and section files. Every rewrite goes through AtomicWriteFile.
#include "vornplatform/file.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <map>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "internal.h"
#include "vornplatform/err.h"

using vornplatform::internal::AtomicWriteFile;
using vornplatform::internal::HasText;
using vornplatform::internal::NoThrow;
using vornplatform::internal::ReadWholeFile;

namespace vornplatform {
namespace internal {

int ReadWholeFile(const char* path, std::string& out, std::size_t maxBytes) {
  out.clear();
  int fd = open(path, O_RDONLY | O_CLOEXEC | O_NOCTTY);
  if (fd < 0) return -1;
  struct stat st;
  if (fstat(fd, &st) != 0) {
    const int e = errno;
    close(fd);
    errno = e;
    return -1;
  }
  if (S_ISDIR(st.st_mode)) {
    close(fd);
    errno = EISDIR;
    return -1;
  }
  char buf[8192];
  for (;;) {
    ssize_t n = read(fd, buf, sizeof buf);
    if (n < 0) {
      if (errno == EINTR) continue;
      const int e = errno;
      close(fd);
      out.clear();
      errno = e;
      return -1;
    }
    if (n == 0) break;
    if (out.size() + static_cast<std::size_t>(n) > maxBytes) {
      close(fd);
      out.clear();
      errno = EFBIG;
      return -1;
    }
    out.append(buf, static_cast<std::size_t>(n));
  }
  close(fd);
  return 0;
}

namespace {

bool WriteAll(int fd, const char* p, std::size_t left) {
  while (left > 0) {
    ssize_t n = write(fd, p, left);
    if (n < 0) {
      if (errno == EINTR) continue;
      return false;
    }
    p += n;
    left -= static_cast<std::size_t>(n);
  }
  return true;
}

void SplitDirBase(const std::string& path, std::string* dir, std::string* base) {
  const std::size_t slash = path.rfind('/');
  if (slash == std::string::npos) {
    *dir = ".";
    *base = path;
  } else {
    *dir = slash == 0 ? "/" : path.substr(0, slash);
    *base = path.substr(slash + 1);
  }
}

}  // namespace

int AtomicWriteFile(const std::string& path, const std::string& content, mode_t newMode,
                    bool keepMode) {
  // Writing through a symbolic link replaces what it points at, not the link.
  std::string target = path;
  struct stat lst;
  if (lstat(path.c_str(), &lst) == 0 && S_ISLNK(lst.st_mode)) {
    char* real = realpath(path.c_str(), nullptr);
    if (real != nullptr) {
      target = real;
      std::free(real);
    }
  }
  std::string dir, base;
  SplitDirBase(target, &dir, &base);
  if (base.empty()) {
    errno = EISDIR;
    return -1;
  }
  std::string tmpl = (dir == "/" ? std::string() : dir) + "/." + base.substr(0, 200) + ".XXXXXX";
  std::vector<char> tmp(tmpl.begin(), tmpl.end());
  tmp.push_back('\0');
  int fd = mkostemp(tmp.data(), O_CLOEXEC);
  if (fd < 0) return -1;
  auto fail = [&]() {
    const int e = errno;
    if (fd >= 0) close(fd);
    unlink(tmp.data());
    errno = e;
    return -1;
  };
  mode_t mode = newMode;
  struct stat st;
  if (keepMode && stat(target.c_str(), &st) == 0 && S_ISREG(st.st_mode)) {
    mode = st.st_mode & 07777;
    if (fchown(fd, st.st_uid, st.st_gid) != 0) {
      // Keeping the owner is best effort (only root may give a file away).
    }
  }
  if (fchmod(fd, mode) != 0) return fail();
  if (!WriteAll(fd, content.data(), content.size())) return fail();
  if (fsync(fd) != 0) return fail();
  const int closing = fd;
  fd = -1;
  if (close(closing) != 0) return fail();
  if (rename(tmp.data(), target.c_str()) != 0) return fail();
  int dfd = open(dir.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
  if (dfd >= 0) {
    fsync(dfd);
    close(dfd);
  }
  return 0;
}

int MakeDirs(const std::string& path, mode_t mode) {
  if (path.empty()) {
    errno = ENOENT;
    return -1;
  }
  std::size_t pos = 0;
  while (pos != std::string::npos) {
    pos = path.find('/', pos + 1);
    const std::string part = path.substr(0, pos);
    if (part.empty()) continue;
    if (mkdir(part.c_str(), mode) != 0 && errno != EEXIST) return -1;
  }
  struct stat st;
  if (stat(path.c_str(), &st) != 0) return -1;
  if (!S_ISDIR(st.st_mode)) {
    errno = ENOTDIR;
    return -1;
  }
  return 0;
}

}  // namespace internal
}  // namespace vornplatform

namespace {

int ErrCodeOf(int e) {
  switch (e) {
    case ENOENT:
    case ENOTDIR:
      return VLIBC_ERR_NOT_FOUND;
    case ENOMEM:
      return VLIBC_ERR_NO_MEMORY;
    case EFBIG:
    case ENAMETOOLONG:
      return VLIBC_ERR_TOO_LONG;
    default:
      return VLIBC_ERR_IO;
  }
}

// Records the error of the failed system call in errno.
#define VLIBC_ERR_SET_ERRNO() VLIBC_ERR_SET(ErrCodeOf(errno))

bool IsBlank(char c) { return c == ' ' || c == '\t'; }
bool IsSpace(char c) {
  return c == ' ' || c == '\t' || c == '\r' || c == '\n' || c == '\v' || c == '\f';
}

std::string Trim(const std::string& s) {
  std::size_t b = 0, e = s.size();
  while (b < e && IsSpace(s[b])) ++b;
  while (e > b && IsSpace(s[e - 1])) --e;
  return s.substr(b, e - b);
}

std::vector<std::string> SplitLines(const std::string& content) {
  std::vector<std::string> lines;
  std::size_t start = 0;
  while (start < content.size()) {
    std::size_t nl = content.find('\n', start);
    if (nl == std::string::npos) {
      lines.push_back(content.substr(start));
      break;
    }
    lines.push_back(content.substr(start, nl - start));
    start = nl + 1;
  }
  return lines;
}

std::string JoinLines(const std::vector<std::string>& lines) {
  std::string out;
  for (const auto& l : lines) {
    out += l;
    out += '\n';
  }
  return out;
}

struct KeyLine {
  std::string key;
  std::string value;   // unquoted
  std::string indent;  // blanks before the key
  bool quoted = false;
};

// A "[name]" line (blanks around allowed). The name, trimmed, into *name.
bool ParseSectionHeader(const std::string& line, std::string* name) {
  const std::string t = Trim(line);
  if (t.size() < 2 || t.front() != '[' || t.back() != ']') return false;
  if (name != nullptr) *name = Trim(t.substr(1, t.size() - 2));
  return true;
}

// "key<sep>value" with optional leading blanks. Comments, section headers, lines without the
// separator, empty keys, keys holding a NUL byte (no caller can name them, and a hash refuses
// them) and over-long keys or values are not key lines.
bool ParseKeyLine(const std::string& line, char sep, KeyLine* out) {
  std::size_t i = 0;
  while (i < line.size() && IsBlank(line[i])) ++i;
  if (i == line.size() || line[i] == '#' || line[i] == '[') return false;
  const std::size_t pos = line.find(sep, i);
  if (pos == std::string::npos) return false;
  std::string key = Trim(line.substr(i, pos - i));
  if (key.empty() || key.size() > VLIBC_KEY_MAX || key.find('\0') != std::string::npos) {
    return false;
  }
  std::string value = Trim(line.substr(pos + 1));
  bool quoted = false;
  if (value.size() >= 2 && value.front() == '"' && value.back() == '"') {
    value = value.substr(1, value.size() - 2);
    quoted = true;
  }
  if (value.size() > VLIBC_VALUE_MAX) return false;
  if (out != nullptr) {
    out->key = std::move(key);
    out->value = std::move(value);
    out->indent = line.substr(0, i);
    out->quoted = quoted;
  }
  return true;
}

// A writer's format: exactly two "%s" (key, then value), "%%" allowed, no other conversion, and
// no line break except one at the end.
bool ValidFormat(const char* fmt) {
  if (fmt == nullptr) return false;
  int strings = 0;
  for (const char* p = fmt; *p != '\0'; ++p) {
    if (*p == '%') {
      if (p[1] == 's') {
        ++strings;
        ++p;
      } else if (p[1] == '%') {
        ++p;
      } else {
        return false;
      }
    } else if ((*p == '\n' && p[1] != '\0') || *p == '\r') {
      return false;
    }
  }
  return strings == 2;
}

// The line fmt makes of key and value, without its line break.
std::string FormatLine(const char* fmt, const std::string& key, const std::string& value) {
  std::string out;
  int strings = 0;
  for (const char* p = fmt; *p != '\0'; ++p) {
    if (*p == '%' && p[1] == 's') {
      out += strings++ == 0 ? key : value;
      ++p;
    } else if (*p == '%' && p[1] == '%') {
      out += '%';
      ++p;
    } else if (*p != '\n') {
      out += *p;
    }
  }
  return out;
}

// As FormatLine, but a value that would not read back as written (blanks at either end, or
// double quotes at both ends, which the reader strips) is written in double quotes.
std::string FormatLineExact(const char* fmt, const std::string& key, const std::string& value) {
  std::string line = FormatLine(fmt, key, value);
  KeyLine parsed;
  if (ParseKeyLine(line, '=', &parsed) && parsed.value == value) return line;
  std::string quoted = FormatLine(fmt, key, "\"" + value + "\"");
  return ParseKeyLine(quoted, '=', &parsed) && parsed.value == value ? quoted : line;
}

// Key and value a writer may store: they read back as written.
int CheckKey(const char* key) {
  if (!HasText(key)) return VLIBC_ERR_BAD_PARAMETER;
  const std::size_t n = std::strlen(key);
  if (n > VLIBC_KEY_MAX) return VLIBC_ERR_TOO_LONG;
  if (IsSpace(key[0]) || IsSpace(key[n - 1]) || key[0] == '#' || key[0] == '[') {
    return VLIBC_ERR_BAD_PARAMETER;
  }
  if (std::strpbrk(key, "=\n\r") != nullptr) return VLIBC_ERR_BAD_PARAMETER;
  return 0;
}

int CheckValue(const char* value) {
  if (value == nullptr) return VLIBC_ERR_BAD_PARAMETER;
  if (std::strlen(value) > VLIBC_VALUE_MAX) return VLIBC_ERR_TOO_LONG;
  if (std::strpbrk(value, "\n\r") != nullptr) return VLIBC_ERR_BAD_PARAMETER;
  return 0;
}

int CheckSectionName(const char* name) {
  if (!HasText(name)) return VLIBC_ERR_BAD_PARAMETER;
  const std::size_t n = std::strlen(name);
  if (n > VLIBC_KEY_MAX) return VLIBC_ERR_TOO_LONG;
  if (IsSpace(name[0]) || IsSpace(name[n - 1])) return VLIBC_ERR_BAD_PARAMETER;
  if (std::strpbrk(name, "[]\n\r") != nullptr) return VLIBC_ERR_BAD_PARAMETER;
  return 0;
}

// Checks every key and value of a hash. 0 or an error code.
int CheckHash(PVLIBSZHASH hash) {
  for (int i = 0; i < hash->nSlot; ++i) {
    const VLIBSZHASH_SLOT& s = hash->pSlots[i];
    if (s.szKey == nullptr) continue;
    int code = CheckKey(s.szKey);
    if (code == 0) code = CheckValue(s.szValue != nullptr ? s.szValue : "");
    if (code != 0) return code;
  }
  return 0;
}

// Reads path into lines. 0; -1 with the error recorded. A missing file gives no lines when
// missingOk (then *existed is false).
int LoadLines(const char* path, bool missingOk, std::vector<std::string>* lines,
              bool* existed = nullptr) {
  std::string content;
  if (existed != nullptr) *existed = true;
  if (ReadWholeFile(path, content) != 0) {
    if (missingOk && errno == ENOENT) {
      if (existed != nullptr) *existed = false;
      lines->clear();
      return 0;
    }
    VLIBC_ERR_SET_ERRNO();
    return -1;
  }
  *lines = SplitLines(content);
  return 0;
}

int StoreLines(const char* path, const std::vector<std::string>& lines) {
  if (AtomicWriteFile(path, JoinLines(lines)) != 0) {
    VLIBC_ERR_SET_ERRNO();
    return -1;
  }
  return 0;
}

// Finds key in a key file. 1 found (value into *value), 0 absent or file missing, -1 error.
int LookupKey(const char* path, const char* key, std::string* value) {
  std::vector<std::string> lines;
  bool existed = true;
  if (LoadLines(path, true, &lines, &existed) != 0) return -1;
  if (!existed) {
    VLIBC_ERR_SET(VLIBC_ERR_NOT_FOUND);
    return 0;
  }
  KeyLine kl;
  for (const auto& line : lines) {
    if (ParseKeyLine(line, '=', &kl) && kl.key == key) {
      *value = kl.value;
      return 1;
    }
  }
  VLIBC_ERR_SET(VLIBC_ERR_NOT_FOUND);
  return 0;
}

// Copies value to buf. Its length, or -1 when it does not fit.
int CopyOut(const std::string& value, char* buf, int size) {
  if (value.size() >= static_cast<std::size_t>(size)) {
    buf[0] = '\0';
    VLIBC_ERR_SET(VLIBC_ERR_TOO_LONG);
    return -1;
  }
  std::memcpy(buf, value.c_str(), value.size() + 1);
  return static_cast<int>(value.size());
}

// Sets keys (in order, later duplicates win) and removes others in one atomic rewrite of a key
// file. The first line of a key is replaced, later lines of it dropped, new keys appended.
int RewriteKeys(const char* path, const std::vector<std::pair<std::string, std::string>>& set,
                const std::set<std::string>& remove, const char* fmt) {
  std::vector<std::string> lines;
  if (LoadLines(path, true, &lines) != 0) return -1;
  std::vector<std::string> order;
  std::map<std::string, std::string> wanted;
  for (const auto& kv : set) {
    if (wanted.find(kv.first) == wanted.end()) order.push_back(kv.first);
    wanted[kv.first] = kv.second;
  }
  std::set<std::string> placed;
  std::vector<std::string> out;
  out.reserve(lines.size() + order.size());
  KeyLine kl;
  for (auto& line : lines) {
    if (ParseKeyLine(line, '=', &kl)) {
      auto it = wanted.find(kl.key);
      if (it != wanted.end()) {
        if (placed.insert(kl.key).second) out.push_back(FormatLine(fmt, it->first, it->second));
        continue;
      }
      if (remove.count(kl.key) != 0) continue;
    }
    out.push_back(std::move(line));
  }
  for (const auto& key : order) {
    if (placed.count(key) == 0) out.push_back(FormatLine(fmt, key, wanted[key]));
  }
  return StoreLines(path, out);
}

struct SectionSpan {
  std::string name;
  std::size_t header;  // index of the "[name]" line
  std::size_t end;     // index of the next header, or the number of lines
};

std::vector<SectionSpan> FindSections(const std::vector<std::string>& lines) {
  std::vector<SectionSpan> spans;
  std::string name;
  for (std::size_t i = 0; i < lines.size(); ++i) {
    if (ParseSectionHeader(lines[i], &name)) {
      if (!spans.empty()) spans.back().end = i;
      spans.push_back(SectionSpan{name, i, lines.size()});
    }
  }
  return spans;
}

const SectionSpan* FindSection(const std::vector<SectionSpan>& spans, const std::string& name) {
  for (const auto& s : spans) {
    if (s.name == name) return &s;
  }
  return nullptr;
}

std::vector<std::pair<std::string, std::string>> HashPairs(PVLIBSZHASH hash) {
  std::vector<std::pair<std::string, std::string>> pairs;
  for (int i = 0; i < hash->nSlot; ++i) {
    const VLIBSZHASH_SLOT& s = hash->pSlots[i];
    if (s.szKey != nullptr) pairs.emplace_back(s.szKey, s.szValue != nullptr ? s.szValue : "");
  }
  return pairs;
}

bool EntryMatches(int dirFd, const struct dirent* de, unsigned flags) {
  const unsigned kinds =
      flags & (VLIBC_ENUM_DIR_FILE | VLIBC_ENUM_DIR_DIR | VLIBC_ENUM_DIR_LINK | VLIBC_ENUM_DIR_ANY);
  if (kinds == 0 || (kinds & VLIBC_ENUM_DIR_ANY) != 0) return true;
  struct stat lst;
  if (fstatat(dirFd, de->d_name, &lst, AT_SYMLINK_NOFOLLOW) != 0) return false;
  mode_t mode = lst.st_mode;
  if (S_ISLNK(mode)) {
    if ((kinds & VLIBC_ENUM_DIR_LINK) != 0) return true;
    struct stat st;
    if (fstatat(dirFd, de->d_name, &st, 0) != 0) return false;  // dangling
    mode = st.st_mode;
  }
  if ((kinds & VLIBC_ENUM_DIR_FILE) != 0 && S_ISREG(mode)) return true;
  if ((kinds & VLIBC_ENUM_DIR_DIR) != 0 && S_ISDIR(mode)) return true;
  return false;
}

bool PrepareList(PVLIBSZLIST* list) {
  if (*list == nullptr) {
    *list = VLIBCSzListAlloc(0);
    return *list != nullptr;
  }
  VLIBCSzListClean(*list);
  return true;
}

bool PrepareHash(PVLIBSZHASH* hash) {
  if (*hash == nullptr) {
    *hash = VLIBCSzHashAlloc(0);
    return *hash != nullptr;
  }
  VLIBCHashRemoveAll(*hash);
  return true;
}

}  // namespace

int VLIBCFileExist(const char* path) {
  if (!HasText(path)) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return 0;
  }
  struct stat st;
  return stat(path, &st) == 0 ? 1 : 0;
}

int VLIBCFileCheckDir(const char* path) {
  if (!HasText(path)) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return 0;
  }
  struct stat st;
  return stat(path, &st) == 0 && S_ISDIR(st.st_mode) ? 1 : 0;
}

int VLIBCFileTouch(const char* path) {
  if (!HasText(path)) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  int fd = open(path, O_WRONLY | O_CREAT | O_NOCTTY | O_NONBLOCK | O_CLOEXEC, 0644);
  if (fd < 0) {
    if (errno == EISDIR && utimensat(AT_FDCWD, path, nullptr, 0) == 0) return 0;
    VLIBC_ERR_SET_ERRNO();
    return -1;
  }
  const int rc = futimens(fd, nullptr);
  const int e = errno;
  close(fd);
  if (rc != 0) {
    errno = e;
    VLIBC_ERR_SET_ERRNO();
    return -1;
  }
  return 0;
}

int VLIBCFileEnumDir(const char* dir, const char* prefix, PVLIBSZLIST* list, unsigned flags) {
  if (!HasText(dir) || list == nullptr) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  return NoThrow(-1, [&]() -> int {
    DIR* d = opendir(dir);
    if (d == nullptr) {
      VLIBC_ERR_SET_ERRNO();
      return -1;
    }
    const std::string pre = prefix != nullptr ? prefix : "";
    std::vector<std::string> names;
    try {
      errno = 0;
      while (const struct dirent* de = readdir(d)) {
        const char* n = de->d_name;
        if (std::strcmp(n, ".") == 0 || std::strcmp(n, "..") == 0) continue;
        if (std::strncmp(n, pre.c_str(), pre.size()) != 0) continue;
        if (EntryMatches(dirfd(d), de, flags)) names.emplace_back(n);
      }
    } catch (...) {
      closedir(d);
      throw;
    }
    closedir(d);
    std::sort(names.begin(), names.end());
    if (!PrepareList(list)) return -1;
    std::string base = dir;
    while (base.size() > 1 && base.back() == '/') base.pop_back();
    if (base != "/") base += '/';
    for (const auto& n : names) {
      const std::string item = (flags & VLIBC_ENUM_DIR_FULLPATH) != 0 ? base + n : n;
      if (VLIBCSzListPush(list, item.c_str()) < 0) {
        VLIBCSzListClean(*list);
        return -1;
      }
    }
    return static_cast<int>(names.size());
  });
}

int VLIBCFileGetKeyValue(const char* path, const char* key, char* buf, int size, int /*flags*/) {
  if (!HasText(path) || !HasText(key) || buf == nullptr || size <= 0) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  buf[0] = '\0';
  if (std::strlen(key) > VLIBC_KEY_MAX) {
    VLIBC_ERR_SET(VLIBC_ERR_TOO_LONG);
    return -1;
  }
  return NoThrow(-1, [&]() -> int {
    std::string value;
    const int found = LookupKey(path, key, &value);
    if (found <= 0) return found;
    return CopyOut(value, buf, size);
  });
}

int VLIBCFileSetKeyValue(const char* path, const char* key, const char* value, const char* fmt) {
  if (!HasText(path) || !ValidFormat(fmt)) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  int code = CheckKey(key);
  if (code == 0) code = CheckValue(value);
  if (code != 0) {
    VLIBC_ERR_SET(code);
    return -1;
  }
  return NoThrow(-1, [&]() -> int { return RewriteKeys(path, {{key, value}}, {}, fmt); });
}

int VLIBCFileRemoveKey(const char* path, const char* key) {
  if (!HasText(path)) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  const int code = CheckKey(key);
  if (code != 0) {
    VLIBC_ERR_SET(code);
    return -1;
  }
  return NoThrow(-1, [&]() -> int {
    std::vector<std::string> lines;
    bool existed = true;
    if (LoadLines(path, true, &lines, &existed) != 0) return -1;
    if (!existed) return 0;
    std::vector<std::string> out;
    KeyLine kl;
    for (auto& line : lines) {
      if (ParseKeyLine(line, '=', &kl) && kl.key == key) continue;
      out.push_back(std::move(line));
    }
    if (out.size() == lines.size()) return 0;
    return StoreLines(path, out);
  });
}

int VLIBCFileCheckKeyValue(const char* path, const char* key, const char* value, int /*flags*/) {
  if (!HasText(path) || !HasText(key) || value == nullptr) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return 0;
  }
  return NoThrow(0, [&]() -> int {
    std::string found;
    if (LookupKey(path, key, &found) != 1) return 0;
    return found == value ? 1 : 0;
  });
}

int VLIBCINFOSetKeyValue(const char* key, const char* value) {
  return VLIBCFileSetKeyValue(VLIBC_INFO_FILE, key, value, "%s=\"%s\"\n");
}

int VLIBCFileGetKeys(const char* path, int /*flags*/, PVLIBSZHASH* hash, const char* sep) {
  if (!HasText(path) || hash == nullptr) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  const char separator = HasText(sep) ? sep[0] : '=';
  if (separator == '\n' || separator == '#') {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  return NoThrow(-1, [&]() -> int {
    std::vector<std::string> lines;
    if (LoadLines(path, false, &lines) != 0) return -1;
    if (!PrepareHash(hash)) return -1;
    int count = 0;
    KeyLine kl;
    for (const auto& line : lines) {
      if (!ParseKeyLine(line, separator, &kl)) continue;
      if (VLIBCSzHashGetValue(*hash, kl.key.c_str()) != nullptr) continue;  // the first one counts
      if (VLIBCSzHashSetValue(*hash, kl.key.c_str(), kl.value.c_str()) != 0) return -1;
      ++count;
    }
    return count;
  });
}

int VLIBCFileSetKeys(const char* path, PVLIBSZHASH hashSet, PVLIBSZHASH hashOther, int /*flags*/) {
  if (!HasText(path) || hashSet == nullptr) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  int code = CheckHash(hashSet);
  if (code != 0) {
    VLIBC_ERR_SET(code);
    return -1;
  }
  return NoThrow(-1, [&]() -> int {
    const auto pairs = HashPairs(hashSet);
    std::set<std::string> remove;
    if (hashOther != nullptr) {
      for (const auto& kv : HashPairs(hashOther)) remove.insert(kv.first);
    }
    if (RewriteKeys(path, pairs, remove, "%s=%s\n") != 0) return -1;
    return static_cast<int>(pairs.size());
  });
}

int VLIBCFileEnumSection(const char* path, PVLIBSZLIST* list) {
  if (!HasText(path) || list == nullptr) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  return NoThrow(-1, [&]() -> int {
    std::vector<std::string> lines;
    if (LoadLines(path, false, &lines) != 0) return -1;
    if (!PrepareList(list)) return -1;
    std::set<std::string> seen;
    for (const auto& span : FindSections(lines)) {
      if (!seen.insert(span.name).second) continue;
      if (VLIBCSzListPush(list, span.name.c_str()) < 0) return -1;
    }
    return static_cast<int>(seen.size());
  });
}

int VLIBCFileGetSection(const char* path, const char* name, PVLIBSZHASH* hash) {
  if (!HasText(path) || !HasText(name) || hash == nullptr) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  return NoThrow(-1, [&]() -> int {
    std::vector<std::string> lines;
    if (LoadLines(path, false, &lines) != 0) return -1;
    if (!PrepareHash(hash)) return -1;
    const auto spans = FindSections(lines);
    const SectionSpan* span = FindSection(spans, name);
    if (span == nullptr) {
      VLIBC_ERR_SET(VLIBC_ERR_NOT_FOUND);
      return 0;
    }
    int count = 0;
    KeyLine kl;
    for (std::size_t i = span->header + 1; i < span->end; ++i) {
      if (!ParseKeyLine(lines[i], '=', &kl)) continue;
      if (VLIBCSzHashGetValue(*hash, kl.key.c_str()) != nullptr) continue;
      if (VLIBCSzHashSetValue(*hash, kl.key.c_str(), kl.value.c_str()) != 0) return -1;
      ++count;
    }
    return count;
  });
}

// The arguments of a section writer: a path, a section name and keys a file can hold, a format
// with two "%s". False with the error register set otherwise.
bool CheckSectionWrite(const char* path, const char* name, PVLIBSZHASH hash, const char* fmt) {
  if (!HasText(path) || hash == nullptr || !ValidFormat(fmt)) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return false;
  }
  int code = CheckSectionName(name);
  if (code == 0) code = CheckHash(hash);
  if (code != 0) {
    VLIBC_ERR_SET(code);
    return false;
  }
  return true;
}

int VLIBCFileAddSection(const char* path, const char* name, PVLIBSZHASH hash, const char* fmt) {
  if (!CheckSectionWrite(path, name, hash, fmt)) return -1;
  return NoThrow(-1, [&]() -> int {
    std::vector<std::string> lines;
    if (LoadLines(path, true, &lines) != 0) return -1;
    lines.push_back(std::string("[") + name + "]");
    for (const auto& kv : HashPairs(hash)) {
      lines.push_back(FormatLineExact(fmt, kv.first, kv.second));
    }
    return StoreLines(path, lines) == 0 ? 1 : -1;
  });
}

int VLIBCFileSetSection(const char* path, const char* name, PVLIBSZHASH hash, const char* fmt) {
  if (!CheckSectionWrite(path, name, hash, fmt)) return -1;
  return NoThrow(-1, [&]() -> int {
    std::vector<std::string> lines;
    if (LoadLines(path, true, &lines) != 0) return -1;
    const auto pairs = HashPairs(hash);
    const auto spans = FindSections(lines);
    const SectionSpan* span = FindSection(spans, name);
    if (span == nullptr) {
      lines.push_back(std::string("[") + name + "]");
      for (const auto& kv : pairs) lines.push_back(FormatLineExact(fmt, kv.first, kv.second));
      return StoreLines(path, lines) == 0 ? 1 : -1;
    }
    std::map<std::string, std::string> wanted(pairs.begin(), pairs.end());
    std::set<std::string> placed;
    std::vector<std::string> out(lines.begin(),
                                 lines.begin() + static_cast<long>(span->header) + 1);
    std::size_t insertAt = out.size();
    KeyLine kl;
    // Key lines of the section are replaced or dropped; its other lines stay where they are.
    for (std::size_t i = span->header + 1; i < span->end; ++i) {
      if (ParseKeyLine(lines[i], '=', &kl)) {
        auto it = wanted.find(kl.key);
        if (it != wanted.end() && placed.insert(kl.key).second) {
          out.push_back(FormatLineExact(fmt, it->first, it->second));
          insertAt = out.size();
        }
        continue;
      }
      out.push_back(lines[i]);
    }
    std::vector<std::string> added;
    for (const auto& kv : pairs) {
      if (placed.count(kv.first) == 0) added.push_back(FormatLineExact(fmt, kv.first, kv.second));
    }
    out.insert(out.begin() + static_cast<long>(insertAt), added.begin(), added.end());
    out.insert(out.end(), lines.begin() + static_cast<long>(span->end), lines.end());
    return StoreLines(path, out) == 0 ? 1 : -1;
  });
}

int VLIBCFileRemoveSection(const char* path, const char* name) {
  if (!HasText(path) || !HasText(name)) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  return NoThrow(-1, [&]() -> int {
    std::vector<std::string> lines;
    bool existed = true;
    if (LoadLines(path, true, &lines, &existed) != 0) return -1;
    if (!existed) return 0;
    const auto spans = FindSections(lines);
    std::vector<bool> drop(lines.size(), false);
    bool any = false;
    for (const auto& s : spans) {
      if (s.name != name) continue;
      any = true;
      for (std::size_t i = s.header; i < s.end; ++i) drop[i] = true;
    }
    if (!any) return 0;
    std::vector<std::string> out;
    for (std::size_t i = 0; i < lines.size(); ++i) {
      if (!drop[i]) out.push_back(std::move(lines[i]));
    }
    return StoreLines(path, out);
  });
}

int VLIBCFileGetSectionValue(const char* path, const char* section, const char* key, char* buf,
                             int size) {
  if (!HasText(path) || !HasText(section) || !HasText(key) || buf == nullptr || size <= 0) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  buf[0] = '\0';
  if (std::strlen(key) > VLIBC_KEY_MAX) {
    VLIBC_ERR_SET(VLIBC_ERR_TOO_LONG);
    return -1;
  }
  return NoThrow(-1, [&]() -> int {
    std::vector<std::string> lines;
    if (LoadLines(path, false, &lines) != 0) return -1;
    const auto spans = FindSections(lines);
    const SectionSpan* span = FindSection(spans, section);
    if (span != nullptr) {
      KeyLine kl;
      for (std::size_t i = span->header + 1; i < span->end; ++i) {
        if (ParseKeyLine(lines[i], '=', &kl) && kl.key == key) return CopyOut(kl.value, buf, size);
      }
    }
    VLIBC_ERR_SET(VLIBC_ERR_NOT_FOUND);
    return 0;
  });
}

int VLIBCFileSetSectionValue(const char* path, const char* section, const char* key,
                             const char* value) {
  if (!HasText(path)) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  int code = CheckSectionName(section);
  if (code == 0) code = CheckKey(key);
  if (code == 0) code = CheckValue(value);
  if (code != 0) {
    VLIBC_ERR_SET(code);
    return -1;
  }
  return NoThrow(-1, [&]() -> int {
    std::vector<std::string> lines;
    if (LoadLines(path, true, &lines) != 0) return -1;
    const auto spans = FindSections(lines);
    const SectionSpan* span = FindSection(spans, section);
    if (span == nullptr) {
      lines.push_back(std::string("[") + section + "]");
      lines.push_back(std::string(key) + "=" + value);
      return StoreLines(path, lines);
    }
    KeyLine kl;
    std::size_t lastKey = span->header;
    bool haveIndent = false;
    std::string indent;
    for (std::size_t i = span->header + 1; i < span->end; ++i) {
      if (!ParseKeyLine(lines[i], '=', &kl)) continue;
      if (kl.key == key) {
        // Keep the line's form: its indentation and its quotes.
        lines[i] = kl.indent + key + "=" + (kl.quoted ? "\"" + std::string(value) + "\"" : value);
        return StoreLines(path, lines);
      }
      if (!haveIndent) {
        indent = kl.indent;
        haveIndent = true;
      }
      lastKey = i;
    }
    lines.insert(lines.begin() + static_cast<long>(lastKey) + 1, indent + key + "=" + value);
    return StoreLines(path, lines);
  });
}

int VLIBCFileHash2File(FILE* fp, const char* name, PVLIBSZHASH hash, const char* fmt) {
  if (fp == nullptr || hash == nullptr || !ValidFormat(fmt)) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  int code = CheckSectionName(name);
  if (code == 0) code = CheckHash(hash);
  if (code != 0) {
    VLIBC_ERR_SET(code);
    return -1;
  }
  return NoThrow(-1, [&]() -> int {
    std::string text = std::string("[") + name + "]\n";
    for (const auto& kv : HashPairs(hash)) text += FormatLine(fmt, kv.first, kv.second) + "\n";
    if (std::fwrite(text.data(), 1, text.size(), fp) != text.size() || std::ferror(fp) != 0) {
      VLIBC_ERR_SET_ERRNO();
      return -1;
    }
    return 0;
  });
}

int VLIBCFileAddLine(const char* path, int /*flags*/, const char* line, int unique) {
  if (!HasText(path) || line == nullptr || std::strpbrk(line, "\n\r") != nullptr) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return 0;
  }
  return NoThrow(0, [&]() -> int {
    std::vector<std::string> lines;
    if (LoadLines(path, true, &lines) != 0) return 0;
    if (unique != 0) {
      const std::string wanted = Trim(line);
      for (const auto& l : lines) {
        if (Trim(l) == wanted) return 1;
      }
    }
    lines.emplace_back(line);
    return StoreLines(path, lines) == 0 ? 1 : 0;
  });
}

int VLIBCFileRemoveLine(const char* path, const char* text) {
  if (!HasText(path) || text == nullptr) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  return NoThrow(-1, [&]() -> int {
    std::vector<std::string> lines;
    bool existed = true;
    if (LoadLines(path, true, &lines, &existed) != 0) return -1;
    if (!existed) return 0;
    const std::string wanted = Trim(text);
    std::vector<std::string> out;
    for (auto& l : lines) {
      if (Trim(l) != wanted) out.push_back(std::move(l));
    }
    if (out.size() == lines.size()) return 0;
    return StoreLines(path, out);
  });
}

int VLIBCFileUTF8BomStrip(const char* path) {
  if (!HasText(path)) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  return NoThrow(-1, [&]() -> int {
    std::string content;
    if (ReadWholeFile(path, content) != 0) {
      VLIBC_ERR_SET_ERRNO();
      return -1;
    }
    if (content.compare(0, 3, "\xEF\xBB\xBF") != 0) return 0;
    if (AtomicWriteFile(path, content.substr(3)) != 0) {
      VLIBC_ERR_SET_ERRNO();
      return -1;
    }
    return 0;
  });
}

int VORNFileCopy(const char* src, const char* dst, int /*flags*/, int mode) {
  if (!HasText(src) || !HasText(dst)) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  return NoThrow(-1, [&]() -> int {
    struct stat st;
    if (stat(src, &st) != 0) {
      VLIBC_ERR_SET_ERRNO();
      return -1;
    }
    if (!S_ISREG(st.st_mode)) {
      VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
      return -1;
    }
    std::string content;
    if (ReadWholeFile(src, content) != 0) {
      VLIBC_ERR_SET_ERRNO();
      return -1;
    }
    // The copy takes the source's mode (or the one asked for), not the old target's.
    const mode_t newMode = mode > 0 ? static_cast<mode_t>(mode & 07777) : (st.st_mode & 07777);
    if (AtomicWriteFile(dst, content, newMode, false) != 0) {
      VLIBC_ERR_SET_ERRNO();
      return -1;
    }
    return 0;
  });
}
