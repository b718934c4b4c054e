// bench_usbmodem: figures of vornusbmodemd on the current session bus with one simulated dongle
// (run it inside the sandbox through bench/usbmodem/run). Prints; asserts nothing.
//
//   bench_usbmodem --daemon PATH [--calls N]
//
// 1. round trips, N each (default 2000, after 200 warm-up calls), p50/p99/max:
//    org.freedesktop.DBus.Peer.Ping to the daemon (the bus floor: no handler runs) and
//    GetUSBModemList;
// 2. AT commands that one GetUSBModem sends on a ready SIM, read from the simulator's
//    transcript (the mean of 10 calls, and each call's commands);
// 3. the daemon's idle RSS (VmRSS, and Pss from /proc/PID/smaps_rollup).
#include <gio/gio.h>
#include <json/json.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstring>
#include <fstream>
#include <map>
#include <string>
#include <thread>
#include <vector>

#include "e2e/usbmodem/e2e_support.h"

namespace {

using Clock = std::chrono::steady_clock;

GDBusConnection* Bus() {
  static GDBusConnection* bus = g_bus_get_sync(G_BUS_TYPE_SESSION, nullptr, nullptr);
  return bus;
}

bool CallOnce(const char* iface, const char* method, GVariant* args) {
  GError* err = nullptr;
  GVariant* r = g_dbus_connection_call_sync(Bus(), "com.vornlink.usbmodem", "/", iface, method,
                                            args, nullptr, G_DBUS_CALL_FLAGS_NONE, -1, nullptr,
                                            &err);
  if (!r) {
    g_clear_error(&err);
    return false;
  }
  g_variant_unref(r);
  return true;
}

struct Stats {
  double p50, p99, max;
};

Stats Measure(int calls, const char* iface, const char* method) {
  for (int i = 0; i < 200; ++i) CallOnce(iface, method, nullptr);
  std::vector<double> us;
  us.reserve(static_cast<size_t>(calls));
  for (int i = 0; i < calls; ++i) {
    auto t0 = Clock::now();
    CallOnce(iface, method, nullptr);
    us.push_back(std::chrono::duration<double, std::micro>(Clock::now() - t0).count());
  }
  std::sort(us.begin(), us.end());
  auto at = [&](double q) { return us[static_cast<size_t>(q * (us.size() - 1))]; };
  return {at(0.50), at(0.99), us.back()};
}

std::string ProcField(pid_t pid, const std::string& file, const std::string& key) {
  std::ifstream in("/proc/" + std::to_string(pid) + "/" + file);
  std::string line;
  while (std::getline(in, line)) {
    if (line.compare(0, key.size(), key) == 0) {
      std::string v = line.substr(key.size());
      v.erase(0, v.find_first_not_of(" \t"));
      return v;
    }
  }
  return "?";
}

// Commands of the transcript logged between two wall-clock instants.
std::vector<std::string> CommandsBetween(double from, double to) {
  std::vector<std::string> out;
  std::ifstream in("/tmp/modem-sim.3.transcript.jsonl");
  std::string line;
  Json::Reader reader;
  while (std::getline(in, line)) {
    Json::Value v;
    if (!reader.parse(line, v) || !v.isObject()) continue;
    if (v.get("kind", "").asString() != "cmd") continue;
    double t = v.get("t", 0.0).asDouble();
    if (t >= from && t <= to) out.push_back(v.get("cmd", "").asString());
  }
  return out;
}

double Now() {
  return std::chrono::duration<double>(std::chrono::system_clock::now().time_since_epoch())
      .count();
}

}  // namespace

int main(int argc, char** argv) {
  std::string daemonPath;
  int calls = 2000;
  for (int i = 1; i + 1 < argc; ++i) {
    if (!std::strcmp(argv[i], "--daemon")) daemonPath = argv[i + 1];
    if (!std::strcmp(argv[i], "--calls")) calls = std::atoi(argv[i + 1]);
  }
  if (daemonPath.empty()) {
    std::fprintf(stderr, "usage: bench_usbmodem --daemon PATH [--calls N]\n");
    return 2;
  }
  usbmodem_e2e::CleanModemState();
  usbmodem_e2e::Child sim;
  // A ready SIM with PIN protection on: listed, not dialled, so the figures see no dial.
  if (!usbmodem_e2e::StartSim(sim,
                              usbmodem_e2e::Scenario(3, R"({"sim": {"state": "ready", "lock": true}})"),
                              3)) {
    std::fprintf(stderr, "simulator did not start\n");
    return 1;
  }
  usbmodem_e2e::Child daemon;
  if (!daemon.Start({daemonPath})) return 1;
  auto t0 = Clock::now();
  bool listed = usbmodem_e2e::WaitFor(
      [] { return usbmodem_e2e::Call("GetUSBModemList").value == "usbmodem3\n"; }, 30);
  double firstList = std::chrono::duration<double>(Clock::now() - t0).count();
  if (!listed) {
    std::fprintf(stderr, "usbmodem3 never listed\n");
    return 1;
  }
  std::printf("vornusbmodemd (no time seam), one simulated dongle (12d1, two nodes, ready SIM)\n");
  std::printf("  modem listed %.1f s after start (first tick at 10 s)\n", firstList);

  Stats ping = Measure(calls, "org.freedesktop.DBus.Peer", "Ping");
  Stats list = Measure(calls, "com.vornlink.usbmodem", "GetUSBModemList");
  std::printf("  round trips, %d calls each (us):   p50      p99      max\n", calls);
  std::printf("    Peer.Ping (bus floor)       %8.1f %8.1f %8.1f\n", ping.p50, ping.p99, ping.max);
  std::printf("    GetUSBModemList             %8.1f %8.1f %8.1f\n", list.p50, list.p99, list.max);

  std::map<std::string, int> histogram;
  int total = 0;
  const int kRounds = 10;
  double slowest = 0;
  for (int i = 0; i < kRounds; ++i) {
    double from = Now();
    auto c0 = Clock::now();
    GVariant* args = g_variant_new("(s)", "usbmodem3");
    CallOnce("com.vornlink.usbmodem", "GetUSBModem", args);
    slowest = std::max(slowest, std::chrono::duration<double, std::milli>(Clock::now() - c0).count());
    double to = Now();
    std::this_thread::sleep_for(std::chrono::milliseconds(300));  // the transcript catches up
    auto cmds = CommandsBetween(from, to);
    total += static_cast<int>(cmds.size());
    for (auto& c : cmds) histogram[c]++;
  }
  std::printf("  AT commands per GetUSBModem on a ready SIM: %.1f (mean of %d calls; slowest call "
              "%.0f ms)\n",
              static_cast<double>(total) / kRounds, kRounds, slowest);
  for (auto& [cmd, n] : histogram) std::printf("    %-14s x%d\n", cmd.c_str(), n);

  std::this_thread::sleep_for(std::chrono::seconds(2));
  std::printf("  idle daemon: VmRSS %s, Pss %s\n", ProcField(daemon.pid(), "status", "VmRSS:").c_str(),
              ProcField(daemon.pid(), "smaps_rollup", "Pss:").c_str());
  daemon.Stop();
  sim.Stop();
  usbmodem_e2e::CleanModemState();
  return 0;
}
