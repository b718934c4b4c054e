// Small text helpers shared by the scanners.
#ifndef VORN_SRC_NETWORK_DEVICELIST_SCANNER_UTIL_H
#define VORN_SRC_NETWORK_DEVICELIST_SCANNER_UTIL_H

#include <cstdio>
#include <string>
#include <vector>

namespace vornnetwork {
namespace network {
namespace module {

// The words of text, split at blanks (spaces, tabs, line ends); empty words are dropped.
std::vector<std::string> SplitBlanks(std::string const& text);

// Reads one line of at most 1023 characters (a longer line is read in pieces, as fgets does).
// False at the end of the stream.
bool ReadLine(FILE* fp, std::string& line);

}  // namespace module
}  // namespace network
}  // namespace vornnetwork

#endif
