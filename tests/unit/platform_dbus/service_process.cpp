#include "service_process.h"

namespace vorntest {

namespace {
std::vector<std::string> ServiceArgv(const std::vector<std::string>& args) {
  std::vector<std::string> argv = {VORN_TEST_DBUS_SERVICE};
  argv.insert(argv.end(), args.begin(), args.end());
  return argv;
}
}  // namespace

ServiceProcess::ServiceProcess(const std::vector<std::string>& args, const std::string& name)
    : DaemonProcess(ServiceArgv(args), name) {}

}  // namespace vorntest
