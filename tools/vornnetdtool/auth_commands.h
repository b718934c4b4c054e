// The 802.1X commands of vornnetdtool ("vornnetdtool 8021x ..."): JSON in, JSON out. They call
// the library's Auth8021X functions directly; the network daemon is not involved.
#ifndef VORNNETDTOOL_AUTH_COMMANDS_H
#define VORNNETDTOOL_AUTH_COMMANDS_H

#include <string>
#include <vector>

namespace vornnetdtool {

// The usage lines of the command, for the tool's --help.
extern const char kAuth8021XUsage[];

// args are the words after "8021x". Prints the JSON answer on stdout; 0 when the operation
// returned 0, 1 when it failed (the answer still holds its "result") or on a usage error
// (a message on stderr).
int Auth8021XCommand(const std::vector<std::string>& args);

}  // namespace vornnetdtool

#endif
