// The method table of a D-Bus object served by vornnetsdk::dbus::DBusServer, and the error names
// a failing handler is answered with.
//
// A handler is a plain function
//   gboolean handler(Object* object, <in args>..., <out args>..., GError** error);
// where an in argument is `const char*` (D-Bus "s") or `gboolean` ("b"), an out argument is
// `char**` ("s", the handler stores a g_malloc'ed string or leaves it NULL, which is sent as ""),
// in arguments come before out arguments, and the last parameter is the GError**.
//
// VORN_DBUS_METHOD("Name", handler) turns such a function into a table entry at compile time; an
// unsupported parameter type is a compile error. The introspection XML names the arguments and is
// checked against the table when the server initializes: every XML method needs an entry whose
// argument types match, and every entry needs an XML method.
//
//   // vorn_embed_dbus_xml(<target> ${PROJECT_SOURCE_DIR}/dist/dbus/com.vornlink.usbmodem.xml
//   //                     kUSBModemIntrospectionXml) in CMake defines the text:
//   extern const char kUSBModemIntrospectionXml[];
//   static const vornnetsdk::dbus::DBusMethodEntry kMethods[] = {
//       VORN_DBUS_METHOD("Connect", usbmodem_connect),
//       VORN_DBUS_METHOD("GetUSBModem", usbmodem_get_usbmodem),
//   };
//   static const vornnetsdk::dbus::DBusGObjectInfo kInfo = {
//       "com.vornlink.usbmodem", kUSBModemIntrospectionXml, kMethods, G_N_ELEMENTS(kMethods)};
#ifndef VORNPLATFORM_DBUS_METHOD_H
#define VORNPLATFORM_DBUS_METHOD_H

#include <glib.h>

#include <array>
#include <cstddef>
#include <string>
#include <tuple>
#include <type_traits>
#include <utility>

namespace vornnetsdk {
namespace dbus {

enum DBusBusType { DBUS_BUS_SESSION = 0, DBUS_BUS_SYSTEM = 1, DBUS_BUS_STARTER = 2 };

// Calls one handler: reads the in arguments from `parameters` (a tuple of the entry's
// inSignature), hands the handler &outs[0..] for its out arguments (the caller owns them: they
// start NULL and are g_free'd by the caller whatever happens) and returns the handler's result.
// Exceptions thrown by the handler pass through; the server catches them.
using DBusMethodInvoker = gboolean (*)(gpointer object, GVariant* parameters, char** outs,
                                       GError** error);

struct DBusMethodEntry {
  const char* name;  // D-Bus member name
  DBusMethodInvoker invoke;
  const char* inSignature;   // e.g. "ssb"
  const char* outSignature;  // e.g. "s"
};

// What dbus-glib's generated object info was: the interface, its introspection XML (a <node>
// holding at least this <interface>; with interfaceName NULL, the node's only interface) and the
// handlers.
struct DBusGObjectInfo {
  const char* interfaceName;
  const char* introspectionXml;
  const DBusMethodEntry* methods;
  unsigned nMethods;
};

// The <Domain> part of an unmapped error name: the first letter and every letter after '-' or '_'
// upper-cased, '-' and '_' dropped. "badparameter" -> "Badparameter", "some-domain_name" ->
// "SomeDomainName", "" -> "".
std::string DBusGErrorDomainName(const char* domain);

// The D-Bus error name for a handler's GError:
// "org.freedesktop.DBus.GLib.UnmappedError.<Domain>.Code<code as unsigned 32-bit>". Where the
// domain yields no valid name element (empty, or not a D-Bus name element after conversion) the
// element is left out: "org.freedesktop.DBus.GLib.UnmappedError.Code<N>".
std::string DBusGErrorName(GQuark domain, int code);

// The name and message for a handler that returned FALSE without setting an error.
inline constexpr char kDBusGErrorErrorName[] = "org.freedesktop.DBus.GLib.ErrorError";
std::string DBusGErrorNoErrorMessage(const char* member);

// Reads an unmapped error name back: true for "...UnmappedError.<Domain>.Code<N>" (and the form
// without a domain), giving <Domain> and N as the handler's signed code. False for other names.
bool ParseDBusGErrorName(const std::string& name, std::string* domain, int* code);

namespace detail {

enum class ArgRole { kIn, kOut, kError };

template <typename T>
struct DependentFalse : std::false_type {};

template <typename T>
struct HandlerArg {
  static_assert(DependentFalse<T>::value,
                "D-Bus handler arguments are const char* or gboolean (in), char** (out) and a "
                "final GError**");
  static constexpr ArgRole role = ArgRole::kError;
  static constexpr char type = '\0';
};
template <>
struct HandlerArg<const char*> {
  static constexpr ArgRole role = ArgRole::kIn;
  static constexpr char type = 's';
  // Points into `parameters`, which outlives the call.
  static const char* Get(GVariant* parameters, std::size_t index, char**) {
    GVariant* child = g_variant_get_child_value(parameters, index);
    const char* value = g_variant_get_string(child, nullptr);
    g_variant_unref(child);
    return value;
  }
};
template <>
struct HandlerArg<gboolean> {
  static constexpr ArgRole role = ArgRole::kIn;
  static constexpr char type = 'b';
  static gboolean Get(GVariant* parameters, std::size_t index, char**) {
    GVariant* child = g_variant_get_child_value(parameters, index);
    gboolean value = g_variant_get_boolean(child);
    g_variant_unref(child);
    return value;
  }
};
template <>
struct HandlerArg<char**> {
  static constexpr ArgRole role = ArgRole::kOut;
  static constexpr char type = 's';
  static char** Get(GVariant*, std::size_t index, char** outs) { return &outs[index]; }
};
template <>
struct HandlerArg<GError**> {
  static constexpr ArgRole role = ArgRole::kError;
  static constexpr char type = '\0';
};

template <typename F>
struct HandlerTraits {
  static_assert(DependentFalse<F>::value,
                "a D-Bus handler is gboolean (*)(Object*, in..., out..., GError**)");
};

template <typename Object, typename... Args>
struct HandlerTraits<gboolean (*)(Object*, Args...)> {
  static constexpr std::size_t kArgs = sizeof...(Args);
  static constexpr ArgRole kRoles[kArgs + 1] = {HandlerArg<Args>::role..., ArgRole::kError};
  static constexpr char kTypes[kArgs + 1] = {HandlerArg<Args>::type..., '\0'};

  static constexpr bool WellFormed() {
    if (kArgs == 0 || kRoles[kArgs - 1] != ArgRole::kError) return false;
    bool seenOut = false;
    for (std::size_t i = 0; i + 1 < kArgs; ++i) {
      if (kRoles[i] == ArgRole::kError) return false;
      if (kRoles[i] == ArgRole::kOut) seenOut = true;
      if (kRoles[i] == ArgRole::kIn && seenOut) return false;
    }
    return true;
  }
  static_assert(WellFormed(),
                "a D-Bus handler takes its in arguments, then its out arguments, then GError**");

  // Signature of one role, NUL-terminated.
  static constexpr std::array<char, kArgs + 1> Signature(ArgRole role) {
    std::array<char, kArgs + 1> sig{};
    std::size_t n = 0;
    for (std::size_t i = 0; i < kArgs; ++i) {
      if (kRoles[i] == role) sig[n++] = kTypes[i];
    }
    return sig;
  }
  // Position of argument i among the arguments of its role.
  static constexpr std::array<std::size_t, kArgs + 1> Positions() {
    std::array<std::size_t, kArgs + 1> pos{};
    std::size_t in = 0, out = 0;
    for (std::size_t i = 0; i < kArgs; ++i) {
      if (kRoles[i] == ArgRole::kIn) pos[i] = in++;
      if (kRoles[i] == ArgRole::kOut) pos[i] = out++;
    }
    return pos;
  }
  static constexpr std::array<char, kArgs + 1> kIn = Signature(ArgRole::kIn);
  static constexpr std::array<char, kArgs + 1> kOut = Signature(ArgRole::kOut);
  static constexpr std::array<std::size_t, kArgs + 1> kPos = Positions();

  template <auto Handler, std::size_t... I>
  static gboolean Call(gpointer object, GVariant* parameters, char** outs, GError** error,
                       std::index_sequence<I...>) {
    using Tuple = std::tuple<Args...>;
    (void)parameters;  // unused by handlers without in arguments
    (void)outs;        // and without out arguments
    return Handler(static_cast<Object*>(object),
                   HandlerArg<std::tuple_element_t<I, Tuple>>::Get(parameters, kPos[I], outs)...,
                   error);
  }

  template <auto Handler>
  static gboolean Invoke(gpointer object, GVariant* parameters, char** outs, GError** error) {
    return Call<Handler>(object, parameters, outs, error,
                         std::make_index_sequence<(kArgs > 0 ? kArgs - 1 : 0)>());
  }
};

template <typename Object, typename... Args>
struct HandlerTraits<gboolean (*)(Object*, Args...) noexcept>
    : HandlerTraits<gboolean (*)(Object*, Args...)> {};

}  // namespace detail

template <auto Handler>
constexpr DBusMethodEntry MakeDBusMethod(const char* name) {
  using Traits = detail::HandlerTraits<decltype(Handler)>;
  return DBusMethodEntry{name, &Traits::template Invoke<Handler>, Traits::kIn.data(),
                         Traits::kOut.data()};
}

}  // namespace dbus
}  // namespace vornnetsdk

// One method table entry: VORN_DBUS_METHOD("GetProfile", usbmodem_get_profile).
#define VORN_DBUS_METHOD(name, handler) ::vornnetsdk::dbus::MakeDBusMethod<handler>(name)

#endif
