// Hooks: the executables of /usr/vorn/etc/hooks/<name>/ run in name order with the hook's
// variables in their environment and the action number as argv[1].
#include "vornplatform/hook.h"

#include <dirent.h>
#include <fcntl.h>
#include <signal.h>
#include <spawn.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <string>
#include <vector>

#include "internal.h"
#include "vornplatform/child_limit.h"
#include "vornplatform/err.h"
#include "vornplatform/log.h"

extern char** environ;

namespace {

bool ValidHookName(std::string const& name) {
  if (name.empty() || name[0] == '/' || name.find('\0') != std::string::npos) return false;
  std::size_t start = 0;
  for (;;) {
    const std::size_t end = name.find('/', start);
    const std::string part = name.substr(start, end == std::string::npos ? end : end - start);
    if (part.empty() || part == "." || part == "..") return false;
    if (end == std::string::npos) return true;
    start = end + 1;
  }
}

// The executable regular files of dir, sorted by name.
std::vector<std::string> HookPrograms(std::string const& dir) {
  std::vector<std::string> names;
  DIR* d = opendir(dir.c_str());
  if (d == nullptr) return names;
  while (struct dirent* e = readdir(d)) {
    const std::string name = e->d_name;
    if (name == "." || name == "..") continue;
    const std::string path = dir + "/" + name;
    struct stat st;
    if (stat(path.c_str(), &st) != 0 || !S_ISREG(st.st_mode)) continue;
    if (access(path.c_str(), X_OK) != 0) continue;
    names.push_back(name);
  }
  closedir(d);
  std::sort(names.begin(), names.end());
  return names;
}

// The caller's environment with the hook's variables put over it.
std::vector<std::string> HookEnvironment(std::map<std::string, std::string> const& vars) {
  std::vector<std::string> env;
  for (char** e = environ; e != nullptr && *e != nullptr; ++e) {
    const char* eq = std::strchr(*e, '=');
    const std::string key =
        eq == nullptr ? std::string(*e) : std::string(*e, static_cast<std::size_t>(eq - *e));
    if (vars.count(key) == 0) env.push_back(*e);
  }
  for (auto const& kv : vars) env.push_back(kv.first + "=" + kv.second);
  return env;
}

// Runs one program in a process group of its own and waits for it at most limitMs; its result is
// not used. The failure to start it is logged. false when it outlived the limit (then it and its
// group were killed and that was logged).
bool RunHookProgram(long limitMs, std::string const& path, std::string const& action,
                    std::vector<std::string> const& env) {
  std::vector<char*> argv{const_cast<char*>(path.c_str()), const_cast<char*>(action.c_str()),
                          nullptr};
  std::vector<char*> envp;
  envp.reserve(env.size() + 1);
  for (auto const& e : env) envp.push_back(const_cast<char*>(e.c_str()));
  envp.push_back(nullptr);

  posix_spawn_file_actions_t actions;
  posix_spawnattr_t attr;
  posix_spawn_file_actions_init(&actions);
  posix_spawn_file_actions_addopen(&actions, STDIN_FILENO, "/dev/null", O_RDONLY, 0);
  posix_spawnattr_init(&attr);
  sigset_t none, all;
  sigemptyset(&none);
  sigfillset(&all);
  sigdelset(&all, SIGKILL);
  sigdelset(&all, SIGSTOP);
  posix_spawnattr_setsigmask(&attr, &none);
  posix_spawnattr_setsigdefault(&attr, &all);
  posix_spawnattr_setpgroup(&attr, 0);
  posix_spawnattr_setflags(&attr,
                           POSIX_SPAWN_SETSIGMASK | POSIX_SPAWN_SETSIGDEF | POSIX_SPAWN_SETPGROUP);
  const int64_t deadline = vornplatform::internal::MonotonicMs() + limitMs;
  pid_t pid = -1;
  const int rc = posix_spawn(&pid, path.c_str(), &actions, &attr, argv.data(), envp.data());
  posix_spawnattr_destroy(&attr);
  posix_spawn_file_actions_destroy(&actions);
  if (rc != 0) {
    VORN_LOG(LOG_ERR, "Failed to run hook [%s]: %s", path.c_str(), std::strerror(rc));
    return true;
  }
  int status = 0;
  return vornplatform::internal::WaitChildBounded(pid, path.c_str(), limitMs, deadline, &status,
                                                  -1, nullptr) !=
         vornplatform::internal::ChildWait::kTimedOut;
}

}  // namespace

namespace vornnetsdk {
namespace hook {

BaseHook::BaseHook(std::string const& category, std::string const& name)
    : _category(category), _name(name) {}

BaseHook::~BaseHook() {}

int BaseHook::SetEnv(std::string const& key, std::string const& value) {
  if (key.empty() || key.find_first_of(std::string("=\0", 2)) != std::string::npos ||
      value.find('\0') != std::string::npos) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  return vornplatform::internal::NoThrow(-1, [&]() -> int {
    _envs[key] = value;
    return 0;
  });
}

std::string BaseHook::GetEnv(std::string const& key) const {
  auto it = _envs.find(key);
  return it == _envs.end() ? std::string() : it->second;
}

bool BaseHook::IsValid() const {
  return !_category.empty() && _category.find('\0') == std::string::npos && ValidHookName(_name);
}

int BaseHook::ExecHook(int action) {
  if (!IsValid()) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  return vornplatform::internal::NoThrow(-1, [&]() -> int {
    const std::string dir = std::string(VORN_HOOK_DIR) + "/" + _name;
    const std::vector<std::string> programs = HookPrograms(dir);
    if (programs.empty()) return 0;
    const std::vector<std::string> env = HookEnvironment(_envs);
    const std::string actionText = std::to_string(action);
    const long limitMs = vornplatform::ChildLimitMs(vornplatform::kHookLimitMs);
    bool allEnded = true;
    for (auto const& name : programs) {
      if (!RunHookProgram(limitMs, dir + "/" + name, actionText, env)) allEnded = false;
    }
    if (!allEnded) {
      errno = ETIMEDOUT;
      VLIBC_ERR_SET(VLIBC_ERR_EXEC);
      return -1;
    }
    return 0;
  });
}

}  // namespace hook
}  // namespace vornnetsdk

struct _VLIB_PLUGIN {
  vornnetsdk::hook::BaseHook hook;
};

int VLIBPluginSDKInit(const char* category, const char* name, PVLIB_PLUGIN* handle) {
  if (handle == nullptr) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  *handle = nullptr;
  if (category == nullptr || name == nullptr) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  return vornplatform::internal::NoThrow(-1, [&]() -> int {
    PVLIB_PLUGIN h = new _VLIB_PLUGIN{vornnetsdk::hook::BaseHook(category, name)};
    if (!h->hook.IsValid()) {
      delete h;
      VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
      return -1;
    }
    *handle = h;
    return 0;
  });
}

int VLIBPluginSetArg(PVLIB_PLUGIN handle, const char* key, const char* value) {
  if (handle == nullptr || key == nullptr || value == nullptr) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  return vornplatform::internal::NoThrow(-1,
                                         [&]() -> int { return handle->hook.SetEnv(key, value); });
}

int VLIBPluginAction_S(PVLIB_PLUGIN handle) {
  if (handle == nullptr) {
    VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
    return -1;
  }
  return handle->hook.ExecHook(VLIB_PLUGIN_ACTION);
}

int VLIBPluginExit(PVLIB_PLUGIN handle) {
  delete handle;
  return 0;
}

int VLIBPluginHasAction(const char* name) {
  if (name == nullptr || !ValidHookName(name)) return 0;
  return vornplatform::internal::NoThrow(0, [&]() -> int {
    const std::string dir = std::string(VORN_HOOK_DIR) + "/" + name;
    DIR* d = opendir(dir.c_str());
    if (d == nullptr) return 0;
    int found = 0;
    while (struct dirent* e = readdir(d)) {
      if (std::strcmp(e->d_name, ".") == 0 || std::strcmp(e->d_name, "..") == 0) continue;
      const std::string path = dir + "/" + e->d_name;
      struct stat st;
      if (stat(path.c_str(), &st) == 0 && S_ISREG(st.st_mode) && access(path.c_str(), X_OK) == 0) {
        found = 1;
        break;
      }
    }
    closedir(d);
    return found;
  });
}
