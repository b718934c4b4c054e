// Kernel modules: presence through sysfs, insertion through modules.dep of the running kernel.
#include "vornplatform/kmod.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/utsname.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <string>
#include <vector>

#include "internal.h"
#include "vornplatform/err.h"
#include "vornplatform/log.h"
#include "vornplatform/proc.h"

using vornplatform::internal::HasText;
using vornplatform::internal::NoThrow;
using vornplatform::internal::ReadWholeFile;

namespace {

constexpr const char* kModprobe = "/sbin/modprobe";
#ifndef MODULE_INIT_COMPRESSED_FILE
#define MODULE_INIT_COMPRESSED_FILE 4
#endif

// Module names are the same with '-' and '_' (sysfs and modules.dep use '_' forms as loaded).
std::string Canonical(std::string name) {
  for (char& c : name) {
    if (c == '-') c = '_';
  }
  return name;
}

// "dir/ppp_generic.ko.xz" -> "ppp_generic"; "" when it is not a module file name.
std::string ModuleNameOf(const std::string& file) {
  const std::size_t slash = file.rfind('/');
  std::string base = slash == std::string::npos ? file : file.substr(slash + 1);
  const std::size_t ko = base.find(".ko");
  if (ko == std::string::npos || ko == 0) return "";
  const std::string rest = base.substr(ko);
  if (rest != ".ko" && rest != ".ko.xz" && rest != ".ko.zst" && rest != ".ko.gz") return "";
  return Canonical(base.substr(0, ko));
}

bool ValidModuleName(const std::string& name) {
  if (name.empty() || name.size() > 55) return false;
  for (char c : name) {
    const bool ok = (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') ||
                    c == '_' || c == '-';
    if (!ok) return false;
  }
  return true;
}

std::string ModulesDir() {
  struct utsname u;
  if (uname(&u) != 0) return "";
  return std::string("/lib/modules/") + u.release;
}

// The module's file and its dependencies (relative to the modules directory) from modules.dep.
// false when the module is not listed (error recorded).
bool FindInModulesDep(const std::string& dir, const std::string& name, std::string* file,
                      std::vector<std::string>* deps) {
  std::string text;
  if (ReadWholeFile((dir + "/modules.dep").c_str(), text) != 0) {
    VLIBC_ERR_SET(errno == ENOENT ? VLIBC_ERR_NOT_FOUND : VLIBC_ERR_IO);
    return false;
  }
  std::size_t start = 0;
  while (start < text.size()) {
    std::size_t nl = text.find('\n', start);
    if (nl == std::string::npos) nl = text.size();
    const std::string line = text.substr(start, nl - start);
    start = nl + 1;
    const std::size_t colon = line.find(':');
    if (colon == std::string::npos) continue;
    const std::string path = line.substr(0, colon);
    if (ModuleNameOf(path) != name) continue;
    *file = path;
    deps->clear();
    std::size_t p = colon + 1;
    while (p < line.size()) {
      while (p < line.size() && (line[p] == ' ' || line[p] == '\t')) ++p;
      std::size_t e = p;
      while (e < line.size() && line[e] != ' ' && line[e] != '\t') ++e;
      if (e > p) deps->push_back(line.substr(p, e - p));
      p = e;
    }
    return true;
  }
  VLIBC_ERR_SET(VLIBC_ERR_NOT_FOUND);
  return false;
}

// Loads one module file with finit_module. true when loaded or already there.
bool LoadModuleFile(const std::string& path) {
  if (VORNCheckModule(ModuleNameOf(path).c_str()) == 1) return true;
  const int fd = open(path.c_str(), O_RDONLY | O_CLOEXEC);
  if (fd < 0) {
    VLIBC_ERR_SET(errno == ENOENT ? VLIBC_ERR_NOT_FOUND : VLIBC_ERR_IO);
    return false;
  }
  const bool compressed = path.size() < 3 || path.compare(path.size() - 3, 3, ".ko") != 0;
  const long rc = syscall(SYS_finit_module, fd, "", compressed ? MODULE_INIT_COMPRESSED_FILE : 0);
  const int e = errno;
  close(fd);
  if (rc != 0 && e != EEXIST) {
    errno = e;
    VLIBC_ERR_SET(VLIBC_ERR_EXEC);
    return false;
  }
  return true;
}

int InsertModule(const char* owner, const std::string& item) {
  if (item.find('/') != std::string::npos) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  std::string name = ModuleNameOf(item);
  if (name.empty()) name = Canonical(item);  // a bare name is fine too
  if (!ValidModuleName(name)) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  if (VORNCheckModule(name.c_str()) == 1) return 0;
  const std::string dir = ModulesDir();
  std::string file;
  std::vector<std::string> deps;
  if (dir.empty() || !FindInModulesDep(dir, name, &file, &deps)) {
    VORN_LOG(LOG_ERR, "[%s] module %s not found for the running kernel", owner, name.c_str());
    return -1;
  }
  if (access(kModprobe, X_OK) == 0) {
    const int rc = VLIBCExec(kModprobe, name.c_str(), nullptr, nullptr, nullptr);
    if (rc == 0) return 0;
    if (rc > 0) VLIBC_ERR_SET(VLIBC_ERR_EXEC);
    VORN_LOG(LOG_ERR, "[%s] %s %s failed (%d)", owner, kModprobe, name.c_str(), rc);
    return -1;
  }
  // No modprobe: load the dependencies (listed nearest first) and then the module itself.
  for (auto it = deps.rbegin(); it != deps.rend(); ++it) {
    const std::string path = it->front() == '/' ? *it : dir + "/" + *it;
    if (!LoadModuleFile(path)) return -1;
  }
  const std::string path = file.front() == '/' ? file : dir + "/" + file;
  return LoadModuleFile(path) ? 0 : -1;
}

}  // namespace

int VORNCheckModule(const char* name) {
  if (!HasText(name) || std::strchr(name, '/') != nullptr || std::strcmp(name, ".") == 0 ||
      std::strcmp(name, "..") == 0) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return 0;
  }
  return NoThrow(0, [&]() -> int {
    struct stat st;
    const std::string path = "/sys/module/" + Canonical(name);
    return stat(path.c_str(), &st) == 0 && S_ISDIR(st.st_mode) ? 1 : 0;
  });
}

int VLIBIptablesModInsert(const char* owner, PVLIBSZLIST list) {
  if (list == nullptr) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  return NoThrow(-1, [&]() -> int {
    const char* who = HasText(owner) ? owner : "-";
    int rc = 0;
    for (int i = 0; i < list->nItem; ++i) {
      const char* item = list->pszItem[i];
      if (!HasText(item)) {
        VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
        rc = -1;
        continue;
      }
      if (InsertModule(who, item) != 0) rc = -1;
    }
    return rc;
  });
}
