// bench_routing: inside the sandbox (veth eth0 10.200.1.2/24, peer 10.200.1.1).
//  1. Loads N routes (default 10,000) into static-table with one `ip -batch`, then times
//     StaticRoute::GetTableInfo over that table against `ip route show table static-table`
//     reading the same table (both read through a pipe, repeated, median and best).
//  2. Times StaticRoute::SetRules with M rules (default 1,000), then GetRules over them.
// Prints figures; asserts nothing.
#include <json/json.h>
#include <sys/resource.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <string>
#include <vector>

#include "vornwireless/network/route/policy_route.h"
#include "vornwireless/network/route/static_route.h"

using vornnetwork::network::IPTYPE_V4;
using vornnetwork::network::PolicyRoute;
using vornnetwork::network::StaticRoute;

namespace {

using Clock = std::chrono::steady_clock;

double Ms(Clock::time_point a, Clock::time_point b) {
  return std::chrono::duration<double, std::milli>(b - a).count();
}

// Runs a command line through the shell of the sandbox; its stdout lines are counted.
long CountLines(std::string const& command) {
  FILE* fp = popen(command.c_str(), "r");
  if (fp == nullptr) return -1;
  char line[1024];
  long lines = 0;
  while (std::fgets(line, sizeof line, fp) != nullptr) ++lines;
  pclose(fp);
  return lines;
}

void Report(char const* what, std::vector<double> times, long items) {
  std::sort(times.begin(), times.end());
  std::printf("  %-46s median %9.1f ms  best %9.1f ms  (%ld entries, %zu runs)\n", what,
              times[times.size() / 2], times.front(), items, times.size());
}

long MaxRssKb() {
  struct rusage usage;
  getrusage(RUSAGE_SELF, &usage);
  return usage.ru_maxrss;
}

}  // namespace

int main(int argc, char** argv) {
  int routes = 10000;
  int rules = 1000;
  int repeat = 5;
  for (int i = 1; i + 1 < argc; i += 2) {
    if (std::strcmp(argv[i], "--routes") == 0) routes = std::atoi(argv[i + 1]);
    if (std::strcmp(argv[i], "--rules") == 0) rules = std::atoi(argv[i + 1]);
    if (std::strcmp(argv[i], "--repeat") == 0) repeat = std::atoi(argv[i + 1]);
  }
  if (routes < 1 || routes > 65536 || rules < 0 || rules > 65536 || repeat < 1) {
    std::fprintf(stderr, "usage: bench_routing [--routes N<=65536] [--rules N] [--repeat N]\n");
    return 2;
  }

  PolicyRoute policy;
  if (policy.EnableTable(IPTYPE_V4, "static", "all") != 0) {
    std::fprintf(stderr, "cannot turn the static table on\n");
    return 1;
  }

  // 1. A table of `routes` /24 networks, loaded in one batch.
  std::string const batch = "/tmp/bench_routing.batch";
  {
    std::ofstream out(batch);
    for (int i = 0; i < routes; ++i) {
      out << "route add 10." << (i / 256) << "." << (i % 256)
          << ".0/24 via 10.200.1.1 dev eth0 table static-table\n";
    }
  }
  auto t0 = Clock::now();
  int rc = std::system(("/sbin/ip -batch " + batch).c_str());
  auto t1 = Clock::now();
  std::printf("routing tables, %d routes in static-table (loaded with ip -batch in %.1f ms, "
              "status %d)\n",
              routes, Ms(t0, t1), rc);

  std::vector<double> ours, ip;
  long ourCount = 0, ipCount = 0;
  for (int r = 0; r < repeat; ++r) {
    StaticRoute route;
    Json::Value info;
    auto a = Clock::now();
    route.GetTableInfo(IPTYPE_V4, "static-table", info);
    auto b = Clock::now();
    ours.push_back(Ms(a, b));
    ourCount = static_cast<long>(info["rules"].size());
    a = Clock::now();
    ipCount = CountLines("/sbin/ip -4 route show table static-table");
    b = Clock::now();
    ip.push_back(Ms(a, b));
  }
  Report("StaticRoute::GetTableInfo(static-table)", ours, ourCount);
  Report("ip route show table static-table (read)", ip, ipCount);
  std::printf("  max RSS of this process so far: %ld kB\n", MaxRssKb());
  if (std::system("/sbin/ip route flush table static-table") != 0) std::printf("  (flush failed)\n");

  // 2. SetRules with `rules` enabled rules (one /sbin/ip per rule), then GetRules (one listing
  //    of the table per enabled rule).
  Json::Value array(Json::arrayValue);
  for (int i = 0; i < rules; ++i) {
    Json::Value rule(Json::objectValue);
    rule["ifname"] = "eth0";
    rule["ip"] = "172." + std::to_string(16 + i / 65536 % 16) + "." +
                 std::to_string(i / 256 % 256) + "." + std::to_string(i % 256);
    rule["mask"] = "255.255.255.255";
    rule["gateway"] = "10.200.1.1";
    rule["enable"] = true;
    array.append(rule);
  }
  StaticRoute route;
  auto a = Clock::now();
  int setRc = route.SetRules(IPTYPE_V4, array);
  auto b = Clock::now();
  long inTable = CountLines("/sbin/ip -4 route show table static-table");
  std::printf("static rules, %d rules\n", rules);
  std::printf("  %-46s %9.1f ms  (%.2f ms per rule, result %d, %ld routes in the table)\n",
              "StaticRoute::SetRules", Ms(a, b), rules ? Ms(a, b) / rules : 0.0, setRc, inTable);
  Json::Value got(Json::arrayValue);
  a = Clock::now();
  int getRc = route.GetRules(IPTYPE_V4, got);
  b = Clock::now();
  long enabled = 0;
  for (auto const& r : got) enabled += r["active"].asString() == "Enabled" ? 1 : 0;
  std::printf("  %-46s %9.1f ms  (%.2f ms per rule, result %d, %ld active)\n",
              "StaticRoute::GetRules", Ms(a, b), rules ? Ms(a, b) / rules : 0.0, getRc, enabled);
  Json::Value empty(Json::arrayValue);
  route.SetRules(IPTYPE_V4, empty);
  std::printf("  max RSS of this process: %ld kB\n", MaxRssKb());
  return 0;
}
