// Reads what the sandbox's syslog catcher wrote, so a test can assert exact log lines and levels.
// The catcher (tests/sandbox/syslog-catcher) writes one line per message to $VORN_SYSLOG_FILE:
//   "<level> <tag>: <message>"   e.g. "err utils_test[12]: utils/config.cpp:88 Failed to ..."
// where <level> is one of emerg alert crit err warning notice info debug.
#ifndef VORN_TESTS_SUPPORT_SYSLOG_CAPTURE_H
#define VORN_TESTS_SUPPORT_SYSLOG_CAPTURE_H

#include <syslog.h>

#include <string>
#include <vector>

namespace vorntest {

struct SyslogLine {
  int level = -1;        // LOG_ERR etc.
  std::string tag;       // "ident[pid]" or "ident"
  std::string message;   // text after "<tag>: "
};

class SyslogCapture {
 public:
  // Starts capturing at the current end of the log: earlier lines are not seen.
  SyslogCapture();

  // Waits until every line logged before this call has reached the file (a marker is logged
  // and awaited), then returns the lines logged since construction (or the last Clear).
  std::vector<SyslogLine> Lines();
  // Lines whose message matches the ECMAScript regex (searched, not whole-matched).
  std::vector<SyslogLine> Matching(const std::string& regex);
  // True when exactly one line matches regex at that level.
  bool HasOnce(int level, const std::string& regex);
  // Forget what was seen so far.
  void Clear();
  // The lines as text, for failure messages.
  std::string Dump();

  static bool Available();  // the catcher's file is there (inside the sandbox)

 private:
  void Sync();
  std::string path_;
  long offset_ = 0;
  std::vector<SyslogLine> lines_;
};

// "utils/config.cpp:\d+ " + the escaped message: the exact form of our log lines.
std::string LogLine(const std::string& file, const std::string& message);

}  // namespace vorntest

#endif
