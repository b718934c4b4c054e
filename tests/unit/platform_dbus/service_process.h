// Runs vorn-test-dbus-service on the test's bus for the length of a test.
#ifndef VORN_TESTS_UNIT_PLATFORM_DBUS_SERVICE_PROCESS_H
#define VORN_TESTS_UNIT_PLATFORM_DBUS_SERVICE_PROCESS_H

#include <string>
#include <vector>

#include "support/daemon_process.h"

namespace vorntest {

// The test service started with `args`, ready once it owns `name`.
class ServiceProcess : public DaemonProcess {
 public:
  explicit ServiceProcess(const std::vector<std::string>& args = {},
                          const std::string& name = "com.vornlink.test");
};

}  // namespace vorntest

#endif
