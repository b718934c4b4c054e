// The event log action: its argv, a missing action, a failing one.
#include "vornplatform/log_event.h"

#include <gtest/gtest.h>

#include "fixtures/fake_journal.h"
#include "support/test_util.h"
#include "vornplatform/err.h"

namespace {
const char kAction[] = "/usr/vorn/libexec/platform/VORNLogSet1";
}

TEST(VORNLogSet1, MissingActionIsASuccess) {
  vorntest::Run({"/bin/rm", "-f", kAction});
  EXPECT_EQ(VORNLogSet1(2, 1, 0x11801311, "a", "b", "", ""), 0);
}

TEST(VORNLogSet1, ArgumentsAsArgv) {
  ASSERT_TRUE(vorntest::InstallFake(kAction));
  vorntest::ClearFakeJournal();
  EXPECT_EQ(VORNLogSet1(2, 1, 0x11801311, "10.0.0.1", "10.0.0.2", "", ""), 0);
  EXPECT_EQ(VORNLogSet1(2, 1, 0x1180130f, nullptr, "x y; z", nullptr, "d"), 0);
  auto calls = vorntest::FakeCallsTo(kAction);
  ASSERT_EQ(calls.size(), 2u);
  EXPECT_EQ(calls[0].argv,
            (std::vector<std::string>{"2", "1", "0x11801311", "10.0.0.1", "10.0.0.2", "", ""}));
  EXPECT_EQ(calls[1].argv,
            (std::vector<std::string>{"2", "1", "0x1180130f", "", "x y; z", "", "d"}));
}

TEST(VORNLogSet1, FailingActionIsAFailure) {
  ASSERT_TRUE(vorntest::InstallFake(kAction));
  Json::Value reply;
  reply["exit"] = 3;
  ASSERT_TRUE(vorntest::AddFakeReply(kAction, reply));
  VLIBCErrClear();
  EXPECT_EQ(VORNLogSet1(2, 1, 0x11801310, "a", "", "", ""), -1);
  EXPECT_EQ(VLIBCErrGet(), 0x400);
  Json::Value none(Json::objectValue);
  vorntest::WriteFakeReplies(none);
}
