// The D-Bus base of our services and clients: vornnetsdk::dbus::DBusServer, DBusClient and the
// method table they share (dbus_method.h).
#ifndef VORNPLATFORM_DBUS_H
#define VORNPLATFORM_DBUS_H

#include "vornplatform/dbus_client.h"
#include "vornplatform/dbus_method.h"
#include "vornplatform/dbus_server.h"

#endif
