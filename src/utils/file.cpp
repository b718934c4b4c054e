#include "vornwireless/utils/file.h"

#include <sys/stat.h>

#include <cerrno>
#include <cstdio>
#include <fstream>
#include <sstream>

#include "vornplatform/file.h"
#include "vornplatform/log.h"

namespace vornwireless {
namespace utils {

char const* const kIfcfgDir = "/etc/sysconfig/network-scripts/ifcfg-";

namespace {

char const* const kIPv6Keys[] = {"IPV6INIT", "IPV6ADDR", "IPV6PREFIXLENG", "IPV6_DEFAULTGW",
                                 "IPV6DNS"};

// mkdir -p with mode 0755 for every level that is missing. 0, or the errno of the failure.
int MakeDirs(std::string const& path) {
  if (path.empty()) return ENOENT;
  std::string::size_type pos = 0;
  while (true) {
    pos = path.find('/', pos + 1);
    std::string part = path.substr(0, pos);
    if (!part.empty() && mkdir(part.c_str(), 0755) != 0 && errno != EEXIST) return errno;
    if (pos == std::string::npos) break;
  }
  return VLIBCFileCheckDir(path.c_str()) == 1 ? 0 : ENOTDIR;
}

}  // namespace

int CheckAndMakeDir(std::string const& path, mode_t /*mode*/) {
  if (VLIBCFileCheckDir(path.c_str()) == 0) {
    int err = MakeDirs(path);
    if (err != 0) {
      VORN_LOG(LOG_ERR, "Failed to mkdir [%s][%d]", path.c_str(), err);
      return -1;
    }
  }
  return 0;
}

std::string FileToStr(std::string const& path) {
  std::ifstream in(path, std::ios::binary);
  if (!in) return "";
  std::ostringstream out;
  out << in.rdbuf();
  return out.str();
}

int CopyIfcfgIPv6Attrs(std::string const& from, std::string const& to) {
  std::string src = kIfcfgDir + from;
  std::string dst = kIfcfgDir + to;
  for (char const* key : kIPv6Keys) {
    char value[1024] = "";
    if (VLIBCFileGetKeyValue(src.c_str(), key, value, sizeof value, 0) <= 0) continue;
    if (VLIBCFileSetKeyValue(dst.c_str(), key, value, "%s=%s\n") < 0) {
      VORN_LOG(LOG_ERR, "Failed to copy [%s=%s] from %s to %s", key, value, src.c_str(),
               dst.c_str());
      return -1;
    }
  }
  return 0;
}

bool SetProcEntry(std::string const& path, std::string const& value) {
  FILE* fp = fopen(path.c_str(), "w");
  if (!fp) return false;
  fprintf(fp, "%s\n", value.c_str());
  fclose(fp);
  return true;
}

}  // namespace utils
}  // namespace vornwireless
