// vornnetdtool's routing commands: policy tables, their rules and the static table. They run
// PolicyRoute and StaticRoute in the tool's own process (only the table views ask vornnetd).
#ifndef VORNNETDTOOL_ROUTE_COMMANDS_H
#define VORNNETDTOOL_ROUTE_COMMANDS_H

#include <string>
#include <vector>

namespace vornnetdtool {

// The usage lines of these commands, for --help.
extern const char kRouteUsage[];
extern const char kRouteExamples[];

// True for "route", "--del-policy-route-rule" and "--disable-route-table".
bool IsRouteCommand(std::string const& command);

// Runs one command: exit status 0, or 1 with the error on stderr.
int RunRouteCommand(std::string const& command, std::vector<std::string> const& args);

}  // namespace vornnetdtool

#endif
