// Load and save of 64 adapter records and the JSON round trip of one full record. Prints
// figures, asserts nothing. Needs the sandbox's radio with wlan0 .. wlan63 (see ./run).
#include <time.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <sstream>
#include <string>
#include <vector>

#include "vornwireless/wifi/adapter.h"
#include "vornwireless/wifi/adapter_data.h"
#include "vornwireless/wifi/utils.h"

using namespace vornwireless::wifi;

namespace {

double Now() {
  timespec ts;
  clock_gettime(CLOCK_MONOTONIC, &ts);
  return ts.tv_sec + ts.tv_nsec / 1e9;
}

double Median(std::vector<double> v) {
  std::sort(v.begin(), v.end());
  return v.empty() ? 0 : v[v.size() / 2];
}

}  // namespace

int main(int argc, char** argv) {
  int rounds = 20;
  int conversions = 20000;
  std::string golden;
  for (int i = 1; i + 1 < argc; i += 2) {
    if (std::strcmp(argv[i], "--rounds") == 0) rounds = std::atoi(argv[i + 1]);
    if (std::strcmp(argv[i], "--conversions") == 0) conversions = std::atoi(argv[i + 1]);
    if (std::strcmp(argv[i], "--golden") == 0) golden = argv[i + 1];
  }
  const int kAdapters = 64;
  Adapter::topology = WIFI_TOPOLOGY_ROUTER;

  std::vector<AdapterData*> data;
  double t0 = Now();
  for (int i = 0; i < kAdapters; ++i) {
    AdapterData* d = AdapterData::Create("wlan" + std::to_string(i));
    if (d == nullptr) {
      std::fprintf(stderr, "cannot load wlan%d (is the radio installed?)\n", i);
      return 1;
    }
    data.push_back(d);
  }
  double first = Now() - t0;
  // Give every record its full weight: passwords, a schedule, rules.
  for (AdapterData* d : data) {
    AdapterConfig c = d->GetConfig();
    c.password = "correct horse battery staple";
    c.guest_password = "guest password";
    c.schedule_enabled = true;
    for (unsigned h = 0; h < kScheduleCells; ++h) c.schedule[h] = h % 24 >= 7;
    AdapterConfig::MacFilterRule r;
    r.enabled = true;
    r.mac = std::string("02:00:00:00:02:01");
    r.desc = "laptop";
    c.mac_filter_list.assign(4, r);
    d->SetConfig(c);
  }

  std::vector<double> saves, loads;
  for (int r = 0; r < rounds; ++r) {
    t0 = Now();
    for (AdapterData* d : data) d->Write();
    saves.push_back(Now() - t0);
    t0 = Now();
    for (AdapterData* d : data) {
      if (d->Read() != 0) {
        std::fprintf(stderr, "read failed\n");
        return 1;
      }
    }
    loads.push_back(Now() - t0);
  }
  for (AdapterData* d : data) AdapterData::Delete(d);

  std::printf("adapters: %d, rounds: %d\n", kAdapters, rounds);
  std::printf("first load (factory defaults, iwconfig each): %8.1f ms for 64, %7.2f ms/record\n",
              first * 1e3, first * 1e3 / kAdapters);
  std::printf("save of 64 stored records (median):           %8.1f ms,       %7.2f ms/record\n",
              Median(saves) * 1e3, Median(saves) * 1e3 / kAdapters);
  std::printf("load of 64 stored records (median):           %8.1f ms,       %7.2f ms/record\n",
              Median(loads) * 1e3, Median(loads) * 1e3 / kAdapters);

  std::ifstream in(golden);
  std::stringstream text;
  text << in.rdbuf();
  const std::string json = text.str();
  if (json.empty()) {
    std::fprintf(stderr, "no golden record at %s\n", golden.c_str());
    return 1;
  }
  std::size_t bytes = 0;
  t0 = Now();
  for (int i = 0; i < conversions; ++i) {
    AdapterConfig c;
    if (utils::GetConfig(json, c) != 0) return 1;
    bytes += utils::ToStyledText(utils::GetJsonValue(c)).size();
  }
  double conv = Now() - t0;
  std::printf("JSON -> record -> JSON of one full record (%zu bytes): %.1f us/conversion over %d\n",
              json.size(), conv * 1e6 / conversions, conversions);
  return bytes > 0 ? 0 : 1;
}
