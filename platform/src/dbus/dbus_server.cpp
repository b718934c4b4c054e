#include "vornplatform/dbus_server.h"

#include <gio/gio.h>

#include <atomic>
#include <cstring>
#include <exception>
#include <string>
#include <vector>

#include "vornplatform/log.h"

namespace vornnetsdk {
namespace dbus {

namespace {

// DBUS_NAME_FLAG_DO_NOT_QUEUE and the RequestName replies.
constexpr guint32 kNameFlagDoNotQueue = 4;
constexpr guint32 kNameReplyPrimaryOwner = 1;
constexpr guint32 kNameReplyAlreadyOwner = 4;

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

const char* BusName(DBusBusType type) {
  switch (type) {
    case DBUS_BUS_SESSION:
      return "session";
    case DBUS_BUS_SYSTEM:
      return "system";
    case DBUS_BUS_STARTER:
      return "starter";
  }
  return "unknown";
}

// Concatenated signatures of the in or out arguments of an introspected method.
std::string ArgsSignature(GDBusArgInfo** args) {
  std::string sig;
  for (GDBusArgInfo** a = args; a && *a; ++a) sig += (*a)->signature;
  return sig;
}

// A string D-Bus can carry: NULL becomes "", invalid UTF-8 has its bad bytes replaced.
GVariant* WireString(const char* text, bool* repaired) {
  if (!text) return g_variant_new_string("");
  if (g_utf8_validate(text, -1, nullptr)) return g_variant_new_string(text);
  *repaired = true;
  char* valid = g_utf8_make_valid(text, -1);
  GVariant* v = g_variant_new_string(valid);
  g_free(valid);
  return v;
}

}  // namespace

struct DBusServer::Impl {
  std::string name;
  std::string path;
  DBusBusType busType;

  GDBusConnection* connection = nullptr;
  gulong closedHandler = 0;
  GDBusNodeInfo* nodeInfo = nullptr;
  guint registration = 0;
  const DBusGObjectInfo* info = nullptr;
  gpointer object = nullptr;
  bool objectReferenced = false;
  bool initialized = false;

  std::atomic<bool> quit{false};
  std::atomic<bool> connectionLost{false};
  std::string signalName;

  const DBusMethodEntry* FindEntry(const char* member) const {
    for (unsigned i = 0; i < info->nMethods; ++i) {
      if (std::strcmp(info->methods[i].name, member) == 0) return &info->methods[i];
    }
    return nullptr;
  }

  bool CheckTable(GDBusInterfaceInfo* iface) const;
  void Dispatch(const char* member, GVariant* parameters, GDBusMethodInvocation* invocation);
  void Reset();

  static void OnMethodCall(GDBusConnection*, const gchar*, const gchar*, const gchar*,
                           const gchar* member, GVariant* parameters,
                           GDBusMethodInvocation* invocation, gpointer self) {
    static_cast<Impl*>(self)->Dispatch(member, parameters, invocation);
  }

  static void OnClosed(GDBusConnection*, gboolean remoteVanished, GError* error, gpointer self) {
    Impl* impl = static_cast<Impl*>(self);
    VORN_LOG(LOG_ERR, "Lost the %s bus connection of %s%s%s", BusName(impl->busType),
             impl->name.c_str(), error ? ": " : (remoteVanished ? ": the bus went away" : ""),
             error ? error->message : "");
    impl->connectionLost = true;
    impl->quit = true;
    g_main_context_wakeup(nullptr);
  }
};

bool DBusServer::Impl::CheckTable(GDBusInterfaceInfo* iface) const {
  bool ok = true;
  for (GDBusMethodInfo** m = iface->methods; m && *m; ++m) {
    const DBusMethodEntry* entry = FindEntry((*m)->name);
    if (!entry) {
      VORN_LOG(LOG_ERR, "Method %s.%s has no handler", iface->name, (*m)->name);
      ok = false;
      continue;
    }
    std::string in = ArgsSignature((*m)->in_args);
    std::string out = ArgsSignature((*m)->out_args);
    if (in != entry->inSignature || out != entry->outSignature) {
      VORN_LOG(LOG_ERR,
               "Handler of %s.%s takes (%s) and gives (%s), the interface says (%s) and (%s)",
               iface->name, (*m)->name, entry->inSignature, entry->outSignature, in.c_str(),
               out.c_str());
      ok = false;
    }
  }
  for (unsigned i = 0; i < info->nMethods; ++i) {
    const DBusMethodEntry& entry = info->methods[i];
    if (!entry.name || !entry.invoke || !entry.inSignature || !entry.outSignature) {
      VORN_LOG(LOG_ERR, "Entry %u of the method table of %s is incomplete", i, iface->name);
      ok = false;
      continue;
    }
    if (!g_dbus_interface_info_lookup_method(iface, entry.name)) {
      VORN_LOG(LOG_ERR, "Handler for %s.%s has no method in the interface", iface->name,
               entry.name);
      ok = false;
    }
    for (unsigned j = 0; j < i; ++j) {
      if (info->methods[j].name && std::strcmp(info->methods[j].name, entry.name) == 0) {
        VORN_LOG(LOG_ERR, "Method %s.%s has two handlers", iface->name, entry.name);
        ok = false;
      }
    }
  }
  return ok;
}

void DBusServer::Impl::Dispatch(const char* member, GVariant* parameters,
                                GDBusMethodInvocation* invocation) {
  const DBusMethodEntry* entry = FindEntry(member);
  if (!entry) {
    // Initialize checked the table against the interface, so GDBus never gets here.
    g_dbus_method_invocation_return_dbus_error(
        invocation, "org.freedesktop.DBus.Error.UnknownMethod", "No such method");
    return;
  }
  std::vector<char*> outs(std::strlen(entry->outSignature) + 1, nullptr);
  GError* error = nullptr;
  gboolean ok = FALSE;
  try {
    ok = entry->invoke(object, parameters, outs.data(), &error);
  } catch (const std::exception& e) {
    VORN_LOG(LOG_ERR, "Handler of %s threw an exception: %s", member, e.what());
    ok = FALSE;
    g_clear_error(&error);
  } catch (...) {
    VORN_LOG(LOG_ERR, "Handler of %s threw an exception", member);
    ok = FALSE;
    g_clear_error(&error);
  }

  if (ok) {
    g_clear_error(&error);  // dbus-glib ignores an error that comes with success
    GVariantBuilder reply;
    g_variant_builder_init(&reply, G_VARIANT_TYPE_TUPLE);
    bool repaired = false;
    for (std::size_t i = 0; entry->outSignature[i]; ++i) {
      g_variant_builder_add_value(&reply, WireString(outs[i], &repaired));
    }
    if (repaired) {
      VORN_LOG(LOG_WARNING, "Reply of %s is not valid UTF-8; invalid bytes were replaced", member);
    }
    g_dbus_method_invocation_return_value(invocation, g_variant_builder_end(&reply));
  } else if (error) {
    std::string name = DBusGErrorName(error->domain, error->code);
    const char* message = error->message ? error->message : "";
    char* valid = g_utf8_make_valid(message, -1);
    g_dbus_method_invocation_return_dbus_error(invocation, name.c_str(), valid);
    g_free(valid);
    g_error_free(error);
  } else {
    std::string message = DBusGErrorNoErrorMessage(member);
    g_dbus_method_invocation_return_dbus_error(invocation, kDBusGErrorErrorName, message.c_str());
  }
  for (char* s : outs) g_free(s);
}

void DBusServer::Impl::Reset() {
  if (connection) {
    if (registration) g_dbus_connection_unregister_object(connection, registration);
    if (closedHandler) g_signal_handler_disconnect(connection, closedHandler);
    // Replies still queued (e.g. of the handler that asked to quit) go out first; closing our
    // private connection then gives the name back to the bus at once.
    if (!g_dbus_connection_is_closed(connection)) {
      g_dbus_connection_flush_sync(connection, nullptr, nullptr);
      g_dbus_connection_close_sync(connection, nullptr, nullptr);
    }
    g_object_unref(connection);
  }
  connection = nullptr;
  registration = 0;
  closedHandler = 0;
  if (nodeInfo) g_dbus_node_info_unref(nodeInfo);
  nodeInfo = nullptr;
  if (objectReferenced) g_object_unref(object);
  objectReferenced = false;
  object = nullptr;
  info = nullptr;
  initialized = false;
}

DBusServer::DBusServer(const char* name, const char* path, DBusBusType type) : impl_(new Impl) {
  impl_->name = name ? name : "";
  impl_->path = path ? path : "";
  impl_->busType = type;
}

DBusServer::~DBusServer() { impl_->Reset(); }

bool DBusServer::Initialize(GType type, const DBusGObjectInfo* info, gpointer object) {
  Impl& d = *impl_;
  if (d.initialized) {
    VORN_LOG(LOG_ERR, "D-Bus server %s is already initialized", d.name.c_str());
    return false;
  }
  if (!g_dbus_is_name(d.name.c_str()) || g_dbus_is_unique_name(d.name.c_str())) {
    VORN_LOG(LOG_ERR, "Invalid bus name [%s]", d.name.c_str());
    return false;
  }
  if (!g_variant_is_object_path(d.path.c_str())) {
    VORN_LOG(LOG_ERR, "Invalid object path [%s]", d.path.c_str());
    return false;
  }
  if (!info || !info->introspectionXml || (info->nMethods && !info->methods)) {
    VORN_LOG(LOG_ERR, "No object info for %s", d.name.c_str());
    return false;
  }
  if (type != G_TYPE_INVALID) {
    if (!object || !G_TYPE_CHECK_INSTANCE_TYPE(object, type)) {
      VORN_LOG(LOG_ERR, "Object for %s is not a %s", d.name.c_str(), g_type_name(type));
      return false;
    }
  }

  GError* error = nullptr;
  d.nodeInfo = g_dbus_node_info_new_for_xml(info->introspectionXml, &error);
  if (!d.nodeInfo) {
    VORN_LOG(LOG_ERR, "Failed to parse the introspection data of %s: %s", d.name.c_str(),
             error->message);
    g_error_free(error);
    return false;
  }
  GDBusInterfaceInfo* iface = nullptr;
  if (info->interfaceName) {
    iface = g_dbus_node_info_lookup_interface(d.nodeInfo, info->interfaceName);
  } else if (d.nodeInfo->interfaces && d.nodeInfo->interfaces[0] && !d.nodeInfo->interfaces[1]) {
    iface = d.nodeInfo->interfaces[0];
  }
  if (!iface) {
    VORN_LOG(LOG_ERR, "Interface %s is not in the introspection data of %s",
             info->interfaceName ? info->interfaceName : "(none)", d.name.c_str());
    d.Reset();
    return false;
  }
  d.info = info;
  if (!d.CheckTable(iface)) {
    VORN_LOG(LOG_ERR, "Method table of %s does not match interface %s", d.name.c_str(),
             iface->name);
    d.Reset();
    return false;
  }

  char* address = g_dbus_address_get_for_bus_sync(ToGBusType(d.busType), nullptr, &error);
  if (address) {
    d.connection = g_dbus_connection_new_for_address_sync(
        address,
        static_cast<GDBusConnectionFlags>(G_DBUS_CONNECTION_FLAGS_AUTHENTICATION_CLIENT |
                                          G_DBUS_CONNECTION_FLAGS_MESSAGE_BUS_CONNECTION),
        nullptr, nullptr, &error);
    g_free(address);
  }
  if (!d.connection) {
    VORN_LOG(LOG_ERR, "Failed to connect to the %s bus for %s: %s", BusName(d.busType),
             d.name.c_str(), error->message);
    g_error_free(error);
    d.Reset();
    return false;
  }
  d.closedHandler = g_signal_connect(d.connection, "closed", G_CALLBACK(Impl::OnClosed), &d);

  d.object = object;
  if (object && G_IS_OBJECT(object)) {
    g_object_ref(object);
    d.objectReferenced = true;
  }

  static const GDBusInterfaceVTable vtable = {Impl::OnMethodCall, nullptr, nullptr, {nullptr}};
  d.registration = g_dbus_connection_register_object(d.connection, d.path.c_str(), iface, &vtable,
                                                     &d, nullptr, &error);
  if (!d.registration) {
    VORN_LOG(LOG_ERR, "Failed to export %s at %s: %s", iface->name, d.path.c_str(), error->message);
    g_error_free(error);
    d.Reset();
    return false;
  }

  GVariant* reply = g_dbus_connection_call_sync(
      d.connection, "org.freedesktop.DBus", "/org/freedesktop/DBus", "org.freedesktop.DBus",
      "RequestName", g_variant_new("(su)", d.name.c_str(), kNameFlagDoNotQueue),
      G_VARIANT_TYPE("(u)"), G_DBUS_CALL_FLAGS_NONE, -1, nullptr, &error);
  if (!reply) {
    VORN_LOG(LOG_ERR, "Failed to request name %s: %s", d.name.c_str(), error->message);
    g_error_free(error);
    d.Reset();
    return false;
  }
  guint32 result = 0;
  g_variant_get(reply, "(u)", &result);
  g_variant_unref(reply);
  if (result != kNameReplyPrimaryOwner && result != kNameReplyAlreadyOwner) {
    VORN_LOG(LOG_ERR, "Name %s is already owned on the %s bus", d.name.c_str(), BusName(d.busType));
    d.Reset();
    return false;
  }
  d.initialized = true;
  return true;
}

bool DBusServer::IsInitialized() const { return impl_->initialized; }

bool DBusServer::StartLoop() {
  Impl& d = *impl_;
  if (!d.initialized) {
    VORN_LOG(LOG_ERR, "D-Bus server %s is not initialized", d.name.c_str());
    return false;
  }
  // Iterating ourselves rather than g_main_loop_run: a QuitLoop that comes before the loop
  // starts, or from another thread at any moment, is never lost.
  while (!d.quit.load()) g_main_context_iteration(nullptr, TRUE);
  d.quit = false;
  return !d.connectionLost.load();
}

void DBusServer::QuitLoop() {
  impl_->quit = true;
  g_main_context_wakeup(nullptr);
}

bool DBusServer::NewSignal(const char* signalName) {
  Impl& d = *impl_;
  if (!signalName || !g_dbus_is_member_name(signalName)) {
    VORN_LOG(LOG_ERR, "Invalid signal name [%s]", signalName ? signalName : "(null)");
    d.signalName.clear();
    return false;
  }
  d.signalName = signalName;
  return true;
}

bool DBusServer::SendSignal(const char* value) {
  Impl& d = *impl_;
  if (!d.initialized || d.signalName.empty()) {
    VORN_LOG(LOG_ERR, "No signal to send from %s", d.name.c_str());
    return false;
  }
  bool repaired = false;
  GVariant* arg = WireString(value, &repaired);
  GError* error = nullptr;
  const char* iface =
      d.info->interfaceName ? d.info->interfaceName : d.nodeInfo->interfaces[0]->name;
  gboolean ok =
      g_dbus_connection_emit_signal(d.connection, nullptr, d.path.c_str(), iface,
                                    d.signalName.c_str(), g_variant_new_tuple(&arg, 1), &error);
  if (!ok) {
    VORN_LOG(LOG_ERR, "Failed to send signal %s: %s", d.signalName.c_str(), error->message);
    g_error_free(error);
    return false;
  }
  return true;
}

}  // namespace dbus
}  // namespace vornnetsdk
