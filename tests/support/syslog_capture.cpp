#include "support/syslog_capture.h"

#include <gtest/gtest.h>
#include <syslog.h>
#include <unistd.h>

#include <chrono>
#include <cstdlib>
#include <fstream>
#include <regex>
#include <sstream>
#include <thread>

namespace vorntest {
namespace {

int LevelFromName(const std::string& name) {
  static const char* names[] = {"emerg", "alert", "crit", "err", "warning", "notice", "info", "debug"};
  for (int i = 0; i < 8; ++i) {
    if (name == names[i]) return i;
  }
  return -1;
}

std::string EscapeRegex(const std::string& text) {
  static const std::string special = R"(\^$.|?*+()[]{}/)";
  std::string out;
  for (char c : text) {
    if (special.find(c) != std::string::npos) out += '\\';
    out += c;
  }
  return out;
}

}  // namespace

SyslogCapture::SyslogCapture() {
  const char* p = std::getenv("VORN_SYSLOG_FILE");
  path_ = p ? p : "";
  if (path_.empty()) {
    // Without the catcher every "nothing was logged" would pass unseen.
    ADD_FAILURE() << "no syslog catcher (VORN_SYSLOG_FILE is not set): run the test in the sandbox";
    return;
  }
  Sync();
  std::ifstream in(path_, std::ios::binary | std::ios::ate);
  offset_ = in ? static_cast<long>(in.tellg()) : 0;
}

bool SyslogCapture::Available() {
  const char* p = std::getenv("VORN_SYSLOG_FILE");
  return p && access(p, R_OK) == 0;
}

void SyslogCapture::Sync() {
  if (path_.empty()) return;
  static int counter = 0;
  std::ostringstream marker;
  marker << "vorn-syslog-sync-" << getpid() << "-" << ++counter;
  syslog(LOG_DEBUG, "%s", marker.str().c_str());
  const std::string want = marker.str();
  // Generous: the catcher shares a loaded machine. A marker that never comes fails the test,
  // since the lines read after it could then be incomplete.
  auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(30);
  while (std::chrono::steady_clock::now() < deadline) {
    std::ifstream in(path_, std::ios::binary);
    std::string line;
    while (std::getline(in, line)) {
      if (line.size() >= want.size() && line.compare(line.size() - want.size(), want.size(), want) == 0) {
        return;
      }
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(5));
  }
  ADD_FAILURE() << "the syslog marker " << want << " did not reach " << path_ << " within 30 s";
}

std::vector<SyslogLine> SyslogCapture::Lines() {
  if (path_.empty()) return lines_;
  Sync();
  std::ifstream in(path_, std::ios::binary);
  in.seekg(offset_);
  std::string line;
  while (std::getline(in, line)) {
    offset_ += static_cast<long>(line.size()) + 1;
    if (line.find("vorn-syslog-sync-") != std::string::npos) continue;
    SyslogLine entry;
    std::size_t sp = line.find(' ');
    if (sp == std::string::npos) continue;
    entry.level = LevelFromName(line.substr(0, sp));
    std::size_t colon = line.find(": ", sp + 1);
    if (colon == std::string::npos) {
      entry.message = line.substr(sp + 1);
    } else {
      entry.tag = line.substr(sp + 1, colon - sp - 1);
      entry.message = line.substr(colon + 2);
    }
    lines_.push_back(entry);
  }
  return lines_;
}

std::vector<SyslogLine> SyslogCapture::Matching(const std::string& regex) {
  std::regex re(regex);
  std::vector<SyslogLine> out;
  for (const auto& l : Lines()) {
    if (std::regex_search(l.message, re)) out.push_back(l);
  }
  return out;
}

bool SyslogCapture::HasOnce(int level, const std::string& regex) {
  auto m = Matching(regex);
  return m.size() == 1 && m[0].level == level;
}

void SyslogCapture::Clear() {
  Lines();
  lines_.clear();
}

std::string SyslogCapture::Dump() {
  std::ostringstream out;
  for (const auto& l : Lines()) out << "  [" << l.level << "] " << l.tag << ": " << l.message << "\n";
  return out.str();
}

std::string LogLine(const std::string& file, const std::string& message) {
  return "^" + EscapeRegex(file) + ":[0-9]+ " + EscapeRegex(message) + "$";
}

}  // namespace vorntest
