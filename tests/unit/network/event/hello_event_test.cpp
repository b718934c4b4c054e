// The sample event: its text, its validity and its own processing.
#include "vornwireless/network/event/hello_event.h"

#include <gtest/gtest.h>

#include "support/syslog_capture.h"

namespace ev = vornnetwork::network::event;
using vorntest::LogLine;
using vorntest::SyslogCapture;

TEST(HelloEvent, TypeTextAndValidity) {
  ev::HelloEvent hello("hi there");
  EXPECT_EQ(hello.GetType(), ev::EVENT_HELLO);
  EXPECT_TRUE(hello.IsValid());
  EXPECT_EQ(hello.ToStr(), "event:[1]/ msg:[hi there]\n");
  EXPECT_FALSE(ev::HelloEvent("").IsValid());
}

TEST(HelloEvent, ProcessEventLogsAndSucceeds) {
  ev::HelloEvent hello("x");
  SyslogCapture log;
  EXPECT_EQ(hello.ProcessEvent(), 0);
  EXPECT_TRUE(log.HasOnce(LOG_INFO, LogLine("network/event/hello_event.cpp",
                                            "process by hello event")))
      << log.Dump();
}

TEST(HelloEvent, EmptyMessageIsRefusedByProcess) {
  ev::HelloEvent hello("");
  SyslogCapture log;
  EXPECT_EQ(hello.Process(), -1);
  EXPECT_FALSE(hello.IsNotified());
  EXPECT_FALSE(hello.IsProcessed());
  EXPECT_TRUE(log.Matching("process by hello event").empty()) << log.Dump();
  EXPECT_EQ(log.Matching("network/event/base_event.cpp:\\d+ The event \\[event:\\[1\\]/ msg:\\[\\]")
                .size(),
            1u)
      << log.Dump();
}
