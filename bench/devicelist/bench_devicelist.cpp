// Figures for the device list (see ./run): merge speed, "get all" latency with named
// neighbours, and the daemon's memory with a large list. Prints, asserts nothing.
#include <gio/gio.h>
#include <spawn.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <time.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <chrono>
#include <cstdio>
#include <fstream>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

#include "vornwireless/dbus_net/net_client.h"
#include "vornwireless/network/devicelist/device_list_module.h"

extern char** environ;

namespace {

using Clock = std::chrono::steady_clock;
using vornnetwork::network::module::DeviceListModule;

std::string Mac(int i) {
  char text[32];
  std::snprintf(text, sizeof(text), "02:00:%02x:%02x:%02x:%02x", (i >> 24) & 255, (i >> 16) & 255,
                (i >> 8) & 255, i & 255);
  return text;
}

std::string Ip(int i) { return "10.100." + std::to_string((i >> 8) & 255) + "." + std::to_string((i & 255)); }

Json::Value Clients(int n) {
  Json::Value list(Json::objectValue);
  Json::Value& a = list["ClientList"] = Json::Value(Json::arrayValue);
  for (int i = 0; i < n; ++i) {
    Json::Value d(Json::objectValue);
    d["macAddr"] = Mac(i);
    d["ipAddr"] = Ip(i + 1);
    d["netif"] = "br0";
    d["friendlyName"] = "host-" + std::to_string(i);
    a.append(d);
  }
  return list;
}

// CPU time of this thread in ms: the figure that a loaded machine does not inflate.
double CpuMs() {
  struct timespec ts;
  clock_gettime(CLOCK_THREAD_CPUTIME_ID, &ts);
  return ts.tv_sec * 1e3 + ts.tv_nsec / 1e6;
}

double Median(std::vector<double> v) {
  std::sort(v.begin(), v.end());
  return v[v.size() / 2];
}

void BenchMerge() {
  Json::Value clients = Clients(10000);
  std::vector<double> empty, full, emptyCpu, fullCpu;
  for (int round = 0; round < 9; ++round) {
    DeviceListModule module;
    auto t0 = Clock::now();
    double c0 = CpuMs();
    module.MergeList(clients, true);
    auto t1 = Clock::now();
    double c1 = CpuMs();
    module.MergeList(clients, true);
    auto t2 = Clock::now();
    double c2 = CpuMs();
    empty.push_back(std::chrono::duration<double, std::milli>(t1 - t0).count());
    full.push_back(std::chrono::duration<double, std::milli>(t2 - t1).count());
    emptyCpu.push_back(c1 - c0);
    fullCpu.push_back(c2 - c1);
  }
  std::printf("MergeList 10,000 clients into an empty list: wall median %.2f ms, CPU median %.2f ms "
              "(9 rounds)\n", Median(empty), Median(emptyCpu));
  std::printf("MergeList 10,000 clients into the full list:  wall median %.2f ms, CPU median %.2f ms "
              "(9 rounds)\n", Median(full), Median(fullCpu));
}

int Sh(std::string const& cmd) { return std::system(cmd.c_str()); }

bool HasOwner() {
  GDBusConnection* bus = g_bus_get_sync(G_BUS_TYPE_SESSION, nullptr, nullptr);
  if (bus == nullptr) return false;
  GVariant* r = g_dbus_connection_call_sync(bus, "org.freedesktop.DBus", "/org/freedesktop/DBus",
                                            "org.freedesktop.DBus", "NameHasOwner",
                                            g_variant_new("(s)", "com.vornlink.net"),
                                            G_VARIANT_TYPE("(b)"), G_DBUS_CALL_FLAGS_NONE, -1,
                                            nullptr, nullptr);
  g_object_unref(bus);
  if (!r) return false;
  gboolean owned = FALSE;
  g_variant_get(r, "(b)", &owned);
  g_variant_unref(r);
  return owned;
}

pid_t StartDaemon(std::string const& path) {
  char* argv[] = {const_cast<char*>(path.c_str()), nullptr};
  pid_t pid = -1;
  if (posix_spawn(&pid, argv[0], nullptr, nullptr, argv, environ) != 0) return -1;
  for (int i = 0; i < 1000 && !HasOwner(); ++i) std::this_thread::sleep_for(std::chrono::milliseconds(10));
  return pid;
}

void StopDaemon(pid_t pid) {
  kill(pid, SIGTERM);
  int status = 0;
  waitpid(pid, &status, 0);
  while (HasOwner()) std::this_thread::sleep_for(std::chrono::milliseconds(5));
}

// "Rss", "Pss" and "Private_Dirty" of a process in kB.
std::string Memory(pid_t pid) {
  std::ifstream in("/proc/" + std::to_string(pid) + "/smaps_rollup");
  std::string line;
  std::string out;
  while (std::getline(in, line)) {
    for (char const* key : {"Rss:", "Pss:", "Private_Dirty:"}) {
      if (line.compare(0, std::strlen(key), key) == 0) {
        std::istringstream words(line);
        std::string k, v;
        words >> k >> v;
        out += " " + k + " " + v + " kB";
      }
    }
  }
  return out;
}

void BenchGetAll(std::string const& daemon) {
  // 1,000 bridge neighbours, each with a lease line; the unit is a router.
  Sh("ip link add br0 type bridge && ip addr flush dev lan0 && ip link set lan0 master br0 && "
     "ip addr add 10.100.0.254/16 dev br0 && ip link set br0 up");
  std::ofstream batch("/tmp/neigh.batch");
  mkdir("/etc/dhcpd", 0755);
  std::ofstream leases("/etc/dhcpd/dhcpd.conf.leases");
  for (int i = 0; i < 1000; ++i) {
    batch << "neigh replace " << Ip(i + 1) << " lladdr " << Mac(i) << " dev br0 nud permanent\n";
    leases << "1767322800 " << Mac(i) << " " << Ip(i + 1) << " host-" << i << " *\n";
  }
  batch.close();
  leases.close();
  Sh("ip -batch /tmp/neigh.batch");
  std::ofstream("/etc/vorninfo.conf") << "net_topology=\"router\"\n";
  unlink(VORN_DEVICE_LIST_FILE);
  pid_t pid = StartDaemon(daemon);
  std::vector<double> times;
  size_t count = 0;
  {
    vornnetwork::dbus::NetClient client;
    for (int round = 0; round < 7; ++round) {
      Json::Value result;
      auto t0 = Clock::now();
      int rc = client.GetDeviceListData("all", result);
      times.push_back(std::chrono::duration<double, std::milli>(Clock::now() - t0).count());
      if (rc == 0) count = result["ClientList"].size();
    }
  }
  std::printf("get all, 1,000 neighbours named from the lease file: first %.1f ms, median of the "
              "next 6 %.1f ms (%zu devices in the reply)\n",
              times[0], Median(std::vector<double>(times.begin() + 1, times.end())), count);
  StopDaemon(pid);
  Sh("ip neigh flush dev br0 nud permanent");
}

void BenchMemory(std::string const& daemon) {
  unlink(VORN_DEVICE_LIST_FILE);
  std::ofstream("/etc/vorninfo.conf") << "net_topology=\"client\"\n";
  pid_t pid = StartDaemon(daemon);
  std::this_thread::sleep_for(std::chrono::milliseconds(300));
  std::printf("vornnetd with an empty list:        %s\n", Memory(pid).c_str());
  StopDaemon(pid);
  {
    DeviceListModule module;
    module.MergeList(Clients(10000), true);
    module.GetMergedList().WriteToFile(VORN_DEVICE_LIST_FILE);
  }
  struct stat st;
  stat(VORN_DEVICE_LIST_FILE, &st);
  pid = StartDaemon(daemon);
  std::this_thread::sleep_for(std::chrono::milliseconds(300));
  std::printf("vornnetd holding 10,000 clients:    %s  (file %lld kB)\n", Memory(pid).c_str(),
              static_cast<long long>(st.st_size / 1024));
  {
    vornnetwork::dbus::NetClient client;
    Json::Value result;
    client.GetDeviceListData("all", result);
  }
  std::printf("  after one get all:                %s\n", Memory(pid).c_str());
  StopDaemon(pid);
}

}  // namespace

int main(int argc, char** argv) {
  if (argc < 2) {
    std::fprintf(stderr, "usage: bench_devicelist VORNNETD (run through bench/devicelist/run)\n");
    return 2;
  }
  BenchMerge();
  if (std::string(argv[1]) == "--merge-only") return 0;
  BenchGetAll(argv[1]);
  BenchMemory(argv[1]);
  return 0;
}
