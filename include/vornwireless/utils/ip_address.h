// A text-backed IP address value (IPv4 or IPv6): an invalid address is an empty one.
#ifndef VORNWIRELESS_UTILS_IP_ADDRESS_H
#define VORNWIRELESS_UTILS_IP_ADDRESS_H

#include <netinet/in.h>

#include <istream>
#include <string>
#include <utility>
#include <vector>

namespace vornwireless {
namespace utils {

class IPAddress {
 public:
  // A text and its prefix length.
  typedef std::vector<std::pair<std::string, int> > AddressList;

  IPAddress();  // empty; the binary form is all ones
  IPAddress(std::string const& text);  // NOLINT: converting on purpose
  IPAddress(IPAddress const& other) = default;
  IPAddress& operator=(IPAddress const& other) = default;
  // Keeps the text when it is an IPv4 or IPv6 address, else becomes empty. An IPv6 text leaves
  // the binary form as it was.
  IPAddress& operator=(std::string const& text);

  std::string ToString() const { return _text; }
  char const* ToCString() const { return _text.c_str(); }
  operator std::string() const { return _text; }
  operator char const*() const { return _text.c_str(); }

  // Compare the text: two spellings of one IPv6 address differ.
  bool operator==(IPAddress const& other) const { return _text == other._text; }
  bool operator!=(IPAddress const& other) const { return _text != other._text; }

  bool IsEmpty() const { return _text.empty(); }

  // The binary IPv4 form (network byte order).
  in_addr GetInAddr() const { return _addr; }
  void SetInAddr(in_addr addr);  // also sets the text (inet_ntoa)

  // The addresses / networks of one interface, with their prefix lengths; empty on failure.
  static AddressList GetIPv4Address(std::string const& ifname);
  static AddressList GetIPv4Network(std::string const& ifname);
  static AddressList GetIPv6Address(std::string const& ifname);
  static AddressList GetIPv6Network(std::string const& ifname);
  // The network part of an IPv6 address as text; empty when the address is not IPv6.
  static std::string GetIPv6NetworkPart(std::string const& address, int prefixLength);

 private:
  in_addr _addr;
  std::string _text;
};

// Reads one word and assigns it.
std::istream& operator>>(std::istream& in, IPAddress& address);

// IPv4 arithmetic on the binary form.
IPAddress GetNetwork(IPAddress const& ip, IPAddress const& mask);
IPAddress GetIpAddressBegin(IPAddress const& network, IPAddress const& mask);  // first host
IPAddress GetIpAddressEnd(IPAddress const& network, IPAddress const& mask);    // last host
IPAddress GetNextNetwork(IPAddress const& network, IPAddress const& mask);     // next of same size

}  // namespace utils
}  // namespace vornwireless

#endif
