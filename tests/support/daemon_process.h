// Runs a D-Bus daemon of ours (vornnetd or a test service) on the test's bus for the length of a
// test, and asks the bus about names with gdbus.
#ifndef VORN_TESTS_SUPPORT_DAEMON_PROCESS_H
#define VORN_TESTS_SUPPORT_DAEMON_PROCESS_H

#include <sys/types.h>

#include <string>
#include <vector>

namespace vorntest {

class DaemonProcess {
 public:
  // Starts argv and waits (up to 10 s) until the process owns `name` or has exited. With an
  // empty name it does not wait.
  DaemonProcess(const std::vector<std::string>& argv, const std::string& name);
  // SIGTERM, then SIGKILL after 20 s, when still running.
  ~DaemonProcess();
  DaemonProcess(const DaemonProcess&) = delete;
  DaemonProcess& operator=(const DaemonProcess&) = delete;

  bool ready() const { return ready_; }
  pid_t pid() const { return pid_; }
  bool running();
  // Sends sig and waits up to 20 s for the exit status (128+N for a signal), -1 on timeout.
  int Stop(int sig = 15);
  // Waits up to timeoutSec for the process to end by itself; its status, or -1.
  int Wait(int timeoutSec);

 private:
  pid_t pid_ = -1;
  bool ready_ = false;
  int status_ = -1;
};

// Whether the bus says `name` has an owner (asked with gdbus, independent of our client).
bool NameHasOwner(const std::string& name);
// The pid of the owner of `name`, -1 when it has none.
pid_t NameOwnerPid(const std::string& name);

}  // namespace vorntest

#endif
