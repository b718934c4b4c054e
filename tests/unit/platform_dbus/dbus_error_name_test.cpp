// Error names of failing handlers, and the compile-time handler adapter.
#include <gio/gio.h>
#include <gtest/gtest.h>

#include <cstring>

#include "vornplatform/dbus.h"

namespace vornnetsdk {
namespace dbus {
namespace {

TEST(DBusGErrorDomainName, UpperCasesFirstLetterAndLettersAfterSeparators) {
  EXPECT_EQ("Badparameter", DBusGErrorDomainName("badparameter"));
  EXPECT_EQ("Error", DBusGErrorDomainName("error"));
  EXPECT_EQ("SomeDomainName", DBusGErrorDomainName("some-domain_name"));
  EXPECT_EQ("", DBusGErrorDomainName(""));
  EXPECT_EQ("", DBusGErrorDomainName(nullptr));
  EXPECT_EQ("GIoErrorQuark", DBusGErrorDomainName("g-io-error-quark"));
  EXPECT_EQ("AB", DBusGErrorDomainName("a--b_"));
  EXPECT_EQ("MixedCASE", DBusGErrorDomainName("mixedCASE"));
  EXPECT_EQ("X2y", DBusGErrorDomainName("x-2y"));
}

TEST(DBusGErrorName, DomainAndUnsignedCode) {
  const std::string prefix = "org.freedesktop.DBus.GLib.UnmappedError.";
  EXPECT_EQ(prefix + "Badparameter.Code1",
            DBusGErrorName(g_quark_from_static_string("badparameter"), 1));
  EXPECT_EQ(prefix + "Error.Code4294967295",
            DBusGErrorName(g_quark_from_static_string("error"), -1));
  EXPECT_EQ(prefix + "Error.Code2", DBusGErrorName(g_quark_from_static_string("error"), 2));
  EXPECT_EQ(prefix + "Error.Code0", DBusGErrorName(g_quark_from_static_string("error"), 0));
  EXPECT_EQ(prefix + "Error.Code2147483648",
            DBusGErrorName(g_quark_from_static_string("error"), G_MININT32));
  EXPECT_EQ(prefix + "SomeDomainName.Code7",
            DBusGErrorName(g_quark_from_static_string("some-domain_name"), 7));
}

TEST(DBusGErrorName, DomainThatMakesNoNameElementIsLeftOut) {
  const std::string prefix = "org.freedesktop.DBus.GLib.UnmappedError.";
  EXPECT_EQ(prefix + "Code1", DBusGErrorName(g_quark_from_static_string(""), 1));
  EXPECT_EQ(prefix + "Code1", DBusGErrorName(0, 1));
  EXPECT_EQ(prefix + "Code3", DBusGErrorName(g_quark_from_static_string("9lives"), 3));
  EXPECT_EQ(prefix + "Code3", DBusGErrorName(g_quark_from_static_string("a.b"), 3));
  EXPECT_EQ(prefix + "Code3", DBusGErrorName(g_quark_from_static_string("caf\xc3\xa9"), 3));
  EXPECT_TRUE(g_dbus_is_interface_name(DBusGErrorName(g_quark_from_static_string("-"), 3).c_str()));
}

TEST(DBusGErrorNoErrorMessage, NamesTheMember) {
  EXPECT_STREQ("org.freedesktop.DBus.GLib.ErrorError", kDBusGErrorErrorName);
  EXPECT_EQ("Method invoked for Connect returned FALSE but did not set error",
            DBusGErrorNoErrorMessage("Connect"));
}

TEST(ParseDBusGErrorName, ReadsDomainAndSignedCode) {
  std::string domain;
  int code = 0;
  ASSERT_TRUE(ParseDBusGErrorName("org.freedesktop.DBus.GLib.UnmappedError.Error.Code4294967295",
                                  &domain, &code));
  EXPECT_EQ("Error", domain);
  EXPECT_EQ(-1, code);
  ASSERT_TRUE(ParseDBusGErrorName("org.freedesktop.DBus.GLib.UnmappedError.Badparameter.Code1",
                                  &domain, &code));
  EXPECT_EQ("Badparameter", domain);
  EXPECT_EQ(1, code);
  ASSERT_TRUE(ParseDBusGErrorName("org.freedesktop.DBus.GLib.UnmappedError.Code2", &domain, &code));
  EXPECT_EQ("", domain);
  EXPECT_EQ(2, code);
}

TEST(ParseDBusGErrorName, RejectsOtherNames) {
  std::string domain = "kept";
  int code = 9;
  EXPECT_FALSE(ParseDBusGErrorName("org.freedesktop.DBus.GLib.ErrorError", &domain, &code));
  EXPECT_FALSE(ParseDBusGErrorName("org.freedesktop.DBus.Error.NoReply", &domain, &code));
  EXPECT_FALSE(
      ParseDBusGErrorName("org.freedesktop.DBus.GLib.UnmappedError.Error.Code", &domain, &code));
  EXPECT_FALSE(ParseDBusGErrorName("org.freedesktop.DBus.GLib.UnmappedError.Error.Code4294967296",
                                   &domain, &code));
  EXPECT_FALSE(
      ParseDBusGErrorName("org.freedesktop.DBus.GLib.UnmappedError.Error.Code1x", &domain, &code));
  EXPECT_FALSE(ParseDBusGErrorName("", &domain, &code));
  EXPECT_EQ("kept", domain);
  EXPECT_EQ(9, code);
}

// Handlers of each shape the services use.
struct Obj {
  std::string seen;
};

gboolean no_args(Obj* o, GError**) {
  o->seen = "no_args";
  return TRUE;
}
gboolean in_out(Obj* o, const char* a, char** out, GError**) {
  o->seen = a;
  *out = g_strdup("out");
  return TRUE;
}
gboolean set_pin(Obj* o, const char* devid, const char* oldpin, const char* newpin,
                 gboolean protection, GError** error) {
  o->seen = std::string(devid) + oldpin + newpin + (protection ? "1" : "0");
  g_set_error(error, g_quark_from_static_string("error"), 2, "x");
  return FALSE;
}
gboolean two_out(Obj*, char** a, char** b, GError**) noexcept {
  *a = g_strdup("a");
  *b = nullptr;
  return TRUE;
}

TEST(MakeDBusMethod, SignaturesFollowTheHandler) {
  constexpr DBusMethodEntry e1 = VORN_DBUS_METHOD("NoArgs", no_args);
  constexpr DBusMethodEntry e2 = VORN_DBUS_METHOD("InOut", in_out);
  constexpr DBusMethodEntry e3 = VORN_DBUS_METHOD("SetPIN", set_pin);
  constexpr DBusMethodEntry e4 = VORN_DBUS_METHOD("TwoOut", two_out);
  EXPECT_STREQ("NoArgs", e1.name);
  EXPECT_STREQ("", e1.inSignature);
  EXPECT_STREQ("", e1.outSignature);
  EXPECT_STREQ("s", e2.inSignature);
  EXPECT_STREQ("s", e2.outSignature);
  EXPECT_STREQ("sssb", e3.inSignature);
  EXPECT_STREQ("", e3.outSignature);
  EXPECT_STREQ("", e4.inSignature);
  EXPECT_STREQ("ss", e4.outSignature);
}

TEST(MakeDBusMethod, InvokerPassesArgumentsInOrder) {
  Obj o;
  GError* error = nullptr;
  char* outs[3] = {nullptr, nullptr, nullptr};

  const DBusMethodEntry e1 = VORN_DBUS_METHOD("NoArgs", no_args);
  GVariant* none = g_variant_ref_sink(g_variant_new("()"));
  EXPECT_TRUE(e1.invoke(&o, none, outs, &error));
  EXPECT_EQ("no_args", o.seen);
  g_variant_unref(none);

  const DBusMethodEntry e2 = VORN_DBUS_METHOD("InOut", in_out);
  GVariant* one = g_variant_ref_sink(g_variant_new("(s)", "hello"));
  EXPECT_TRUE(e2.invoke(&o, one, outs, &error));
  EXPECT_EQ("hello", o.seen);
  EXPECT_STREQ("out", outs[0]);
  g_clear_pointer(&outs[0], g_free);
  g_variant_unref(one);

  const DBusMethodEntry e3 = VORN_DBUS_METHOD("SetPIN", set_pin);
  GVariant* four = g_variant_ref_sink(g_variant_new("(sssb)", "d", "1234", "5678", TRUE));
  EXPECT_FALSE(e3.invoke(&o, four, outs, &error));
  EXPECT_EQ("d123456781", o.seen);
  ASSERT_NE(nullptr, error);
  EXPECT_EQ(2, error->code);
  g_clear_error(&error);
  g_variant_unref(four);

  const DBusMethodEntry e4 = VORN_DBUS_METHOD("TwoOut", two_out);
  GVariant* empty = g_variant_ref_sink(g_variant_new("()"));
  EXPECT_TRUE(e4.invoke(&o, empty, outs, &error));
  EXPECT_STREQ("a", outs[0]);
  EXPECT_EQ(nullptr, outs[1]);
  g_clear_pointer(&outs[0], g_free);
  g_variant_unref(empty);
}

}  // namespace
}  // namespace dbus
}  // namespace vornnetsdk
