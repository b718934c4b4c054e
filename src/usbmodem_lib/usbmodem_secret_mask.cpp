#include "vornwireless/usbmodem_lib/usbmodem_secret_mask.h"

#include <cctype>
#include <vector>

namespace vornwireless {
namespace usbmodem_lib {

namespace {

std::string Upper(std::string text) {
  for (char& c : text) c = static_cast<char>(std::toupper(static_cast<unsigned char>(c)));
  return text;
}

bool StartsWith(std::string const& text, const char* prefix) {
  return text.compare(0, std::string(prefix).size(), prefix) == 0;
}

// The arguments after '=', split at commas outside quotes.
std::vector<std::string> SplitArguments(std::string const& text) {
  std::vector<std::string> args(1);
  bool quoted = false;
  for (char c : text) {
    if (c == '"') quoted = !quoted;
    if (c == ',' && !quoted) {
      args.emplace_back();
    } else {
      args.back() += c;
    }
  }
  return args;
}

std::string Masked(std::string const& arg) {
  const bool quoted = arg.size() >= 1 && arg.front() == '"';
  return quoted ? std::string("\"****\"") : std::string("****");
}

}  // namespace

std::string MaskSecretsInCommand(std::string const& cmd) {
  const std::string upper = Upper(cmd);
  const bool pinEntry =
      StartsWith(upper, "AT+CPIN=") || StartsWith(upper, "AT^CPIN=") ||
      StartsWith(upper, "AT$QCPIN=");
  const bool facility = StartsWith(upper, "AT+CLCK=") || StartsWith(upper, "AT+CPWD=");
  if (!pinEntry && !facility) return cmd;
  const std::string::size_type eq = cmd.find('=');
  std::vector<std::string> args = SplitArguments(cmd.substr(eq + 1));
  std::string out = cmd.substr(0, eq + 1);
  for (std::size_t i = 0; i < args.size(); ++i) {
    std::string const& a = args[i];
    const bool secret = pinEntry ? !a.empty()
                                 : (i > 0 && !a.empty() && a.front() == '"');
    out += (i > 0 ? "," : "") + (secret ? Masked(a) : a);
  }
  return out;
}

}  // namespace usbmodem_lib
}  // namespace vornwireless
