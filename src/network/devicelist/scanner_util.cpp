// Small text helpers shared by the scanners.
#include "network/devicelist/scanner_util.h"

namespace vornnetwork {
namespace network {
namespace module {

std::vector<std::string> SplitBlanks(std::string const& text) {
  std::vector<std::string> words;
  std::string word;
  for (char c : text) {
    if (c == ' ' || c == '\t' || c == '\n' || c == '\r' || c == '\v' || c == '\f') {
      if (!word.empty()) words.push_back(word);
      word.clear();
    } else {
      word += c;
    }
  }
  if (!word.empty()) words.push_back(word);
  return words;
}

bool ReadLine(FILE* fp, std::string& line) {
  char buffer[1024];
  if (std::fgets(buffer, sizeof(buffer), fp) == nullptr) return false;
  line = buffer;
  return true;
}

}  // namespace module
}  // namespace network
}  // namespace vornnetwork
