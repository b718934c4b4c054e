// vornnetd: serves com.vornlink.net and runs the network modules. One instance at a time, kept by
// /var/run/vornnetd.pid. SIGTERM or SIGINT ends the loop; the modules are then removed one by one
// and the daemon exits 0.
//
// Exit status: 0 after SIGTERM/SIGINT, 1 when another instance runs or the pid file cannot be
// made, 2 when the bus name cannot be owned, 3 when the bus connection was lost.
#include <glib-unix.h>
#include <signal.h>
#include <syslog.h>
#include <unistd.h>

#include <cstdio>

#include "vornwireless/dbus_net/net_server.h"
#include "vornwireless/network/module_manager.h"
#include "vornwireless/utils/create_pid_file.h"

// Our log lines carry the daemon's source file and line, as the library's do.
#define NETD_LOG(priority, fmt, ...) \
  ::syslog((priority), "vornnetd/main.cpp:%d " fmt, __LINE__, ##__VA_ARGS__)

namespace {

const char kPidFile[] = "/var/run/vornnetd.pid";

using vornnetwork::network::module::MODULE_TYPE;
using vornnetwork::network::module::ModuleManager;

gboolean OnStopSignal(gpointer server) {
  NETD_LOG(LOG_INFO, "Stopping on signal");
  static_cast<vornnetwork::dbus::NetServer*>(server)->QuitLoop();
  return G_SOURCE_CONTINUE;
}

// There is no stop-all in the manager: the modules go one at a time. The two with threads that
// send requests to other modules go first (the link watcher, then the IPv6 watch, whose thread
// calls the route module), so that no request reaches a module that is already gone.
void RemoveModules(ModuleManager& manager) {
  using namespace vornnetwork::network::module;
  static MODULE_TYPE const order[] = {MODULE_NETLINK, MODULE_IPV6, MODULE_DEVICELIST, MODULE_ROUTE,
                                      MODULE_TEST};
  for (MODULE_TYPE t : order) {
    if (!manager.IsModuleExist(t)) continue;
    if (manager.RemoveModule(t)) NETD_LOG(LOG_ERR, "Failed to remove module [%d]", t);
  }
}

}  // namespace

int main(int argc, char** argv) {
  if (argc > 1) {
    std::fprintf(stderr, "usage: %s\n  (no options: all settings are the appliance's files)\n",
                 argv[0]);
    return 2;
  }
  openlog("vornnetd", LOG_PID, LOG_DAEMON);

  int pidFd = vornwireless::utils::CreatePidFile(kPidFile);
  if (pidFd < 0) {
    NETD_LOG(LOG_ERR, "Failed to create pid file [%s]: another vornnetd runs?", kPidFile);
    std::fprintf(stderr, "vornnetd: cannot lock %s: another instance is running\n", kPidFile);
    return 1;
  }

  int status = 0;
  {
    vornnetwork::dbus::NetServer server;
    if (!server.IsInitialized()) {
      NETD_LOG(LOG_ERR, "Failed to initialize the D-Bus server");
      std::fprintf(stderr, "vornnetd: cannot serve com.vornlink.net on the session bus\n");
      unlink(kPidFile);
      return 2;
    }

    // A stop signal that arrives while the modules start (they run commands and may wait for
    // a file lock) is kept and handled as soon as the loop runs.
    guint term = g_unix_signal_add(SIGTERM, OnStopSignal, &server);
    guint intr = g_unix_signal_add(SIGINT, OnStopSignal, &server);
    ModuleManager& manager = ModuleManager::GetInstance();
    if (!manager.Initialize()) NETD_LOG(LOG_ERR, "Failed to initialize network modules");
    if (!manager.Start()) NETD_LOG(LOG_ERR, "Failed to start network modules");

    if (!server.StartLoop()) {
      NETD_LOG(LOG_ERR, "Lost the bus connection");
      status = 3;
    }
    g_source_remove(term);
    g_source_remove(intr);

    RemoveModules(manager);
  }
  unlink(kPidFile);
  close(pidFd);
  return status;
}
