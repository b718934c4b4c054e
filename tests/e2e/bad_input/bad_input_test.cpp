// Bad input over the real bus. Every method of com.vornlink.net and com.vornlink.usbmodem is
// called CALLS times (default 10,000; VORN_BAD_INPUT_CALLS overrides it) on the sandbox's
// dbus-daemon with arguments grown from the fuzz seeds and kept inputs (fuzz/corpus,
// fuzz/regressions) by a fixed-seed mutator. Every call must be answered (a reply or a D-Bus
// error, never a time-out or a lost connection), the daemon keeps its pid, text that is no JSON
// leaves every file of the daemon byte for byte as it was, every file still parses afterwards,
// and at the end the daemon answers Ping and a real request.
#include <gio/gio.h>
#include <gtest/gtest.h>
#include <json/json.h>
#include <signal.h>

#include <algorithm>
#include <chrono>
#include <cstdlib>
#include <deque>
#include <filesystem>
#include <fstream>
#include <functional>
#include <iterator>
#include <map>
#include <random>
#include <string>
#include <vector>

#include "support/daemon_process.h"
#include "vornplatform/file.h"
#include "vornplatform/szhash.h"

namespace {

namespace fs = std::filesystem;

std::string Source() { return std::getenv("VORN_SOURCE_DIR"); }

int CallsPerMethod() {
  const char* n = std::getenv("VORN_BAD_INPUT_CALLS");
  return n != nullptr ? std::atoi(n) : 10000;
}

std::string ReadBytes(std::string const& path) {
  std::ifstream in(path, std::ios::binary);
  return std::string(std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>());
}

// The seeds and kept inputs of one family; at least one must exist.
std::vector<std::string> Seeds(std::string const& family) {
  std::vector<std::string> out;
  for (const char* kind : {"/fuzz/corpus/", "/fuzz/regressions/"}) {
    const std::string d = Source() + kind + family;
    if (!fs::is_directory(d)) continue;
    for (auto const& e : fs::directory_iterator(d)) out.push_back(ReadBytes(e.path()));
  }
  return out;
}

// Tokens the mutator splices in (the dictionaries' flavour: JSON punctuation, known names,
// format conversions, line ends, long runs).
const std::vector<std::string> kTokens = {
    "{", "}", "[", "]", "\"", ":", ",", "/*", "*/", "//", "\\u0000", "\\", "null", "true",
    "1e999", "-2147483649", "\"type\":", "\"ifname\":", "\"priority\":", "\"GTYPE_V4\"",
    "\"GTYPE_V6\"", "\"ALL\"", "%s", "%n", "\r", "\n", ";", "usbmodem1", "usbmodem0", "ppp0",
    "\xc3\xa9", "\xf0\x9f\x98\x80", std::string(300, 'A'), std::string(1100, '[')};

// A deterministic mutation of a seed: one to four byte flips, splices, cuts or repeats.
std::string Mutate(std::string s, std::mt19937& rng) {
  const int changes = 1 + static_cast<int>(rng() % 4);
  for (int c = 0; c < changes; ++c) {
    switch (rng() % 5) {
      case 0:
        if (!s.empty()) s[rng() % s.size()] = static_cast<char>(rng() & 0xff);
        break;
      case 1:
        s.insert(s.empty() ? 0 : rng() % (s.size() + 1), kTokens[rng() % kTokens.size()]);
        break;
      case 2:
        if (!s.empty()) {
          const size_t at = rng() % s.size();
          s.erase(at, 1 + rng() % (s.size() - at));
        }
        break;
      case 3:
        if (!s.empty() && s.size() < 4096) {
          const size_t at = rng() % s.size();
          s.insert(at, s.substr(at, 1 + rng() % 16));
        }
        break;
      default:
        break;  // the seed as it is
    }
  }
  return s;
}

// A D-Bus string: valid UTF-8 without NUL.
std::string BusString(std::string const& s) {
  gchar* valid = g_utf8_make_valid(s.data(), static_cast<gssize>(s.size()));
  std::string out(valid);
  g_free(valid);
  return out;
}

// The in strings of a call: the input split at NUL bytes.
std::vector<std::string> SplitArgs(std::string const& in, size_t count) {
  std::vector<std::string> args;
  size_t start = 0;
  for (size_t i = 0; i < count; ++i) {
    const size_t end = start < in.size() ? in.find('\0', start) : std::string::npos;
    if (start >= in.size()) {
      args.push_back("");
    } else {
      args.push_back(BusString(in.substr(start, end == std::string::npos ? std::string::npos
                                                                          : end - start)));
    }
    start = end == std::string::npos ? in.size() : end + 1;
  }
  return args;
}

bool IsJson(std::string const& text) {
  Json::Value v;
  Json::CharReaderBuilder b;
  std::string errs;
  std::unique_ptr<Json::CharReader> r(b.newCharReader());
  try {
    return r->parse(text.data(), text.data() + text.size(), &v, &errs);
  } catch (...) {
    return false;
  }
}

struct Method {
  std::string name;
  int strings;      // in strings
  bool boolean;     // a boolean after them (SetPIN's protection)
};

struct Tally {
  int calls = 0;
  int replies = 0;
  int errors = 0;
  int lost = 0;  // time-outs, lost connection, unknown method: the daemon did not answer
  std::map<std::string, int> lostKinds;
};

// Sends every call of `bodies` to one method, up to 32 at a time, and waits for all answers.
Tally CallAll(GDBusConnection* bus, const char* service, Method const& m,
              std::vector<GVariant*> const& bodies) {
  struct State {
    Tally tally;
    size_t next = 0;
    int pending = 0;
    GMainLoop* loop = nullptr;
    std::function<void()> pump;
  } st;
  st.loop = g_main_loop_new(nullptr, FALSE);
  auto done = [](GObject* source, GAsyncResult* res, gpointer data) {
    State* s = static_cast<State*>(data);
    GError* err = nullptr;
    GVariant* reply = g_dbus_connection_call_finish(G_DBUS_CONNECTION(source), res, &err);
    if (reply != nullptr) {
      ++s->tally.replies;
      g_variant_unref(reply);
    } else {
      const bool answered = g_dbus_error_is_remote_error(err) &&
                            !g_error_matches(err, G_DBUS_ERROR, G_DBUS_ERROR_NO_REPLY) &&
                            !g_error_matches(err, G_DBUS_ERROR, G_DBUS_ERROR_UNKNOWN_METHOD) &&
                            !g_error_matches(err, G_DBUS_ERROR, G_DBUS_ERROR_SERVICE_UNKNOWN);
      if (answered) {
        ++s->tally.errors;
      } else {
        ++s->tally.lost;
        ++s->tally.lostKinds[err->message];
      }
      g_error_free(err);
    }
    --s->pending;
    s->pump();
  };
  st.pump = [&]() {
    while (st.pending < 32 && st.next < bodies.size()) {
      ++st.pending;
      ++st.tally.calls;
      g_dbus_connection_call(bus, service, "/", service, m.name.c_str(), bodies[st.next++],
                             nullptr, G_DBUS_CALL_FLAGS_NONE, 25000, nullptr, done, &st);
    }
    if (st.pending == 0) g_main_loop_quit(st.loop);
  };
  st.pump();
  if (st.pending > 0) g_main_loop_run(st.loop);
  g_main_loop_unref(st.loop);
  return st.tally;
}

GVariant* Body(Method const& m, std::vector<std::string> const& args, bool flag) {
  GVariantBuilder b;
  g_variant_builder_init(&b, G_VARIANT_TYPE_TUPLE);
  for (int i = 0; i < m.strings; ++i) g_variant_builder_add(&b, "s", args[i].c_str());
  if (m.boolean) g_variant_builder_add(&b, "b", flag ? TRUE : FALSE);
  return g_variant_ref_sink(g_variant_builder_end(&b));
}

// Every regular file below the directories, with its bytes.
std::map<std::string, std::string> Snapshot(std::vector<std::string> const& dirs) {
  std::map<std::string, std::string> out;
  for (auto const& d : dirs) {
    if (!fs::is_directory(d)) continue;
    for (auto const& e : fs::recursive_directory_iterator(d)) {
      if (e.is_regular_file()) out[e.path()] = ReadBytes(e.path());
    }
  }
  return out;
}

// A file the daemons keep parses as a key file and as a section file.
void ExpectParses(std::string const& path) {
  PVLIBSZHASH keys = nullptr;
  EXPECT_GE(VLIBCFileGetKeys(path.c_str(), 0, &keys, nullptr), 0) << path;
  VLIBCSzHashFree(keys);
  PVLIBSZLIST sections = nullptr;
  EXPECT_GE(VLIBCFileEnumSection(path.c_str(), &sections), 0) << path;
  VLIBCSzListFree(sections);
}

GDBusConnection* Bus() {
  GError* err = nullptr;
  GDBusConnection* c = g_bus_get_sync(G_BUS_TYPE_SESSION, nullptr, &err);
  EXPECT_NE(c, nullptr) << (err ? err->message : "");
  if (err) g_error_free(err);
  return c;
}

bool Ping(GDBusConnection* bus, const char* service) {
  GError* err = nullptr;
  GVariant* r =
      g_dbus_connection_call_sync(bus, service, "/", "org.freedesktop.DBus.Peer", "Ping", nullptr,
                                  nullptr, G_DBUS_CALL_FLAGS_NONE, 10000, nullptr, &err);
  if (r) g_variant_unref(r);
  if (err) g_error_free(err);
  return r != nullptr;
}

// A real request and its reply text, or "<no reply>".
std::string Ask(GDBusConnection* bus, const char* service, const char* method, GVariant* body) {
  GError* err = nullptr;
  GVariant* r = g_dbus_connection_call_sync(bus, service, "/", service, method, body, nullptr,
                                            G_DBUS_CALL_FLAGS_NONE, 10000, nullptr, &err);
  std::string out = "<no reply>";
  if (r) {
    const gchar* s = nullptr;
    g_variant_get(r, "(&s)", &s);
    out = s;
    g_variant_unref(r);
  }
  if (err) g_error_free(err);
  return out;
}

void Report(const char* service, Method const& m, Tally const& t, double seconds) {
  std::printf("%-18s %-26s calls %6d replies %6d errors %6d unanswered %d  %.1f s\n", service,
              m.name.c_str(), t.calls, t.replies, t.errors, t.lost, seconds);
  for (auto const& k : t.lostKinds) {
    std::printf("    unanswered: %dx %s\n", k.second, k.first.c_str());
  }
}

// Runs every method `calls` times, then the no-JSON pass over the writers, checking as it goes.
void Storm(const char* service, std::vector<Method> const& methods,
           std::vector<std::string> const& seeds, std::vector<std::string> const& fileDirs,
           std::vector<std::string> const& jsonWriters, pid_t pid) {
  GDBusConnection* bus = Bus();
  ASSERT_NE(bus, nullptr);
  const int calls = CallsPerMethod();
  std::mt19937 rng(20261125);
  for (Method const& m : methods) {
    std::vector<GVariant*> bodies;
    for (int i = 0; i < calls; ++i) {
      const std::string in = Mutate(seeds[rng() % seeds.size()], rng);
      bodies.push_back(Body(m, SplitArgs(in, static_cast<size_t>(m.strings)), rng() & 1));
    }
    const auto t0 = std::chrono::steady_clock::now();
    Tally t = CallAll(bus, service, m, bodies);
    const double s = std::chrono::duration<double>(std::chrono::steady_clock::now() - t0).count();
    for (GVariant* b : bodies) g_variant_unref(b);
    Report(service, m, t, s);
    EXPECT_EQ(t.calls, calls) << m.name;
    EXPECT_EQ(t.replies + t.errors, calls) << m.name << ": every call is answered";
    EXPECT_EQ(t.lost, 0) << m.name;
    ASSERT_EQ(kill(pid, 0), 0) << service << " ended during " << m.name;
    ASSERT_EQ(vorntest::NameOwnerPid(service), pid) << service << " is no longer the owner";
  }
  // Text that is no JSON leaves every file as it was.
  const auto before = Snapshot(fileDirs);
  for (Method const& m : methods) {
    if (std::find(jsonWriters.begin(), jsonWriters.end(), m.name) == jsonWriters.end()) continue;
    std::vector<GVariant*> bodies;
    while (bodies.size() < 1000) {
      std::vector<std::string> args =
          SplitArgs(Mutate(seeds[rng() % seeds.size()], rng), static_cast<size_t>(m.strings));
      if (IsJson(args.back())) continue;
      bodies.push_back(Body(m, args, false));
    }
    Tally t = CallAll(bus, service, m, bodies);
    for (GVariant* b : bodies) g_variant_unref(b);
    EXPECT_EQ(t.lost, 0) << m.name;
    EXPECT_EQ(t.replies, 0) << m.name << ": text that is no JSON is refused";
  }
  const auto after = Snapshot(fileDirs);
  EXPECT_EQ(before.size(), after.size());
  for (auto const& f : before) {
    auto it = after.find(f.first);
    ASSERT_NE(it, after.end()) << f.first << " went away";
    EXPECT_TRUE(it->second == f.second) << f.first << " changed under text that is no JSON";
  }
  for (auto const& f : after) ExpectParses(f.first);
  EXPECT_TRUE(Ping(bus, service)) << service << " answers Ping";
  g_object_unref(bus);
}

TEST(BadInputOverTheBus, VornnetdAnswersEveryCallKeepsItsFilesAndLivesOn) {
  vorntest::DaemonProcess daemon({VORNNETD}, "com.vornlink.net");
  ASSERT_TRUE(daemon.ready());
  const std::vector<Method> methods = {
      {"GetDeviceListData", 1, false}, {"SetDeviceListData", 1, false},
      {"DelDeviceListData", 1, false}, {"GetGatewayListData", 1, false},
      {"AddGatewayData", 1, false},    {"DelGatewayData", 1, false},
      {"GetGatewayDataByInterface", 1, false}, {"SetSlaveData", 1, false},
      {"CopyGatewayData", 1, false},   {"RefreshGateway", 1, false},
      {"ResetIPv6Module", 1, false}};
  const auto seeds = Seeds("net");
  ASSERT_GE(seeds.size(), 10u);
  Storm("com.vornlink.net", methods, seeds, {"/etc/iproute2/config", "/usr/vorn/etc"},
        {"SetDeviceListData", "AddGatewayData", "DelGatewayData", "SetSlaveData",
         "CopyGatewayData", "RefreshGateway"},
        daemon.pid());
  // A real request is still served.
  GDBusConnection* bus = Bus();
  const std::string list = Ask(bus, "com.vornlink.net", "GetGatewayListData",
                               g_variant_new("(s)", "{\"type\": \"GTYPE_V4\"}"));
  g_object_unref(bus);
  Json::Value v;
  Json::Reader reader;
  EXPECT_TRUE(reader.parse(list, v) && v.isArray()) << list;  // the IPv4 gateway list
  EXPECT_EQ(daemon.Stop(), 0) << "vornnetd stops cleanly at SIGTERM";
}

TEST(BadInputOverTheBus, VornusbmodemdAnswersEveryCallKeepsItsFilesAndLivesOn) {
  vorntest::DaemonProcess daemon({VORNUSBMODEMD}, "com.vornlink.usbmodem");
  ASSERT_TRUE(daemon.ready());
  const std::vector<Method> methods = {
      {"Connect", 1, false},        {"Disconnect", 1, false},  {"GetUSBModemList", 0, false},
      {"GetUSBModem", 1, false},    {"GetSimInfo", 1, false},  {"UnlockSIM", 2, false},
      {"SetPIN", 3, true},          {"GetProfile", 1, false},  {"SetProfile", 2, false},
      {"UnlockPIN", 3, false},      {"GetUSBModemIfList", 0, false},
      {"GetDevIdByIfName", 1, false}};
  const auto seeds = Seeds("usbmodem");
  ASSERT_GE(seeds.size(), 5u);
  Storm("com.vornlink.usbmodem", methods, seeds, {"/var/lib/usbmodem", "/etc/ppp"}, {},
        daemon.pid());
  GDBusConnection* bus = Bus();
  EXPECT_EQ(Ask(bus, "com.vornlink.usbmodem", "GetUSBModemList", nullptr), "");
  g_object_unref(bus);
  EXPECT_EQ(daemon.Stop(), 0) << "vornusbmodemd stops cleanly at SIGTERM";
}

}  // namespace
