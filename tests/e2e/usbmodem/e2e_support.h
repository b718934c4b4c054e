// Shared pieces of the USB modem scenarios: the simulator, the daemon under the time seam and
// gdbus as the client, all inside the sandbox.
#ifndef VORN_TESTS_E2E_USBMODEM_E2E_SUPPORT_H
#define VORN_TESTS_E2E_USBMODEM_E2E_SUPPORT_H

#include <sys/types.h>

#include <functional>
#include <string>
#include <vector>

namespace usbmodem_e2e {

// One started program, stopped with SIGTERM (then SIGKILL) by Stop or the destructor.
class Child {
 public:
  Child() = default;
  ~Child();
  Child(const Child&) = delete;
  Child& operator=(const Child&) = delete;
  // Starts argv; with readyLine, waits (up to timeoutSec) for that line on the child's stdout.
  bool Start(const std::vector<std::string>& argv, const std::string& readyLine = "",
             int timeoutSec = 20);
  void Stop();
  bool Alive();
  // Waits up to timeoutSec for the child to end: its exit status, 128 + signal, or -1.
  int Wait(int timeoutSec);
  pid_t pid() const { return pid_; }

 private:
  pid_t pid_ = -1;
};

// A reply of gdbus: ok, the first out string, or the error name and message.
struct Reply {
  bool ok = false;
  std::string value;
  std::string errorName;
  std::string errorMessage;
  std::string raw;
};

// gdbus call --session on com.vornlink.usbmodem "/", method with GVariant-quoted arguments.
Reply Call(const std::string& method, const std::vector<std::string>& stringArgs = {},
           const char* boolArg = nullptr);
// The GVariant text of a string (quoted and escaped as gdbus expects).
std::string Quote(const std::string& text);

// Waits up to timeoutSec (real seconds), polling every 100 ms, for pred.
bool WaitFor(const std::function<bool()>& pred, double timeoutSec);

// The scenario file of a dongle on /dev/ttyUSB<nodes> with info file N; extra is merged in (a
// JSON object text whose keys replace the defaults).
std::string Scenario(int info, const std::string& extraJson = "{}");

// Starts the simulator with the scenario; transcript at /tmp/modem-sim.<info>.transcript.jsonl.
bool StartSim(Child& sim, const std::string& scenarioJson, int info);
// Commands the simulator sent or received (the "cmd" of every "cmd" line of the transcript).
std::vector<std::string> TranscriptCommands(int info);

// The daemon under vorn-timewarp FACTOR; waits until it answers on the bus.
bool StartDaemon(Child& daemon, const std::string& factor = "10");

// Puts wvdial wrapper, fake pppd and the peers file in place (once per process).
bool InstallPeers();

// Leftovers of a scenario: diallers, pid files, logs, profiles.
void CleanModemState();

// The command line of a process as argv.
std::vector<std::string> ProcCmdline(pid_t pid);
pid_t ReadPid(const std::string& path);

// Parses a JSON text; false when it is not JSON.
bool ParseJson(const std::string& text, std::string const& key, std::string* value);

}  // namespace usbmodem_e2e

#endif
