// A synchronous caller of one object's interface:
//   NewMessage("GetProfile"); Append(devid); SendMessage(true, -1); GetReply(text);
// Every step returns 0 on success and -1 on failure. Calls go out on the process's shared
// connection to the bus and wait for their reply without the GLib main loop, so a handler of a
// DBusServer may call another service while its own loop is busy with it.
//
// An error reply is logged at LOG_ERR as "Call <Method> failed: <message> [<error name>]" and
// kept: LastErrorName/LastErrorMessage, and for dbus-glib's unmapped errors
// ("...UnmappedError.<Domain>.Code<N>") LastErrorDomain/LastErrorCode. A reply that did not come
// within the timeout is "org.freedesktop.DBus.Error.NoReply".
#ifndef VORNPLATFORM_DBUS_CLIENT_H
#define VORNPLATFORM_DBUS_CLIENT_H

#include <memory>
#include <string>

#include "vornplatform/dbus_method.h"

namespace vornnetsdk {
namespace dbus {

class DBusClient {
 public:
  DBusClient(const char* service, const char* path, const char* interface, DBusBusType type);
  virtual ~DBusClient();
  DBusClient(const DBusClient&) = delete;
  DBusClient& operator=(const DBusClient&) = delete;

  // Starts a call of `method`, dropping any previous message and reply.
  int NewMessage(const char* method);
  // Adds one argument: a string ("s", valid UTF-8, not NULL) or a boolean ("b"). Pass true/false
  // for the boolean, not TRUE/FALSE (FALSE is also a null pointer constant).
  int Append(const char* str);
  int Append(bool value);
  // Sends the message. wantReply: wait up to timeoutMs (-1: the bus library's default of 25 s)
  // for the reply; an error reply or no reply gives -1. Without a reply the call is flagged
  // NO_REPLY_EXPECTED and 0 means it was handed to the bus: the handler's outcome is never seen.
  int SendMessage(bool wantReply, int timeoutMs);
  // The first string of the last reply.
  int GetReply(std::string& out);
  // Whether some connection owns the service name now.
  virtual bool IsServerReady() const;

  const std::string& LastErrorName() const;  // "" after a success
  const std::string& LastErrorMessage() const;
  const std::string& LastErrorDomain() const;  // "<Domain>" of an unmapped error, else ""
  int LastErrorCode() const;                   // its code (signed), else 0

 private:
  struct Impl;
  std::unique_ptr<Impl> impl_;
};

}  // namespace dbus
}  // namespace vornnetsdk

#endif
