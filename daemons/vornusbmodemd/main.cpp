// vornusbmodemd: the USB modem daemon. Serves com.vornlink.usbmodem and polls for dongles every
// 10 seconds. SIGTERM or SIGINT end the main loop; a running dialler is left alone (its pid file
// /tmp/usbmodem.pid.<id> leads back to it).
#include <glib-unix.h>
#include <signal.h>
#include <syslog.h>
#include <unistd.h>

#include <cstdio>

#include "vornplatform/log.h"
#include "vornwireless/dbus_usbmodem/usbmodem_server.h"
#include "vornwireless/utils/create_pid_file.h"

namespace {

const char kPidFile[] = "/var/run/vornusbmodemd.pid";

gboolean OnQuitSignal(gpointer server) {
  static_cast<vornwireless::dbus::USBModemServer*>(server)->QuitLoop();
  return G_SOURCE_CONTINUE;
}

}  // namespace

int main() {
  openlog("vornusbmodemd", LOG_PID, LOG_DAEMON);
  signal(SIGPIPE, SIG_IGN);

  int pidFd = vornwireless::utils::CreatePidFile(kPidFile);
  if (pidFd < 0) {
    syslog(LOG_ERR, "vornusbmodemd is already running or %s cannot be written", kPidFile);
    std::fprintf(stderr, "vornusbmodemd: already running or cannot write %s\n", kPidFile);
    return 1;
  }

  int status = 0;
  {
    vornwireless::dbus::USBModemServer server;
    if (!server.Initialize()) {
      syslog(LOG_ERR, "Failed to initialize the com.vornlink.usbmodem service");
      status = 2;
    } else {
      server.StartPollingTimer();
      guint term = g_unix_signal_add(SIGTERM, OnQuitSignal, &server);
      guint intr = g_unix_signal_add(SIGINT, OnQuitSignal, &server);
      if (!server.StartLoop()) status = 3;
      g_source_remove(term);
      g_source_remove(intr);
    }
  }
  unlink(kPidFile);
  close(pidFd);
  closelog();
  return status;
}
