// A text-backed MAC address; the formal form is six two-digit hex groups joined by colons,
// in the case it came in.
#ifndef VORNWIRELESS_UTILS_MAC_ADDRESS_H
#define VORNWIRELESS_UTILS_MAC_ADDRESS_H

#include <istream>
#include <string>

namespace vornwireless {
namespace utils {

class MacAddress {
 public:
  MacAddress() = default;
  MacAddress(std::string const& text);  // NOLINT: formalises when it can
  MacAddress(MacAddress const& other) = default;
  MacAddress& operator=(MacAddress const& other) = default;
  MacAddress& operator=(std::string const& text);  // formalises when it can

  bool operator==(MacAddress const& other) const { return _text == other._text; }
  bool operator!=(MacAddress const& other) const { return _text != other._text; }

  std::string ToString() const { return _text; }
  char const* ToCString() const { return _text.c_str(); }
  operator std::string() const { return _text; }
  operator char const*() const { return _text.c_str(); }

  bool IsFormalized() const;    // 17 characters "xx:xx:xx:xx:xx:xx"
  bool IsFormalizable() const;  // exactly 12 hex digits
  // 0 when formal (made so when formalisable), else -1 with the text unchanged.
  int Formalize();

  // The last octet becomes (octet + n) % 255; lower-case result.
  MacAddress operator+(int n) const;

 private:
  std::string _text;
};

// Reads one word and assigns it.
std::istream& operator>>(std::istream& in, MacAddress& address);

}  // namespace utils
}  // namespace vornwireless

#endif
