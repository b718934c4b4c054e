// The event table: validity checks, one entry per module, registration order, removal.
#include "vornwireless/network/event/event_table.h"

#include <gtest/gtest.h>

#include "../fake_modules.h"
#include "support/syslog_capture.h"

namespace mod = vornnetwork::network::module;
namespace ev = vornnetwork::network::event;
using ev::EventHandler;
using ev::EventTable;
using vorntest::LogLine;
using vorntest::SyslogCapture;

namespace {

const char kFile[] = "network/event/event_table.cpp";

mod::EVENT_HANDLER Handler() {
  return static_cast<mod::EVENT_HANDLER>(&vorntest::FakeModule::OnEvent);
}

std::vector<int> Modules(EventTable::HandlerList const& list) {
  std::vector<int> out;
  for (auto const& h : list) out.push_back(h.module);
  return out;
}

}  // namespace

TEST(EventHandler, IsModuleAndEquality) {
  EventHandler a(mod::MODULE_ROUTE, Handler());
  EXPECT_TRUE(a.IsModule(mod::MODULE_ROUTE));
  EXPECT_FALSE(a.IsModule(mod::MODULE_IPV6));
  EXPECT_TRUE(a == EventHandler(mod::MODULE_ROUTE, Handler()));
  EXPECT_FALSE(a == EventHandler(mod::MODULE_IPV6, Handler()));
  EXPECT_FALSE(a == EventHandler(mod::MODULE_ROUTE, nullptr));
}

TEST(EventTable, AddKeepsRegistrationOrder) {
  EventTable table;
  EXPECT_EQ(table.Add(ev::EVENT_HELLO, EventHandler(mod::MODULE_NETLINK, Handler())), 0);
  EXPECT_EQ(table.Add(ev::EVENT_HELLO, EventHandler(mod::MODULE_IPV6, Handler())), 0);
  EXPECT_EQ(table.Add(ev::EVENT_VALID, EventHandler(mod::MODULE_ROUTE, Handler())), 0);
  EXPECT_EQ(table.Add(ev::EVENT_HELLO, EventHandler(mod::MODULE_TEST, Handler())), 0);
  EXPECT_EQ(Modules(table.ListHandlers(ev::EVENT_HELLO)), (std::vector<int>{5, 2, 1}));
  EXPECT_EQ(Modules(table.ListHandlers(ev::EVENT_VALID)), (std::vector<int>{3}));
  EXPECT_EQ(table.ToStr(), "event[1]/ modules[5, 2, 1, ]event[2]/ modules[3, ]");
  EXPECT_TRUE(table.IsEventExist(ev::EVENT_HELLO));
}

TEST(EventTable, RefusesInvalidEventsAndHandlers) {
  EventTable table;
  SyslogCapture log;
  EXPECT_EQ(table.Add(static_cast<ev::EVENT_TYPE>(3), EventHandler(mod::MODULE_ROUTE, Handler())),
            -1);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "event [3] is invalid"))) << log.Dump();
  EXPECT_EQ(table.Add(static_cast<ev::EVENT_TYPE>(0), EventHandler(mod::MODULE_ROUTE, Handler())),
            -1);
  EXPECT_EQ(table.Add(ev::EVENT_HELLO, EventHandler(static_cast<mod::MODULE_TYPE>(6), Handler())),
            -1);
  EXPECT_EQ(table.Add(ev::EVENT_HELLO, EventHandler(static_cast<mod::MODULE_TYPE>(0), Handler())),
            -1);
  EXPECT_EQ(table.Add(ev::EVENT_HELLO, EventHandler(mod::MODULE_ROUTE, nullptr)), -1);
  EXPECT_EQ(log.Matching(LogLine(kFile, "invalid handler")).size(), 3u) << log.Dump();
  EXPECT_EQ(table.ToStr(), "");
  EXPECT_TRUE(table.ListHandlers(ev::EVENT_HELLO).empty());
}

TEST(EventTable, SameModuleTwiceFailsAndLeavesOneHandler) {
  EventTable table;
  ASSERT_EQ(table.Add(ev::EVENT_HELLO, EventHandler(mod::MODULE_ROUTE, Handler())), 0);
  ASSERT_EQ(table.Add(ev::EVENT_HELLO, EventHandler(mod::MODULE_IPV6, Handler())), 0);
  SyslogCapture log;
  EXPECT_EQ(table.Add(ev::EVENT_HELLO, EventHandler(mod::MODULE_ROUTE, Handler())), -1);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "The module [3] has been registered.")))
      << log.Dump();
  EXPECT_EQ(Modules(table.ListHandlers(ev::EVENT_HELLO)), (std::vector<int>{3, 2}));
}

TEST(EventTable, RemoveClosesUpAndDropsEmptyEvents) {
  EventTable table;
  for (auto m : {mod::MODULE_NETLINK, mod::MODULE_IPV6, mod::MODULE_ROUTE}) {
    ASSERT_EQ(table.Add(ev::EVENT_HELLO, EventHandler(m, Handler())), 0);
  }
  EXPECT_EQ(table.Remove(ev::EVENT_HELLO, mod::MODULE_IPV6), 0);
  EXPECT_EQ(Modules(table.ListHandlers(ev::EVENT_HELLO)), (std::vector<int>{5, 3}));
  EXPECT_EQ(table.Remove(ev::EVENT_HELLO, mod::MODULE_TEST), 0);  // not there: no failure
  EXPECT_EQ(table.Remove(ev::EVENT_VALID, mod::MODULE_TEST), 0);  // no entry: no failure
  EXPECT_EQ(table.Remove(ev::EVENT_HELLO, mod::MODULE_NETLINK), 0);
  EXPECT_EQ(table.Remove(ev::EVENT_HELLO, mod::MODULE_ROUTE), 0);
  EXPECT_FALSE(table.IsEventExist(ev::EVENT_HELLO));
  EXPECT_TRUE(table.ListHandlers(ev::EVENT_HELLO).empty());
  EXPECT_EQ(table.ToStr(), "");
}

TEST(EventTable, RemoveModuleFromEveryEvent) {
  EventTable table;
  ASSERT_EQ(table.Add(ev::EVENT_HELLO, EventHandler(mod::MODULE_ROUTE, Handler())), 0);
  ASSERT_EQ(table.Add(ev::EVENT_HELLO, EventHandler(mod::MODULE_IPV6, Handler())), 0);
  ASSERT_EQ(table.Add(ev::EVENT_VALID, EventHandler(mod::MODULE_ROUTE, Handler())), 0);
  EXPECT_TRUE(table.RemoveModule(mod::MODULE_ROUTE));
  EXPECT_EQ(table.ToStr(), "event[1]/ modules[2, ]");
  EXPECT_TRUE(table.RemoveModule(mod::MODULE_DEVICELIST));
}

TEST(EventTable, Lookups) {
  EventTable table;
  ASSERT_EQ(table.Add(ev::EVENT_HELLO, EventHandler(mod::MODULE_ROUTE, Handler())), 0);
  auto it = table.FindEvent(ev::EVENT_HELLO);
  EXPECT_EQ(it->first, ev::EVENT_HELLO);
  EXPECT_EQ(table.FindModule(it->second, mod::MODULE_ROUTE)->module, mod::MODULE_ROUTE);
  EXPECT_EQ(table.FindModule(it->second, mod::MODULE_IPV6), it->second.end());
  EXPECT_EQ(table.FindConstModule(it->second, mod::MODULE_ROUTE)->module, mod::MODULE_ROUTE);
  EXPECT_FALSE(table.IsEventExist(ev::EVENT_VALID));
}
