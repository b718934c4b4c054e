// The base of our D-Bus services: one object, one interface, one well-known name, served on the
// GLib main loop. Built on GDBus; the replies are the ones dbus-glib gave:
//   - handler returns TRUE: the out arguments (a NULL out string is sent as ""); an error the
//     handler set as well is dropped;
//   - FALSE with an error: "org.freedesktop.DBus.GLib.UnmappedError.<Domain>.Code<N>" with the
//     error's message (see DBusGErrorName);
//   - FALSE without an error, or a handler that threw (logged):
//     "org.freedesktop.DBus.GLib.ErrorError", "Method invoked for <Member> returned FALSE but did
//     not set error".
// Out strings that are not valid UTF-8 cannot travel on D-Bus: they are sent with the bad bytes
// replaced by U+FFFD, and a warning is logged.
//
// Use: construct, Initialize, add timers, StartLoop. Handlers run one at a time on the thread
// that calls StartLoop (the default main context). The object stays reachable on the bus until
// the server is destroyed.
#ifndef VORNPLATFORM_DBUS_SERVER_H
#define VORNPLATFORM_DBUS_SERVER_H

#include <glib-object.h>

#include <memory>

#include "vornplatform/dbus_method.h"

namespace vornnetsdk {
namespace dbus {

class DBusServer {
 public:
  // name: the well-known bus name; path: the object path. Nothing is connected yet.
  DBusServer(const char* name, const char* path, DBusBusType type);
  virtual ~DBusServer();
  DBusServer(const DBusServer&) = delete;
  DBusServer& operator=(const DBusServer&) = delete;

  // Runs the default main context until QuitLoop. False without running when the server is not
  // initialized, and false when the loop ended because the bus connection was lost; true after
  // QuitLoop. A QuitLoop that came before StartLoop makes it return at once.
  virtual bool StartLoop();
  // Ends StartLoop. Safe from a handler, a GLib source (e.g. g_unix_signal_add) or another thread.
  virtual void QuitLoop();
  // Signals: NewSignal names the signal (a member of the server's interface), SendSignal emits it
  // from the object path with one string argument. False when not initialized, without a
  // NewSignal, on an invalid name or when the bus refuses.
  virtual bool NewSignal(const char* signalName);
  virtual bool SendSignal(const char* value);
  virtual bool IsInitialized() const;

  // Connects to the bus, checks the table against the introspection XML, exports `object` at the
  // path and requests the name (not queued). `type`, when not G_TYPE_INVALID, is the GType
  // `object` must be an instance of; a GObject is kept referenced while the server lives.
  // False, with a log line, on any failure, including a name that another connection owns.
  bool Initialize(GType type, const DBusGObjectInfo* info, gpointer object);

 private:
  struct Impl;
  std::unique_ptr<Impl> impl_;
};

}  // namespace dbus
}  // namespace vornnetsdk

#endif
