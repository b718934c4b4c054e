// Small helpers shared by the tests: temporary directories, files, running programs.
#ifndef VORN_TESTS_SUPPORT_TEST_UTIL_H
#define VORN_TESTS_SUPPORT_TEST_UTIL_H

#include <string>
#include <vector>

namespace vorntest {

// A fresh directory under $TMPDIR (or /tmp), removed with its content by the destructor.
class TempDir {
 public:
  TempDir();
  ~TempDir();
  TempDir(const TempDir&) = delete;
  TempDir& operator=(const TempDir&) = delete;
  const std::string& path() const { return path_; }
  std::string operator/(const std::string& name) const { return path_ + "/" + name; }

 private:
  std::string path_;
};

std::string ReadFile(const std::string& path);           // "" when unreadable
// Writes all of data to fd (retrying short writes, EINTR, and EAGAIN on non-blocking fds).
bool WriteAll(int fd, const std::string& data);
// Writes content next to path and renames it over path, so a reader sees old or new, never half.
bool ReplaceFile(const std::string& path, const std::string& content, int mode = 0644);
bool WriteFile(const std::string& path, const std::string& content, int mode = 0644);
bool Exists(const std::string& path);
int FileMode(const std::string& path);                   // st_mode & 07777, -1 when missing

struct RunResult {
  int status = -1;     // exit status, or 128+signal, or -1 when it could not run
  std::string out;     // stdout
  std::string err;     // stderr
};
// Runs argv[0] with argv (no shell), optionally feeding stdin; waits at most timeoutSec.
RunResult Run(const std::vector<std::string>& argv, const std::string& input = "",
              int timeoutSec = 60);

// Inside the sandbox (root, private mount namespace): makes path a read-only bind mount of itself
// for the object's lifetime, so writes under it fail with EROFS even for root.
class ReadOnlyMount {
 public:
  explicit ReadOnlyMount(const std::string& path);
  ~ReadOnlyMount();
  ReadOnlyMount(const ReadOnlyMount&) = delete;
  ReadOnlyMount& operator=(const ReadOnlyMount&) = delete;
  bool ok() const { return ok_; }

 private:
  std::string path_;
  bool ok_ = false;
};

// Binds path onto itself, so that rename() or unlink() of it fails with EBUSY.
class SelfBindMount {
 public:
  explicit SelfBindMount(const std::string& path);
  ~SelfBindMount();
  SelfBindMount(const SelfBindMount&) = delete;
  SelfBindMount& operator=(const SelfBindMount&) = delete;
  bool ok() const { return ok_; }

 private:
  std::string path_;
  bool ok_ = false;
};

// /usr/sbin/ip with args (never through a shell).
RunResult Ip(std::vector<std::string> args);
// The same where the command must succeed: a failure is added to the running test, with the
// command line and ip's stderr.
void IpOk(const std::vector<std::string>& args);
// /usr/sbin/ip on the peer host of veth `ifname` (a sandbox started with --veth NAME); status -1
// and the reason in err outside one.
RunResult PeerIp(const std::string& ifname, std::vector<std::string> args);

// Inside a sandbox started with --veth NAME: sets the peer host's end of NAME up or down and waits
// (2 s at most) until the carrier of our end follows. False, with the reason in *why, otherwise.
bool SetPeerLink(const std::string& ifname, bool up, std::string* why = nullptr);

std::string SourceDir();  // $VORN_SOURCE_DIR (the project's source tree)
std::string BinaryDir();  // $VORN_BINARY_DIR (the build tree)
bool InSandbox();         // $VORN_SANDBOX is set: private namespaces, root

}  // namespace vorntest

#endif
