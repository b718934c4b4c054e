// Change hooks of the platform. A hook has a category and a name ("net", "net/gateway_change");
// firing it runs every executable file of VORN_HOOK_DIR/<name>/ in name order (byte order of the
// names), one after the other, without a shell: argv[0] is the file's path, argv[1] the action
// number in decimal, and the hook's variables are added to the environment of the caller. stdin
// is /dev/null. What the executables return is not used. Each executable runs in a process group
// of its own and has kHookLimitMs (child_limit.h) to finish; one that outlives it is killed with
// its group and the hook's firing fails, after the remaining executables have run.
#ifndef VORNPLATFORM_HOOK_H
#define VORNPLATFORM_HOOK_H

#include <map>
#include <string>

#define VORN_HOOK_DIR "/usr/vorn/etc/hooks"
// The action number VLIBPluginAction_S fires with ("after the change").
#define VLIB_PLUGIN_ACTION 5

namespace vornnetsdk {
namespace hook {

class BaseHook {
 public:
  // name already holds the category ("net/ipv4_change"); it is used as given below VORN_HOOK_DIR.
  BaseHook(std::string const& category, std::string const& name);
  virtual ~BaseHook();
  BaseHook(BaseHook const&) = default;
  BaseHook& operator=(BaseHook const&) = default;

  // Sets (or replaces) one variable. 0; -1 for a key that is empty or holds '=' or NUL, or a
  // value holding NUL (error register: bad parameter).
  int SetEnv(std::string const& key, std::string const& value);
  // The variable's value, "" when it is not set.
  std::string GetEnv(std::string const& key) const;
  // True when category and name are usable: not empty, the name a relative path without
  // "." or ".." components. Hooks with required variables add their own tests.
  virtual bool IsValid() const;
  // Fires the hook with the action number. 0 when it was fired (also with no executable
  // installed); -1 when IsValid() is false (nothing runs, error register: bad parameter) or an
  // executable outlived its limit (error register: exec, errno ETIMEDOUT).
  int ExecHook(int action);

  std::string const& GetCategory() const { return _category; }
  std::string const& GetName() const { return _name; }
  std::map<std::string, std::string> const& GetEnvs() const { return _envs; }

 private:
  std::string _category;
  std::string _name;
  std::map<std::string, std::string> _envs;
};

}  // namespace hook
}  // namespace vornnetsdk

// The C-style plug-in interface over the same mechanism.
typedef struct _VLIB_PLUGIN* PVLIB_PLUGIN;

// Makes a handle for the hook (category, name). 0; -1 for a NULL handle pointer or an unusable
// category or name (*handle is then NULL).
int VLIBPluginSDKInit(const char* category, const char* name, PVLIB_PLUGIN* handle);
// Sets one variable of the handle. 0; -1 (bad handle, key or value).
int VLIBPluginSetArg(PVLIB_PLUGIN handle, const char* key, const char* value);
// Fires the hook with action VLIB_PLUGIN_ACTION. 0; -1 for a bad handle or an executable that
// outlived its limit.
int VLIBPluginAction_S(PVLIB_PLUGIN handle);
// Frees the handle; NULL is fine. 0.
int VLIBPluginExit(PVLIB_PLUGIN handle);

// Whether firing the hook `name` ("net/ipv4_change") would run anything: 1 when its directory
// below VORN_HOOK_DIR holds an executable file, 0 when not or for an unusable name. Lets a caller
// skip preparing the variables of a hook that nothing is installed for.
int VLIBPluginHasAction(const char* name);

#endif
