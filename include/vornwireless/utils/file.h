#ifndef VORNWIRELESS_UTILS_FILE_H
#define VORNWIRELESS_UTILS_FILE_H

#include <sys/types.h>

#include <string>

namespace vornwireless {
namespace utils {

// Makes the directory (and its parents) with mode 0755 when it is missing; mode is not used.
// 0, or -1.
int CheckAndMakeDir(std::string const& path, mode_t mode);
// The whole file, empty when it cannot be read.
std::string FileToStr(std::string const& path);
// Copies the IPv6 keys of ifcfg-<from> to ifcfg-<to>. 0, or -1.
int CopyIfcfgIPv6Attrs(std::string const& from, std::string const& to);
// Writes value and a newline to a /proc (or any) file; true when the file could be opened.
bool SetProcEntry(std::string const& path, std::string const& value);

extern char const* const kIfcfgDir;  // "/etc/sysconfig/network-scripts/ifcfg-"

}  // namespace utils
}  // namespace vornwireless

#endif
