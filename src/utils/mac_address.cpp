// MAC address values: formal form, formalising and the next address.
#include "vornwireless/utils/mac_address.h"

#include <cctype>
#include <cstdio>

#include "vornplatform/log.h"

namespace vornwireless {
namespace utils {

MacAddress::MacAddress(std::string const& text) : _text(text) { Formalize(); }

MacAddress& MacAddress::operator=(std::string const& text) {
  _text = text;
  Formalize();
  return *this;
}

bool MacAddress::IsFormalized() const {
  if (_text.size() != 17) return false;
  for (std::size_t i = 0; i < _text.size(); ++i) {
    if (i % 3 == 2) {
      if (_text[i] != ':') return false;
    } else if (!std::isxdigit(static_cast<unsigned char>(_text[i]))) {
      return false;
    }
  }
  return true;
}

bool MacAddress::IsFormalizable() const {
  if (_text.size() != 12) {
    VORN_LOG(LOG_DEBUG, "Bad mac addr length (%zd)", static_cast<ssize_t>(_text.size()));
    return false;
  }
  for (char c : _text) {
    if (!std::isxdigit(static_cast<unsigned char>(c))) {
      VORN_LOG(LOG_ERR, "Bad mac addr [%s]", _text.c_str());
      return false;
    }
  }
  return true;
}

int MacAddress::Formalize() {
  if (IsFormalized()) return 0;
  if (!IsFormalizable()) return -1;
  std::string formal;
  for (std::size_t i = 0; i < _text.size(); ++i) {
    if (i != 0 && i % 2 == 0) formal += ':';
    formal += _text[i];
  }
  _text = formal;
  return 0;
}

MacAddress MacAddress::operator+(int n) const {
  unsigned short o[6];
  if (std::sscanf(_text.c_str(), "%2hx:%2hx:%2hx:%2hx:%2hx:%2hx", &o[0], &o[1], &o[2], &o[3],
                  &o[4], &o[5]) != 6) {
    return MacAddress();
  }
  long last = (static_cast<long>(o[5]) + n) % 255;
  if (last < 0) last += 255;
  char text[32];
  std::snprintf(text, sizeof(text), "%02x:%02x:%02x:%02x:%02x:%02x", o[0], o[1], o[2], o[3], o[4],
                static_cast<unsigned int>(last));
  return MacAddress(std::string(text));
}

std::istream& operator>>(std::istream& in, MacAddress& address) {
  std::string word;
  in >> word;
  address = word;
  return in;
}

}  // namespace utils
}  // namespace vornwireless
