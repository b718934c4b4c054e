// vornnetd killed with SIGKILL at random moments of 200 gateway adds: every gateway file under
// /etc/iproute2/config/ stays whole. Each parses and holds exactly the list that some prefix of
// the adds produced (the priority list, the database, the resolver lines), whatever instant the
// daemon died at. The real vornnetd in the sandbox, gdbus as the client.
#include <dirent.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <iostream>
#include <map>
#include <memory>
#include <random>
#include <string>
#include <thread>
#include <vector>

#include "support/daemon_process.h"
#include "support/test_util.h"

namespace {

using vorntest::DaemonProcess;
using vorntest::ReadFile;
using vorntest::RunResult;

const std::string kDir = "/etc/iproute2/config/";
constexpr int kAdds = 200;

std::string Name(int i) {
  char buf[16];
  std::snprintf(buf, sizeof buf, "gw%03d", i);
  return buf;
}
std::string Gateway(int i) { return "10.9." + std::to_string(i / 200) + "." + std::to_string(i % 200 + 1); }
std::string Dns(int i) { return "10.8." + std::to_string(i / 200) + "." + std::to_string(i % 200 + 1); }

std::string AddJson(int i) {
  return "{\"type\": \"GTYPE_V4\", \"ifname\": \"" + Name(i) + "\", \"priority\": -1, \"gateway\": \"" +
         Gateway(i) + "\", \"dns\": \"" + Dns(i) + "\", \"class\": \"ethernet\"}";
}

RunResult Add(int i) {
  return vorntest::Run({"/usr/bin/gdbus", "call", "--session", "--dest", "com.vornlink.net",
                        "--object-path", "/", "--method", "com.vornlink.net.AddGatewayData",
                        AddJson(i)},
                       "", 30);
}

// A list state: the adds' numbers in priority order.
using State = std::vector<int>;

// The exact bytes each file holds for a list state. The priority file has one section per
// place, named by its number; section files keep their sections in string order ("0", "1", "10",
// "11", "2", ...).
std::string Priority(const State& st) {
  std::vector<std::string> keys;
  for (std::size_t j = 0; j < st.size(); ++j) keys.push_back(std::to_string(j));
  std::sort(keys.begin(), keys.end());
  std::string out;
  for (const std::string& k : keys) {
    const int i = st[std::stoul(k)];
    out += "[" + k + "]\n\tclass=ethernet\n\tdns=" + Dns(i) + "\n\tgateway=" + Gateway(i) +
           "\n\tifname=" + Name(i) + "\n\tslave=no\n";
  }
  return out;
}
std::string Resolver(const State& st) {
  std::string out;
  for (int i : st) out += "nameserver " + Dns(i) + "\n";
  return out;
}
// The database keeps every interface ever added, in name order: adds 0..n-1.
std::string Database(int n) {
  std::string out;
  for (int i = 0; i < n; ++i) {
    out += "[" + Name(i) + "]\n\tdns=" + Dns(i) + "\n\tgateway=" + Gateway(i) + "\n";
  }
  return out;
}

// The interface names of a text, in order (for failure messages).
std::string Summary(const std::string& text) {
  std::string out;
  for (std::size_t p = text.find("gw"); p != std::string::npos; p = text.find("gw", p + 5)) {
    out += text.substr(p + 2, 3) + " ";
  }
  return out;
}

// An add of a known interface with priority -1 moves it to the end; a new one is appended.
State Added(State st, int i) {
  st.erase(std::remove(st.begin(), st.end(), i), st.end());
  st.push_back(i);
  return st;
}

// What a starting daemon makes of a priority file: its sections in the string order of their
// numbers ("0", "1", "10", "11", "2", ...).
State Reloaded(const State& st) {
  std::vector<std::string> keys;
  for (std::size_t j = 0; j < st.size(); ++j) keys.push_back(std::to_string(j));
  std::sort(keys.begin(), keys.end());
  State out;
  for (const std::string& k : keys) out.push_back(st[std::stoul(k)]);
  return out;
}

// A section file: "[name]" lines, each followed by "key=value" lines (tab-indented), all ended by a
// line feed.
bool ParsesAsSectionFile(const std::string& text) {
  if (!text.empty() && text.back() != '\n') return false;
  std::size_t start = 0;
  bool inSection = false;
  while (start < text.size()) {
    const std::size_t end = text.find('\n', start);
    const std::string line = text.substr(start, end - start);
    start = end + 1;
    if (line.size() >= 3 && line.front() == '[' && line.back() == ']') {
      inSection = true;
    } else if (!inSection || line.find('=') == std::string::npos) {
      return false;
    }
  }
  return true;
}

std::vector<std::string> FilesIn(const std::string& dir) {
  std::vector<std::string> names;
  DIR* d = opendir(dir.c_str());
  if (d == nullptr) return names;
  while (struct dirent* e = readdir(d)) {
    const std::string n = e->d_name;
    if (n != "." && n != "..") names.push_back(n);
  }
  closedir(d);
  return names;
}

class CrashFiles : public testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(vorntest::InSandbox());
    vorntest::Run({"/bin/rm", "-rf", kDir});
    // One veth uplink per add, up: a starting daemon keeps only interfaces that are there and up.
    std::string batch;
    for (int i = 0; i < kAdds; ++i) {
      const std::string peer = "pg" + Name(i).substr(2);
      batch += "link add " + Name(i) + " type veth peer name " + peer + "\nlink set " + Name(i) +
               " up\nlink set " + peer + " up\n";
    }
    // The first uplink reaches its gateway, so each add's route refresh stops at it.
    batch += "addr add 10.9.0.250/24 dev gw000\n";
    ASSERT_EQ(0, vorntest::Run({"/usr/sbin/ip", "-batch", "-"}, batch).status);
    Start();
  }
  void TearDown() override {
    if (daemon_) daemon_->Stop(SIGTERM);
  }
  void Start() {
    daemon_ = std::make_unique<DaemonProcess>(std::vector<std::string>{VORNNETD},
                                              "com.vornlink.net");
    ASSERT_TRUE(daemon_->ready());
  }

  // Every file of the directory parses and holds a list state the adds went through (history_),
  // the database the interfaces of adds 0..n-1 for some n <= upTo. Temporary files of a write the
  // kill cut short are counted, not parsed (a reader never opens them). The priority file's state
  // is returned (-1 when it holds none).
  int CheckFiles(int upTo, const std::string& when) {
    int priorityState = -1;
    for (const std::string& f : FilesIn(kDir)) {
      const std::string text = ReadFile(kDir + f);
      if (f.find(".tmp.") != std::string::npos) {
        ++leftovers_;
        continue;
      }
      bool ok = false;
      if (f == "gateway_v4_priority" || f == "resolv4.conf") {
        for (std::size_t h = 0; h < history_.size() && !ok; ++h) {
          ok = text == (f == "resolv4.conf" ? Resolver(history_[h]) : Priority(history_[h]));
          if (ok && f == "gateway_v4_priority") priorityState = static_cast<int>(h);
        }
      } else if (f == "gateway_database") {
        for (int n = 0; n <= upTo && !ok; ++n) ok = text == Database(n);
      } else {
        // The policy tables' files the daemon writes at its start.
        EXPECT_TRUE(ParsesAsSectionFile(text)) << when << ": " << f << ":\n" << text;
        continue;
      }
      EXPECT_TRUE(ok) << when << ": " << f << " holds no list the adds went through ("
                      << text.size() << " bytes): " << Summary(text) << "; last states: "
                      << Summary(Priority(history_.back())) << " / "
                      << Summary(Priority(history_[history_.size() > 1 ? history_.size() - 2 : 0]));
    }
    if (!vorntest::Exists(kDir + "gateway_v4_priority")) priorityState = 0;  // none written yet
    return priorityState;
  }

  std::unique_ptr<DaemonProcess> daemon_;
  std::vector<State> history_{State{}};
  int leftovers_ = 0;
};

}  // namespace

TEST_F(CrashFiles, SigkillDuringGatewayAddsLeavesEveryFileAWholeListOfTheAdds) {
  std::mt19937 rng(20261125);
  std::uniform_int_distribution<int> killEvery(0, 9);  // about one add in ten
  std::uniform_int_distribution<int> killAfterUs(0, 60000);
  int kills = 0;
  State state;  // what the running daemon holds
  for (int i = 0; i < kAdds; ++i) {
    if (killEvery(rng) == 0) {
      const int delay = killAfterUs(rng);
      const pid_t pid = daemon_->pid();
      std::thread killer([pid, delay] {
        std::this_thread::sleep_for(std::chrono::microseconds(delay));
        kill(pid, SIGKILL);
      });
      history_.push_back(Added(state, i));  // the add may or may not get through
      Add(i);
      killer.join();
      EXPECT_EQ(128 + SIGKILL, daemon_->Stop(SIGKILL));
      ++kills;
      const int h = CheckFiles(i + 1, "after the kill in add " + std::to_string(i));
      if (HasFailure()) break;
      ASSERT_GE(h, 0);
      state = Reloaded(history_[static_cast<std::size_t>(h)]);
      history_.push_back(state);
      Start();
      if (HasFailure()) break;
    }
    // The add is (re)sent until the daemon answers it.
    RunResult r = Add(i);
    ASSERT_EQ(0, r.status) << "add " << i << ": " << r.err;
    state = Added(state, i);
    history_.push_back(state);
  }
  // Every add was answered: each file holds the daemon's whole list.
  EXPECT_EQ(Priority(state), ReadFile(kDir + "gateway_v4_priority"));
  EXPECT_EQ(Database(kAdds), ReadFile(kDir + "gateway_database"));
  CheckFiles(kAdds, "at the end");
  EXPECT_EQ(static_cast<std::size_t>(kAdds), state.size());
  std::cout << "[crash] " << kills << " SIGKILLs in " << kAdds << " adds; " << leftovers_
            << " temporary files left by cut writes" << std::endl;
  EXPECT_GE(kills, 5);
}
