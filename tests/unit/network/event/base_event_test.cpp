// The event's two halves: notification through the manager and its own processing, each
// remembered so that a second Process repeats only the half that failed.
#include "vornwireless/network/event/base_event.h"

#include <gtest/gtest.h>

#include "../fake_modules.h"
#include "support/syslog_capture.h"
#include "vornwireless/network/event/hello_event.h"

namespace mod = vornnetwork::network::module;
namespace ev = vornnetwork::network::event;
using mod::ModuleManager;
using vorntest::CreateFake;
using vorntest::EventLog;
using vorntest::Fakes;
using vorntest::LogLine;
using vorntest::SyslogCapture;

namespace {

const char kFile[] = "network/event/base_event.cpp";

// An event of type 2 whose own processing fails as long as the test wants.
class CountingEvent : public ev::BaseEvent {
 public:
  CountingEvent() : BaseEvent(ev::EVENT_VALID) {}
  bool IsValid() const override { return valid; }
  int ProcessEvent() override {
    ++processed;
    return result;
  }
  bool valid = true;
  int result = 0;
  int processed = 0;
};

class BaseEventTest : public ::testing::Test {
 protected:
  void SetUp() override {
    vorntest::ClearManager();
    vorntest::ResetFakes();
  }
  void TearDown() override { vorntest::ClearManager(); }

  // Modules 2, 3 and 4 hooked to `event` in that order.
  void HookThree(ev::EVENT_TYPE event) {
    const ModuleManager::MODULE_INFO table[] = {
        {mod::MODULE_IPV6, true, CreateFake<mod::MODULE_IPV6>},
        {mod::MODULE_ROUTE, true, CreateFake<mod::MODULE_ROUTE>},
        {mod::MODULE_DEVICELIST, true, CreateFake<mod::MODULE_DEVICELIST>},
    };
    ASSERT_TRUE(ModuleManager::GetInstance().Initialize(table, 3));
    for (int t : {2, 3, 4}) {
      ASSERT_EQ(ModuleManager::GetInstance().HookEvent(
                    event, static_cast<mod::MODULE_TYPE>(t),
                    static_cast<mod::EVENT_HANDLER>(&vorntest::FakeModule::OnEvent)),
                0);
    }
  }
};

}  // namespace

TEST_F(BaseEventTest, BaseTextAndValidity) {
  CountingEvent e;
  EXPECT_EQ(e.ToStr(), "event:[2]");
  EXPECT_FALSE(e.IsNotified());
  EXPECT_FALSE(e.IsProcessed());
  for (int t = -1; t <= 4; ++t) EXPECT_EQ(ev::BaseEvent::IsValidEvent(t), t == 1 || t == 2) << t;
}

TEST_F(BaseEventTest, ProcessNotifiesThenProcessesOnce) {
  HookThree(ev::EVENT_VALID);
  CountingEvent e;
  EXPECT_EQ(e.Process(), 0);
  EXPECT_EQ(EventLog(), (std::vector<int>{2, 3, 4}));
  EXPECT_EQ(e.processed, 1);
  EXPECT_TRUE(e.IsNotified());
  EXPECT_TRUE(e.IsProcessed());
  EXPECT_EQ(e.Process(), 0);  // both done: nothing again
  EXPECT_EQ(EventLog().size(), 3u);
  EXPECT_EQ(e.processed, 1);
}

TEST_F(BaseEventTest, InvalidEventIsRefusedAndCallsNoHandler) {
  HookThree(ev::EVENT_VALID);
  CountingEvent e;
  e.valid = false;
  SyslogCapture log;
  EXPECT_EQ(e.Process(), -1);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "The event [event:[2]] is not valid.")))
      << log.Dump();
  EXPECT_TRUE(EventLog().empty());
  EXPECT_EQ(e.processed, 0);
}

TEST_F(BaseEventTest, FailingHandlerLeavesNotifiedClearAndIsRetriedWithAllHandlers) {
  HookThree(ev::EVENT_VALID);
  Fakes()[mod::MODULE_IPV6].eventResult = -1;
  CountingEvent e;
  SyslogCapture log;
  EXPECT_EQ(e.Process(), -1);
  EXPECT_EQ(EventLog(), (std::vector<int>{2, 3, 4}));  // later handlers still ran
  EXPECT_FALSE(e.IsNotified());
  EXPECT_TRUE(e.IsProcessed());  // the other half went on
  EXPECT_EQ(e.processed, 1);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Failed to notify event[2] to manager")))
      << log.Dump();
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Failed to notify event [2] to manager")))
      << log.Dump();

  Fakes()[mod::MODULE_IPV6].eventResult = 0;
  EXPECT_EQ(e.Process(), 0);
  EXPECT_EQ(EventLog(), (std::vector<int>{2, 3, 4, 2, 3, 4}));  // every handler again
  EXPECT_EQ(e.processed, 1);  // not processed again
  EXPECT_TRUE(e.IsNotified());
}

TEST_F(BaseEventTest, FailingProcessEventIsRetriedAloneNotificationNotRepeated) {
  HookThree(ev::EVENT_VALID);
  CountingEvent e;
  e.result = 3;
  SyslogCapture log;
  EXPECT_EQ(e.Process(), -1);
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine(kFile, "Failed to process event [event:[2]]")))
      << log.Dump();
  EXPECT_TRUE(e.IsNotified());
  EXPECT_FALSE(e.IsProcessed());
  EXPECT_EQ(EventLog().size(), 3u);

  e.result = 0;
  EXPECT_EQ(e.Process(), 0);
  EXPECT_EQ(EventLog().size(), 3u);  // no handler called again
  EXPECT_EQ(e.processed, 2);
  EXPECT_TRUE(e.IsProcessed());
}

TEST_F(BaseEventTest, EventWithoutHandlersIsNotifiedAtOnce) {
  CountingEvent e;
  EXPECT_EQ(e.Process(), 0);
  EXPECT_TRUE(e.IsNotified());
  EXPECT_EQ(e.processed, 1);
}
