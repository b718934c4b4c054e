#include "vornwireless/utils/reset_files.h"

#include <glob.h>
#include <libgen.h>

#include <cstdio>
#include <string>
#include <vector>

#include "vornplatform/file.h"
#include "vornplatform/log.h"
#include "vornplatform/proc.h"
#include "vornplatform/szhash.h"

namespace vornwireless {
namespace utils {

namespace {

// The paths that match pattern; a glob error is logged and counts as no match.
std::vector<std::string> Matches(char const* pattern) {
  std::vector<std::string> out;
  glob_t g;
  int rc = glob(pattern, GLOB_NOSORT, nullptr, &g);
  if (rc == 0) {
    for (size_t i = 0; i < g.gl_pathc; ++i) out.push_back(g.gl_pathv[i]);
  } else if (rc != GLOB_NOMATCH) {
    VORN_LOG(LOG_ERR, "glob error on path %s", pattern);
  }
  globfree(&g);
  return out;
}

}  // namespace

void RemoveFile(char const* path) {
  if (!path || VLIBCFileExist(path) != 1) return;
  if (remove(path) != 0) VORN_LOG(LOG_ERR, "remove file %s failed", path);
}

void RemoveFiles(char const* dir, char const* pattern) {
  if (!dir || !pattern) return;
  PVLIBSZLIST list = VLIBCSzListAlloc(512);
  if (!list) return;
  if (VLIBCFileEnumDir(dir, pattern, &list, VLIBC_ENUM_DIR_FILE) >= 0) {
    for (int i = 0; i < list->nItem; ++i) {
      std::string path = std::string(dir) + "/" + list->pszItem[i];
      RemoveFile(path.c_str());
    }
  }
  VLIBCSzListFree(list);
}

void ResetFiles(char const* source, char const* target) {
  if (!source || !target || !*source || !*target) return;
  // Each match is removed and copied by itself: the programs run without a shell, so a pattern
  // handed over whole would not be expanded.
  for (std::string const& path : Matches(target)) {
    if (VLIBCExec("/bin/rm", "-rf", path.c_str(), nullptr, nullptr) != 0) {
      VORN_LOG(LOG_ERR, "Failed to remove [%s]", path.c_str());
    }
  }
  std::vector<std::string> sources = Matches(source);
  if (sources.empty()) return;
  std::vector<char> buf(target, target + std::string(target).size() + 1);
  std::string targetDir = dirname(buf.data());
  for (std::string const& path : sources) {
    if (VLIBCExec("/bin/cp", "-rf", path.c_str(), targetDir.c_str(), nullptr) != 0) {
      VORN_LOG(LOG_ERR, "Failed to copy [%s] to [%s]", path.c_str(), targetDir.c_str());
    }
  }
}

}  // namespace utils
}  // namespace vornwireless
