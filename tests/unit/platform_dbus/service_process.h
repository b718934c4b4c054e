// Runs vorn-test-dbus-service on the test's bus for the length of a test.
#ifndef VORN_TESTS_UNIT_PLATFORM_DBUS_SERVICE_PROCESS_H
#define VORN_TESTS_UNIT_PLATFORM_DBUS_SERVICE_PROCESS_H

#include <sys/types.h>

#include <string>
#include <vector>

namespace vorntest {

class ServiceProcess {
 public:
  // Starts the service with `args` and waits (up to 10 s) until it owns `name` or has exited.
  // ready(): the name's owner is this process.
  explicit ServiceProcess(const std::vector<std::string>& args = {},
                          const std::string& name = "com.vornlink.test");
  // Stops it with SIGTERM when still running.
  ~ServiceProcess();
  ServiceProcess(const ServiceProcess&) = delete;
  ServiceProcess& operator=(const ServiceProcess&) = delete;

  bool ready() const { return ready_; }
  pid_t pid() const { return pid_; }
  // SIGTERM (unless it already ended) and its exit status as Run() reports one; -1 on timeout.
  int Stop();
  // Waits up to timeoutSec for it to exit by itself; its status, or -1 when still running.
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
