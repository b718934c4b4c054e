// bench_vornnetd: figures of the network daemon on the current session bus (run it inside the
// sandbox through bench/vornnetd/run). Prints; asserts nothing.
//
//   bench_vornnetd --daemon PATH [--calls N] [--starts N] [--label TEXT] [--gateways N]
//
// 1. start-up: time from posix_spawn of PATH to com.vornlink.net having an owner, --starts times;
// 2. memory: RSS, PSS and private dirty pages of the idle daemon (/proc/PID/smaps_rollup);
// 3. round trips, --calls each (default 20000, after 1000 warm-up calls), p50/p90/p99/max:
//    org.freedesktop.DBus.Peer.Ping to the daemon (answered by the bus library, no handler),
//    GetGatewayDataByInterface on the raw connection, and the same through NetClient (JSON
//    written and parsed on the client side too);
// 4. with --gateways N (the real daemon, in a sandbox with --veth eth0): N gateway entries are
//    added (eth0 first, so that each add's refresh of the default route succeeds at once), then
//    GetGatewayListData of the whole list is timed against Peer.Ping, interleaved.
#include <gio/gio.h>
#include <signal.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstring>
#include <fstream>
#include <functional>
#include <string>
#include <thread>
#include <vector>

#include "vornwireless/dbus_net/net_client.h"
#include "vornwireless/dbus_net/net_server.h"
#include "vornwireless/network/module_manager.h"

extern char** environ;

namespace {

using Clock = std::chrono::steady_clock;

const char kName[] = "com.vornlink.net";
const char kRequest[] = "{\"type\":\"GTYPE_V4\",\"ifname\":\"eth0\"}";

GDBusConnection* Bus() {
  static GDBusConnection* bus = g_bus_get_sync(G_BUS_TYPE_SESSION, nullptr, nullptr);
  return bus;
}

bool HasOwner() {
  GVariant* r = g_dbus_connection_call_sync(Bus(), "org.freedesktop.DBus", "/org/freedesktop/DBus",
                                            "org.freedesktop.DBus", "NameHasOwner",
                                            g_variant_new("(s)", kName), G_VARIANT_TYPE("(b)"),
                                            G_DBUS_CALL_FLAGS_NONE, -1, nullptr, nullptr);
  if (!r) return false;
  gboolean owned = FALSE;
  g_variant_get(r, "(b)", &owned);
  g_variant_unref(r);
  return owned;
}

pid_t Spawn(const std::string& path) {
  char* argv[] = {const_cast<char*>(path.c_str()), nullptr};
  pid_t pid = -1;
  if (posix_spawn(&pid, argv[0], nullptr, nullptr, argv, environ) != 0) return -1;
  return pid;
}

void StopDaemon(pid_t pid) {
  kill(pid, SIGTERM);
  int status = 0;
  waitpid(pid, &status, 0);
  while (HasOwner()) std::this_thread::sleep_for(std::chrono::milliseconds(1));
}

// Microseconds from spawn to the name owned; -1 when the daemon ended first or 10 s passed.
double StartOnce(const std::string& path, pid_t* pidOut) {
  auto t0 = Clock::now();
  pid_t pid = Spawn(path);
  if (pid < 0) return -1;
  while (!HasOwner()) {
    int status = 0;
    if (waitpid(pid, &status, WNOHANG) == pid) return -1;
    if (Clock::now() - t0 > std::chrono::seconds(10)) {
      kill(pid, SIGKILL);
      waitpid(pid, &status, 0);
      return -1;
    }
  }
  auto t1 = Clock::now();
  *pidOut = pid;
  return std::chrono::duration<double, std::micro>(t1 - t0).count();
}

struct Stats {
  double p50, p90, p99, max, mean;
};

Stats Summarise(std::vector<double> v) {
  std::sort(v.begin(), v.end());
  auto at = [&](double q) { return v[static_cast<size_t>(q * (v.size() - 1))]; };
  double sum = 0;
  for (double x : v) sum += x;
  return {at(0.50), at(0.90), at(0.99), v.back(), sum / v.size()};
}

void PrintStats(const char* what, const Stats& s, size_t n) {
  std::printf(
      "  %-44s n=%zu  p50 %7.1f us  p90 %7.1f us  p99 %7.1f us  max %8.1f us  mean %7.1f us\n",
      what, n, s.p50, s.p90, s.p99, s.max, s.mean);
}

bool RawCall(const char* iface, const char* method, GVariant* args) {
  GError* error = nullptr;
  GVariant* r = g_dbus_connection_call_sync(Bus(), kName, "/", iface, method, args, nullptr,
                                            G_DBUS_CALL_FLAGS_NONE, -1, nullptr, &error);
  if (r) {
    g_variant_unref(r);
    return true;
  }
  g_error_free(error);
  return false;
}

std::string Rollup(pid_t pid) {
  std::ifstream in("/proc/" + std::to_string(pid) + "/smaps_rollup");
  std::string line, out;
  while (std::getline(in, line)) {
    for (const char* key : {"Rss:", "Pss:", "Private_Dirty:", "Private_Clean:", "Shared_Clean:"}) {
      if (line.rfind(key, 0) == 0) out += "    " + line + "\n";
    }
  }
  return out;
}

// A module that answers GET_GATEWAY_DATA_BY_INTERFACE from memory, as the route module does.
class AnsweringModule : public vornnetwork::network::module::BaseModule {
 public:
  AnsweringModule() : BaseModule(vornnetwork::network::module::MODULE_ROUTE) {}
  int InitialModule() override { return 0; }
  int TerminateModule() override { return 0; }
  int StartModule() override { return 0; }
  int ProcessRequest(Json::Value const& request, Json::Value& response) override {
    response["priority"] = 0;
    response["gateway"] = "10.0.0.1";
    response["dns"] = "10.0.0.53";
    response["slave"] = false;
    response["class"] = "ethernet";
    response["exist"] = request["ifname"].asString() == "eth0";
    return 0;
  }
};
vornnetwork::network::module::BaseModule* CreateAnswering() { return new AnsweringModule(); }

// The handler alone, called in this process: parse, the module's answer, the styled reply.
void HandlerAlone(int calls) {
  using vornnetwork::network::module::ModuleManager;
  ModuleManager& manager = ModuleManager::GetInstance();
  manager.AddModule(ModuleManager::MODULE_INFO{vornnetwork::network::module::MODULE_ROUTE, true,
                                               CreateAnswering});
  auto* object = static_cast<vornnetwork::dbus::NetObject*>(
      g_object_new(vornnetwork::dbus::NetObjectGetType(), nullptr));
  std::vector<double> us;
  for (int i = -1000; i < calls; ++i) {
    char* reply = nullptr;
    GError* error = nullptr;
    auto t0 = Clock::now();
    vornnetwork::dbus::net_get_gateway_data_by_interface(object, kRequest, &reply, &error);
    double d = std::chrono::duration<double, std::micro>(Clock::now() - t0).count();
    g_free(reply);
    if (error) g_error_free(error);
    if (i >= 0) us.push_back(d);
  }
  g_object_unref(object);
  manager.RemoveModule(vornnetwork::network::module::MODULE_ROUTE);
  PrintStats("handler alone, in-process (module answering)", Summarise(us), us.size());
}

// Fills the IPv4 gateway list with n entries and times GetGatewayListData against the bus floor.
void GatewayList(int n, int calls) {
  vornnetwork::dbus::NetClient client;
  auto t0 = Clock::now();
  for (int i = 0; i < n; ++i) {
    Json::Value request(Json::objectValue);
    request["type"] = "GTYPE_V4";
    request["ifname"] = i == 0 ? std::string("eth0") : "uplink" + std::to_string(i);
    request["priority"] = -1;
    request["gateway"] = i == 0 ? std::string("10.200.1.1") : "10.77." + std::to_string(i) + ".1";
    request["dns"] = "10.77.0." + std::to_string(i % 250 + 1);
    request["class"] = "wan";
    if (client.AddGatewayData(request) != 0) std::printf("  add %d failed\n", i);
  }
  double addMs = std::chrono::duration<double, std::milli>(Clock::now() - t0).count();
  Json::Value request(Json::objectValue), result;
  request["type"] = "GTYPE_V4";
  client.GetGatewayListData(request, result);
  std::printf("gateway list: %d adds in %.1f ms (%.2f ms each, file writes and one route each); "
              "the list holds %u entries\n",
              n, addMs, addMs / n, result.size());
  std::string text = "{\"type\":\"GTYPE_V4\"}";
  auto ping = [] { return RawCall("org.freedesktop.DBus.Peer", "Ping", nullptr); };
  auto list = [&text] {
    return RawCall(kName, "GetGatewayListData", g_variant_new("(s)", text.c_str()));
  };
  std::function<bool()> kinds[] = {ping, list};
  std::vector<double> us[2];
  int failures = 0;
  for (int i = -200; i < calls; ++i) {
    for (int k = 0; k < 2; ++k) {
      auto c0 = Clock::now();
      bool ok = kinds[k]();
      double d = std::chrono::duration<double, std::micro>(Clock::now() - c0).count();
      if (i < 0) continue;
      if (!ok && k == 1) ++failures;
      us[k].push_back(d);
    }
  }
  Stats ps = Summarise(us[0]), ls = Summarise(us[1]);
  std::printf("round trips with %d entries (interleaved, %d each after 200 warm-up rounds):\n", n,
              calls);
  PrintStats("Peer.Ping (bus floor)", ps, us[0].size());
  PrintStats("GetGatewayListData (raw GDBus)", ls, us[1].size());
  std::printf("    %d of %d answered with an error\n", failures, calls);
  std::printf("GetGatewayListData over the bus floor at p50: %+.1f %%\n", (ls.p50 / ps.p50 - 1) * 100);
}

}  // namespace

int main(int argc, char** argv) {
  std::string daemon, label;
  int calls = 20000, starts = 20, gateways = 0;
  for (int i = 1; i + 1 < argc; i += 2) {
    if (!std::strcmp(argv[i], "--daemon")) daemon = argv[i + 1];
    if (!std::strcmp(argv[i], "--calls")) calls = std::atoi(argv[i + 1]);
    if (!std::strcmp(argv[i], "--starts")) starts = std::atoi(argv[i + 1]);
    if (!std::strcmp(argv[i], "--label")) label = argv[i + 1];
    if (!std::strcmp(argv[i], "--gateways")) gateways = std::atoi(argv[i + 1]);
  }
  if (daemon.empty() || !Bus()) {
    std::fprintf(stderr, "usage: bench_vornnetd --daemon PATH (on a session bus)\n");
    return 2;
  }
  std::printf("== %s (%s)\n", label.empty() ? daemon.c_str() : label.c_str(), daemon.c_str());

  std::vector<double> startUs;
  pid_t pid = -1;
  for (int i = 0; i < starts; ++i) {
    double us = StartOnce(daemon, &pid);
    if (us < 0) {
      std::fprintf(stderr, "the daemon did not come up\n");
      return 1;
    }
    startUs.push_back(us);
    if (i + 1 < starts) StopDaemon(pid);
  }
  Stats s = Summarise(startUs);
  std::printf(
      "start-up, exec to bus name owned (%d starts): median %.1f ms, min %.1f ms, max %.1f ms\n",
      starts, s.p50 / 1000, *std::min_element(startUs.begin(), startUs.end()) / 1000, s.max / 1000);

  std::this_thread::sleep_for(std::chrono::seconds(1));
  std::printf("idle memory of pid %d (smaps_rollup):\n%s", pid, Rollup(pid).c_str());

  // The three kinds of call are interleaved, so that the load of the machine weighs on each alike.
  std::printf("round trips (interleaved, %d each after 1000 warm-up rounds):\n", calls);
  vornnetwork::dbus::NetClient client;
  auto ping = [] { return RawCall("org.freedesktop.DBus.Peer", "Ping", nullptr); };
  auto raw = [] {
    return RawCall(kName, "GetGatewayDataByInterface", g_variant_new("(s)", kRequest));
  };
  auto typed = [&client] {
    Json::Value request(Json::objectValue), result;
    request["type"] = "GTYPE_V4";
    request["ifname"] = "eth0";
    return client.GetGatewayDataByInterface(request, result) == 0;
  };
  std::function<bool()> kinds[] = {ping, raw, typed};
  std::vector<double> us[3];
  int failures[3] = {0, 0, 0};
  for (int i = -1000; i < calls; ++i) {
    for (int k = 0; k < 3; ++k) {
      auto t0 = Clock::now();
      bool ok = kinds[k]();
      double d = std::chrono::duration<double, std::micro>(Clock::now() - t0).count();
      if (i < 0) continue;
      if (!ok) ++failures[k];
      us[k].push_back(d);
    }
  }
  Stats ps = Summarise(us[0]), rs = Summarise(us[1]), ts = Summarise(us[2]);
  PrintStats("Peer.Ping (bus floor)", ps, us[0].size());
  PrintStats("GetGatewayDataByInterface (raw GDBus)", rs, us[1].size());
  std::printf("    %d of %d answered with an error\n", failures[1], calls);
  PrintStats("GetGatewayDataByInterface (NetClient)", ts, us[2].size());
  std::printf("    %d of %d answered with an error\n", failures[2], calls);
  std::printf("handler cost over the bus floor at p50: raw %+.1f %%, NetClient %+.1f %%\n",
              (rs.p50 / ps.p50 - 1) * 100, (ts.p50 / ps.p50 - 1) * 100);
  HandlerAlone(calls);
  std::printf("idle memory after the calls:\n%s", Rollup(pid).c_str());
  if (gateways > 0) {
    GatewayList(gateways, calls / 4);
    std::printf("memory with the gateway list:\n%s", Rollup(pid).c_str());
  }

  StopDaemon(pid);
  return 0;
}
