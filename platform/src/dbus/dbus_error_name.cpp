// The D-Bus error names of failing handlers, as dbus-glib made them for error domains it had no
// mapping for.
#include <gio/gio.h>

#include <cstdlib>
#include <string>

#include "vornplatform/dbus_method.h"

namespace vornnetsdk {
namespace dbus {

namespace {

const char kUnmappedPrefix[] = "org.freedesktop.DBus.GLib.UnmappedError.";

// A D-Bus name element: [A-Za-z_][A-Za-z0-9_]*.
bool IsNameElement(const std::string& s) {
  if (s.empty() || g_ascii_isdigit(s[0])) return false;
  for (char c : s) {
    if (!g_ascii_isalnum(c) && c != '_') return false;
  }
  return true;
}

}  // namespace

std::string DBusGErrorDomainName(const char* domain) {
  std::string out;
  if (!domain) return out;
  bool upper = true;
  for (const char* p = domain; *p; ++p) {
    if (*p == '-' || *p == '_') {
      upper = true;
    } else if (upper) {
      out += g_ascii_toupper(*p);
      upper = false;
    } else {
      out += *p;
    }
  }
  return out;
}

std::string DBusGErrorName(GQuark domain, int code) {
  std::string name = kUnmappedPrefix;
  std::string element = DBusGErrorDomainName(g_quark_to_string(domain));
  if (IsNameElement(element)) name += element + ".";
  name += "Code" + std::to_string(static_cast<guint32>(code));
  return name;
}

std::string DBusGErrorNoErrorMessage(const char* member) {
  return std::string("Method invoked for ") + (member ? member : "") +
         " returned FALSE but did not set error";
}

bool ParseDBusGErrorName(const std::string& name, std::string* domain, int* code) {
  const std::string prefix = kUnmappedPrefix;
  if (name.compare(0, prefix.size(), prefix) != 0) return false;
  std::string rest = name.substr(prefix.size());
  std::string dom;
  std::size_t dot = rest.find('.');
  if (dot != std::string::npos) {
    dom = rest.substr(0, dot);
    rest = rest.substr(dot + 1);
    if (!IsNameElement(dom)) return false;
  }
  if (rest.compare(0, 4, "Code") != 0 || rest.size() == 4 || rest.size() > 14) return false;
  guint64 value = 0;
  for (std::size_t i = 4; i < rest.size(); ++i) {
    if (!g_ascii_isdigit(rest[i])) return false;
    value = value * 10 + static_cast<guint64>(rest[i] - '0');
  }
  if (value > G_MAXUINT32) return false;
  if (domain) *domain = dom;
  if (code) *code = static_cast<int>(static_cast<guint32>(value));
  return true;
}

}  // namespace dbus
}  // namespace vornnetsdk
