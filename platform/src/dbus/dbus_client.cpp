#include "vornplatform/dbus_client.h"

#include <gio/gio.h>

#include <string>
#include <vector>

#include "vornplatform/log.h"

namespace vornnetsdk {
namespace dbus {

namespace {

const char kNoReplyName[] = "org.freedesktop.DBus.Error.NoReply";
const char kDisconnectedName[] = "org.freedesktop.DBus.Error.Disconnected";
const char kFailedName[] = "org.freedesktop.DBus.Error.Failed";

GBusType ToGBusType(DBusBusType type) {
  switch (type) {
    case DBUS_BUS_SESSION:
      return G_BUS_TYPE_SESSION;
    case DBUS_BUS_SYSTEM:
      return G_BUS_TYPE_SYSTEM;
    case DBUS_BUS_STARTER:
      return G_BUS_TYPE_STARTER;
  }
  return G_BUS_TYPE_NONE;
}

}  // namespace

struct DBusClient::Impl {
  std::string service;
  std::string path;
  std::string interface;
  DBusBusType busType;

  GDBusConnection* connection = nullptr;  // the process's shared connection, referenced
  std::string method;                     // empty: no message being built
  std::vector<GVariant*> args;            // sunk references
  GDBusMessage* reply = nullptr;

  std::string errorName;
  std::string errorMessage;
  std::string errorDomain;
  int errorCode = 0;

  void DropMessage() {
    method.clear();
    for (GVariant* v : args) g_variant_unref(v);
    args.clear();
  }
  void DropReply() {
    if (reply) g_object_unref(reply);
    reply = nullptr;
  }
  void ClearError() {
    errorName.clear();
    errorMessage.clear();
    errorDomain.clear();
    errorCode = 0;
  }
  // Records a failure that did not come from the server.
  void LocalError(const char* name, const std::string& message) {
    ClearError();
    errorName = name;
    errorMessage = message;
  }
  // Records a GIO error of a call; a remote error keeps its D-Bus name.
  void CallError(const GError* error) {
    ClearError();
    char* remote = g_dbus_error_get_remote_error(error);
    if (remote) {
      errorName = remote;
      g_free(remote);
      GError* copy = g_error_copy(error);
      g_dbus_error_strip_remote_error(copy);
      errorMessage = copy->message;
      g_error_free(copy);
    } else {
      errorName = g_error_matches(error, G_IO_ERROR, G_IO_ERROR_TIMED_OUT) ? kNoReplyName
                  : g_error_matches(error, G_IO_ERROR, G_IO_ERROR_CLOSED)  ? kDisconnectedName
                                                                           : kFailedName;
      errorMessage = error->message;
    }
    ParseDBusGErrorName(errorName, &errorDomain, &errorCode);
  }

  GDBusConnection* Connection() {
    if (connection && g_dbus_connection_is_closed(connection)) {
      g_object_unref(connection);
      connection = nullptr;
    }
    if (!connection) {
      GError* error = nullptr;
      connection = g_bus_get_sync(ToGBusType(busType), nullptr, &error);
      if (!connection) {
        VORN_LOG(LOG_ERR, "Failed to connect to the bus for %s: %s", service.c_str(),
                 error->message);
        CallError(error);
        g_error_free(error);
      }
    }
    return connection;
  }
};

DBusClient::DBusClient(const char* service, const char* path, const char* interface,
                       DBusBusType type)
    : impl_(new Impl) {
  impl_->service = service ? service : "";
  impl_->path = path ? path : "";
  impl_->interface = interface ? interface : "";
  impl_->busType = type;
}

DBusClient::~DBusClient() {
  impl_->DropMessage();
  impl_->DropReply();
  if (impl_->connection) g_object_unref(impl_->connection);
}

int DBusClient::NewMessage(const char* method) {
  Impl& d = *impl_;
  d.DropMessage();
  d.DropReply();
  d.ClearError();
  if (!method || !g_dbus_is_member_name(method)) {
    VORN_LOG(LOG_ERR, "Invalid method name [%s]", method ? method : "(null)");
    d.LocalError(kFailedName, "Invalid method name");
    return -1;
  }
  d.method = method;
  return 0;
}

int DBusClient::Append(const char* str) {
  Impl& d = *impl_;
  if (d.method.empty()) {
    VORN_LOG(LOG_ERR, "No message to append to");
    return -1;
  }
  if (!str || !g_utf8_validate(str, -1, nullptr)) {
    VORN_LOG(LOG_ERR, "Argument %zu of %s is %s", d.args.size() + 1, d.method.c_str(),
             str ? "not valid UTF-8" : "NULL");
    return -1;
  }
  d.args.push_back(g_variant_ref_sink(g_variant_new_string(str)));
  return 0;
}

int DBusClient::Append(bool value) {
  Impl& d = *impl_;
  if (d.method.empty()) {
    VORN_LOG(LOG_ERR, "No message to append to");
    return -1;
  }
  d.args.push_back(g_variant_ref_sink(g_variant_new_boolean(value)));
  return 0;
}

int DBusClient::SendMessage(bool wantReply, int timeoutMs) {
  Impl& d = *impl_;
  d.DropReply();
  d.ClearError();
  if (d.method.empty()) {
    VORN_LOG(LOG_ERR, "No message to send");
    d.LocalError(kFailedName, "No message to send");
    return -1;
  }
  std::string method = d.method;
  if (!g_dbus_is_name(d.service.c_str()) || !g_variant_is_object_path(d.path.c_str()) ||
      !g_dbus_is_interface_name(d.interface.c_str())) {
    VORN_LOG(LOG_ERR, "Invalid destination [%s] [%s] [%s] for %s", d.service.c_str(),
             d.path.c_str(), d.interface.c_str(), method.c_str());
    d.LocalError(kFailedName, "Invalid destination");
    d.DropMessage();
    return -1;
  }
  GDBusConnection* connection = d.Connection();
  if (!connection) {
    d.DropMessage();
    return -1;
  }

  GDBusMessage* message = g_dbus_message_new_method_call(d.service.c_str(), d.path.c_str(),
                                                         d.interface.c_str(), method.c_str());
  g_dbus_message_set_body(message, g_variant_new_tuple(d.args.data(), d.args.size()));
  d.DropMessage();

  GError* error = nullptr;
  int rc = 0;
  if (!wantReply) {
    g_dbus_message_set_flags(message, G_DBUS_MESSAGE_FLAGS_NO_REPLY_EXPECTED);
    if (!g_dbus_connection_send_message(connection, message, G_DBUS_SEND_MESSAGE_FLAGS_NONE,
                                        nullptr, &error) ||
        !g_dbus_connection_flush_sync(connection, nullptr, &error)) {
      VORN_LOG(LOG_ERR, "Failed to send %s to %s: %s", method.c_str(), d.service.c_str(),
               error->message);
      d.CallError(error);
      g_error_free(error);
      rc = -1;
    }
    g_object_unref(message);
    return rc;
  }

  GDBusMessage* reply = g_dbus_connection_send_message_with_reply_sync(
      connection, message, G_DBUS_SEND_MESSAGE_FLAGS_NONE, timeoutMs, nullptr, nullptr, &error);
  g_object_unref(message);
  if (!reply) {
    d.CallError(error);
    g_error_free(error);
    VORN_LOG(LOG_ERR, "Call %s failed: %s [%s]", method.c_str(), d.errorMessage.c_str(),
             d.errorName.c_str());
    return -1;
  }
  if (g_dbus_message_get_message_type(reply) == G_DBUS_MESSAGE_TYPE_ERROR) {
    const char* name = g_dbus_message_get_error_name(reply);
    d.errorName = name ? name : "";
    GVariant* body = g_dbus_message_get_body(reply);
    if (body && g_variant_is_of_type(body, G_VARIANT_TYPE_TUPLE) &&
        g_variant_n_children(body) > 0) {
      GVariant* first = g_variant_get_child_value(body, 0);
      if (g_variant_is_of_type(first, G_VARIANT_TYPE_STRING)) {
        d.errorMessage = g_variant_get_string(first, nullptr);
      }
      g_variant_unref(first);
    }
    ParseDBusGErrorName(d.errorName, &d.errorDomain, &d.errorCode);
    VORN_LOG(LOG_ERR, "Call %s failed: %s [%s]", method.c_str(), d.errorMessage.c_str(),
             d.errorName.c_str());
    g_object_unref(reply);
    return -1;
  }
  d.reply = reply;
  return 0;
}

int DBusClient::GetReply(std::string& out) {
  Impl& d = *impl_;
  GVariant* body = d.reply ? g_dbus_message_get_body(d.reply) : nullptr;
  if (body && g_variant_is_of_type(body, G_VARIANT_TYPE_TUPLE)) {
    gsize n = g_variant_n_children(body);
    for (gsize i = 0; i < n; ++i) {
      GVariant* child = g_variant_get_child_value(body, i);
      bool isString = g_variant_is_of_type(child, G_VARIANT_TYPE_STRING);
      if (isString) out = g_variant_get_string(child, nullptr);
      g_variant_unref(child);
      if (isString) return 0;
    }
  }
  VORN_LOG(LOG_ERR, "No string in the reply from %s", d.service.c_str());
  return -1;
}

bool DBusClient::IsServerReady() const {
  Impl& d = *impl_;
  if (!g_dbus_is_name(d.service.c_str())) return false;
  GDBusConnection* connection = d.Connection();
  if (!connection) return false;
  GError* error = nullptr;
  GVariant* reply = g_dbus_connection_call_sync(
      connection, "org.freedesktop.DBus", "/org/freedesktop/DBus", "org.freedesktop.DBus",
      "NameHasOwner", g_variant_new("(s)", d.service.c_str()), G_VARIANT_TYPE("(b)"),
      G_DBUS_CALL_FLAGS_NONE, -1, nullptr, &error);
  if (!reply) {
    VORN_LOG(LOG_ERR, "Failed to ask the bus for %s: %s", d.service.c_str(), error->message);
    g_error_free(error);
    return false;
  }
  gboolean owned = FALSE;
  g_variant_get(reply, "(b)", &owned);
  g_variant_unref(reply);
  return owned;
}

const std::string& DBusClient::LastErrorName() const { return impl_->errorName; }
const std::string& DBusClient::LastErrorMessage() const { return impl_->errorMessage; }
const std::string& DBusClient::LastErrorDomain() const { return impl_->errorDomain; }
int DBusClient::LastErrorCode() const { return impl_->errorCode; }

}  // namespace dbus
}  // namespace vornnetsdk
