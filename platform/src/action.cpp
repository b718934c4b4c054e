// Platform actions: appliance services run as /usr/vorn/libexec/platform/<Name> with argv.
#include "vornplatform/action.h"

#include <sys/stat.h>

#include <cerrno>
#include <cstring>
#include <string>
#include <vector>

#include "internal.h"
#include "vornplatform/child_limit.h"
#include "vornplatform/err.h"
#include "vornplatform/log.h"

using vornplatform::internal::HasText;
using vornplatform::internal::NoThrow;

namespace {

bool ValidActionName(const char* name) {
  return HasText(name) && std::strchr(name, '/') == nullptr && std::strcmp(name, ".") != 0 &&
         std::strcmp(name, "..") != 0;
}

}  // namespace

namespace vornplatform {

int RunStrictAction(const char* name, const std::vector<std::string>& args) {
  const int rc = RunAction(name, args);
  if (rc == 0) return 0;
  if (rc > 0) {
    VORN_LOG(LOG_ERR, "platform action %s exited with %d", name, rc);
    VLIBC_ERR_SET(VLIBC_ERR_EXEC);
  }
  return -1;
}

int RunAction(const char* name, const std::vector<std::string>& args, std::string* out) {
  if (out != nullptr) out->clear();
  if (!ValidActionName(name)) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  return internal::NoThrow(-1, [&]() -> int {
    const std::string path = std::string(VORN_PLATFORM_ACTION_DIR) + "/" + name;
    struct stat st;
    if (stat(path.c_str(), &st) != 0 && (errno == ENOENT || errno == ENOTDIR)) {
      VORN_LOG(LOG_DEBUG, "platform action %s not installed", name);
      return 0;
    }
    std::vector<char*> argv;
    argv.reserve(args.size() + 2);
    argv.push_back(const_cast<char*>(path.c_str()));
    for (const auto& a : args) argv.push_back(const_cast<char*>(a.c_str()));
    argv.push_back(nullptr);
    const internal::SpawnResult r =
        internal::Spawn(path.c_str(), argv.data(), out, true, ChildLimitMs(kActionLimitMs));
    if (r.status >= 0) return r.status;
    errno = r.error;
    VLIBC_ERR_SET(VLIBC_ERR_EXEC);
    if (r.timedOut) {
      // logged with the path and the limit where it was killed
    } else if (r.signal != 0) {
      VORN_LOG(LOG_ERR, "platform action %s killed by signal %d", name, r.signal);
    } else {
      VORN_LOG(LOG_ERR, "platform action %s cannot run: %s", name, std::strerror(r.error));
    }
    return -1;
  });
}

}  // namespace vornplatform

int VORNFwRuleHup() { return vornplatform::RunStrictAction("VORNFwRuleHup"); }

int VORNFwTcRuleHup() { return vornplatform::RunStrictAction("VORNFwTcRuleHup"); }
