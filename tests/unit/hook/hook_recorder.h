// Hook peers for tests: small shell scripts installed under /usr/vorn/etc/hooks/<name>/ that
// append what they were run with (path, argv, whole environment) to one record file.
#ifndef VORN_TESTS_UNIT_HOOK_HOOK_RECORDER_H
#define VORN_TESTS_UNIT_HOOK_HOOK_RECORDER_H

#include <sys/stat.h>
#include <unistd.h>

#include <map>
#include <sstream>
#include <string>
#include <vector>

#include "support/test_util.h"

namespace vorntest {

struct HookRun {
  std::string program;                     // the hook's path (its argv[0])
  std::vector<std::string> args;           // argv[1..]
  std::map<std::string, std::string> env;  // the whole environment it saw
};

const char kHookRecord[] = "/run/hook-record.txt";

inline std::string HookDir(const std::string& name) { return "/usr/vorn/etc/hooks/" + name; }

// Installs a recording hook as HookDir(name)/file (mode 0755, or mode as given).
inline bool InstallRecordingHook(const std::string& name, const std::string& file,
                                 int mode = 0755) {
  const std::string dir = HookDir(name);
  if (Run({"/bin/mkdir", "-p", dir}).status != 0) return false;
  const std::string script =
      "#!/bin/sh\n"
      "{\n"
      "  printf 'program=%s\\n' \"$0\"\n"
      "  for a in \"$@\"; do printf 'arg=%s\\n' \"$a\"; done\n"
      "  env | LC_ALL=C sort | sed 's/^/env:/'\n"
      "  echo '--'\n"
      "} >> " +
      std::string(kHookRecord) + "\n";
  return WriteFile(dir + "/" + file, script, mode);
}

// Everything the recording hooks wrote since the last ClearHookRuns, oldest first.
inline std::vector<HookRun> HookRuns() {
  std::vector<HookRun> runs;
  std::istringstream in(ReadFile(kHookRecord));
  std::string line;
  HookRun run;
  bool open = false;
  while (std::getline(in, line)) {
    if (line == "--") {
      runs.push_back(run);
      run = HookRun();
      open = false;
    } else if (line.compare(0, 8, "program=") == 0) {
      run.program = line.substr(8);
      open = true;
    } else if (open && line.compare(0, 4, "arg=") == 0) {
      run.args.push_back(line.substr(4));
    } else if (open && line.compare(0, 4, "env:") == 0) {
      const std::string kv = line.substr(4);
      const std::size_t eq = kv.find('=');
      if (eq != std::string::npos) run.env[kv.substr(0, eq)] = kv.substr(eq + 1);
    }
  }
  return runs;
}

inline void ClearHookRuns() { unlink(kHookRecord); }

inline void RemoveHooks() { Run({"/bin/rm", "-rf", "/usr/vorn/etc/hooks"}); }

}  // namespace vorntest

#endif
