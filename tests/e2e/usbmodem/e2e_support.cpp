#include "e2e_support.h"

#include <fcntl.h>
#include <glib.h>
#include <json/json.h>
#include <poll.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <cstring>
#include <fstream>
#include <sstream>
#include <thread>

#include "support/test_util.h"

namespace usbmodem_e2e {

Child::~Child() { Stop(); }

bool Child::Start(const std::vector<std::string>& argv, const std::string& readyLine,
                  int timeoutSec) {
  int fds[2];
  if (pipe2(fds, O_CLOEXEC) != 0) return false;
  pid_t pid = fork();
  if (pid < 0) return false;
  if (pid == 0) {
    dup2(fds[1], 1);
    std::vector<char*> args;
    for (auto& a : argv) args.push_back(const_cast<char*>(a.c_str()));
    args.push_back(nullptr);
    execv(args[0], args.data());
    _exit(127);
  }
  close(fds[1]);
  pid_ = pid;
  if (readyLine.empty()) {
    close(fds[0]);
    return true;
  }
  std::string got;
  auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(timeoutSec);
  while (std::chrono::steady_clock::now() < deadline) {
    struct pollfd p = {fds[0], POLLIN, 0};
    if (poll(&p, 1, 100) > 0) {
      char buf[256];
      ssize_t n = read(fds[0], buf, sizeof buf);
      if (n <= 0) break;
      got.append(buf, static_cast<size_t>(n));
      if (got.find(readyLine) != std::string::npos) {
        close(fds[0]);
        return true;
      }
    }
  }
  close(fds[0]);
  return false;
}

bool Child::Alive() {
  if (pid_ <= 0) return false;
  int status;
  if (waitpid(pid_, &status, WNOHANG) == pid_) {
    pid_ = -1;
    return false;
  }
  return kill(pid_, 0) == 0;
}

int Child::Wait(int timeoutSec) {
  if (pid_ <= 0) return -1;
  for (int i = 0; i < timeoutSec * 20; ++i) {
    int status;
    if (waitpid(pid_, &status, WNOHANG) == pid_) {
      pid_ = -1;
      if (WIFEXITED(status)) return WEXITSTATUS(status);
      if (WIFSIGNALED(status)) return 128 + WTERMSIG(status);
      return -1;
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(50));
  }
  return -1;
}

void Child::Stop() {
  if (pid_ <= 0) return;
  kill(pid_, SIGTERM);
  for (int i = 0; i < 100; ++i) {
    int status;
    if (waitpid(pid_, &status, WNOHANG) == pid_) {
      pid_ = -1;
      return;
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(50));
  }
  kill(pid_, SIGKILL);
  int status;
  waitpid(pid_, &status, 0);
  pid_ = -1;
}

std::string Quote(const std::string& text) {
  GVariant* v = g_variant_ref_sink(g_variant_new_string(text.c_str()));
  gchar* printed = g_variant_print(v, FALSE);
  std::string out = printed;
  g_free(printed);
  g_variant_unref(v);
  return out;
}

Reply Call(const std::string& method, const std::vector<std::string>& stringArgs,
           const char* boolArg) {
  std::vector<std::string> argv = {"/usr/bin/gdbus", "call",   "--session", "--dest",
                                   "com.vornlink.usbmodem", "--object-path", "/", "--method",
                                   "com.vornlink.usbmodem." + method, "--timeout", "120"};
  for (auto& a : stringArgs) argv.push_back(Quote(a));
  if (boolArg) argv.push_back(boolArg);
  vorntest::RunResult r = vorntest::Run(argv, "", 150);
  Reply reply;
  reply.raw = r.out + r.err;
  if (r.status == 0) {
    reply.ok = true;
    GError* err = nullptr;
    GVariant* v = g_variant_parse(nullptr, r.out.c_str(), nullptr, nullptr, &err);
    if (v) {
      if (g_variant_n_children(v) > 0) {
        GVariant* c = g_variant_get_child_value(v, 0);
        if (g_variant_is_of_type(c, G_VARIANT_TYPE_STRING)) {
          reply.value = g_variant_get_string(c, nullptr);
        }
        g_variant_unref(c);
      }
      g_variant_unref(v);
    } else {
      g_clear_error(&err);
    }
    return reply;
  }
  const std::string marker = "GDBus.Error:";
  auto pos = r.err.find(marker);
  if (pos != std::string::npos) {
    std::string rest = r.err.substr(pos + marker.size());
    auto colon = rest.find(": ");
    reply.errorName = rest.substr(0, colon);
    if (colon != std::string::npos) {
      std::string msg = rest.substr(colon + 2);
      auto nl = msg.find('\n');
      reply.errorMessage = msg.substr(0, nl);
    }
  }
  return reply;
}

bool WaitFor(const std::function<bool()>& pred, double timeoutSec) {
  auto deadline = std::chrono::steady_clock::now() +
                  std::chrono::milliseconds(static_cast<long>(timeoutSec * 1000));
  while (true) {
    if (pred()) return true;
    if (std::chrono::steady_clock::now() >= deadline) return false;
    std::this_thread::sleep_for(std::chrono::milliseconds(100));
  }
}

std::string Scenario(int info, const std::string& extraJson) {
  Json::Value s(Json::objectValue);
  s["info"] = info;
  s["vendor"] = "12d1";
  s["product"] = "1001";
  s["prefix"] = "/dev/ttyUSB";
  Json::Value nodes(Json::arrayValue);
  Json::Value n0(Json::objectValue), n1(Json::objectValue);
  n0["name"] = "0";
  n1["name"] = "1";
  nodes.append(n0);
  nodes.append(n1);
  s["nodes"] = nodes;
  s["manufacturer"] = "huawei";
  s["model"] = "E1750";
  s["imsi"] = "262011234567890";
  s["operator"] = "Vodafone.de";
  s["signal"] = 20;
  Json::Value ctx(Json::objectValue);
  ctx["cid"] = 1;
  ctx["type"] = "IP";
  ctx["apn"] = "web.vodafone.de";
  s["contexts"].append(ctx);
  Json::Value sim(Json::objectValue);
  sim["state"] = "ready";
  sim["pin"] = "1234";
  sim["puk"] = "12345678";
  sim["lock"] = false;
  s["sim"] = sim;
  s["dial"].append("CONNECT");
  Json::Value extra;
  Json::Reader reader;
  if (reader.parse(extraJson, extra) && extra.isObject()) {
    for (auto const& name : extra.getMemberNames()) {
      if (name == "sim" && extra[name].isObject()) {
        for (auto const& k : extra[name].getMemberNames()) s["sim"][k] = extra[name][k];
      } else {
        s[name] = extra[name];
      }
    }
  }
  Json::FastWriter w;
  return w.write(s);
}

bool StartSim(Child& sim, const std::string& scenarioJson, int info) {
  std::string file = "/tmp/modem-sim-scenario." + std::to_string(info) + ".json";
  vorntest::WriteFile(file, scenarioJson);
  unlink(("/tmp/modem-sim." + std::to_string(info) + ".transcript.jsonl").c_str());
  return sim.Start({vorntest::SourceDir() + "/tests/fixtures/modem-sim", file, "--info",
                    std::to_string(info)},
                   "ready", 20);
}

std::vector<std::string> TranscriptCommands(int info) {
  std::vector<std::string> out;
  std::ifstream in("/tmp/modem-sim." + std::to_string(info) + ".transcript.jsonl");
  std::string line;
  Json::Reader reader;
  while (std::getline(in, line)) {
    Json::Value v;
    if (!reader.parse(line, v) || !v.isObject()) continue;
    if (v.get("kind", "").asString() == "cmd") out.push_back(v.get("cmd", "").asString());
  }
  return out;
}

bool StartDaemon(Child& daemon, const std::string& factor) {
  if (!daemon.Start({vorntest::SourceDir() + "/tests/sandbox/vorn-timewarp", factor, "--",
                     vorntest::BinaryDir() + "/daemons/vornusbmodemd/vornusbmodemd"})) {
    return false;
  }
  return WaitFor([] { return Call("GetUSBModemList").ok; }, 20);
}

bool InstallPeers() {
  static int done = -1;
  if (done < 0) {
    mkdir("/run/vorn", 0755);
    vorntest::RunResult r = vorntest::Run({vorntest::SourceDir() + "/tests/fixtures/install-modem-peers"});
    done = r.status == 0 ? 1 : 0;
  }
  return done == 1;
}

pid_t ReadPid(const std::string& path) {
  std::string text = vorntest::ReadFile(path);
  return static_cast<pid_t>(std::atoi(text.c_str()));
}

void CleanModemState() {
  for (int id : {0, 1, 2, 3, 4, 5, 9}) {
    std::string pidFile = "/tmp/usbmodem.pid." + std::to_string(id);
    pid_t pid = ReadPid(pidFile);
    if (pid > 1) {
      kill(pid, SIGTERM);
      WaitFor([pid] { return kill(pid, 0) != 0; }, 5);
      kill(pid, SIGKILL);
    }
    unlink(pidFile.c_str());
  }
  vorntest::Run({"/bin/sh", "-c",
                 "rm -f /var/lib/usbmodem/* /tmp/usbmodem.info* /etc/ppp/peers/wvdial.bak; "
                 "printf 'noauth\\nname wvdial\\nusepeerdns\\n' > /etc/ppp/peers/wvdial"});
}

std::vector<std::string> ProcCmdline(pid_t pid) {
  std::string raw = vorntest::ReadFile("/proc/" + std::to_string(pid) + "/cmdline");
  std::vector<std::string> out;
  std::string cur;
  for (char c : raw) {
    if (c == '\0') {
      out.push_back(cur);
      cur.clear();
    } else {
      cur += c;
    }
  }
  if (!cur.empty()) out.push_back(cur);
  return out;
}

bool ParseJson(const std::string& text, std::string const& key, std::string* value) {
  Json::Value v;
  Json::Reader reader;
  if (!reader.parse(text, v) || !v.isObject()) return false;
  if (!v.isMember(key)) return false;
  if (v[key].isString()) {
    *value = v[key].asString();
  } else {
    *value = v[key].toStyledString();
    while (!value->empty() && value->back() == '\n') value->pop_back();
  }
  return true;
}

}  // namespace usbmodem_e2e
