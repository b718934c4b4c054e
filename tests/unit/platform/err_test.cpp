#include "vornplatform/err.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <string>
#include <thread>

namespace {

TEST(ErrRegister, StartsClearAndRecordsCodeFileLineErrno) {
  VLIBCErrClear();
  EXPECT_EQ(VLIBCErrGet(), 0);
  EXPECT_STREQ(VLIBCErrGetFile(), "");
  EXPECT_EQ(VLIBCErrGetLine(), 0);

  errno = ENOENT;
  VLIBCErrSetEx(VLIBC_ERR_NOT_FOUND, "utils/config.cpp", 42);
  EXPECT_EQ(errno, ENOENT) << "recording must not change errno";
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_NOT_FOUND);
  EXPECT_STREQ(VLIBCErrGetFile(), "utils/config.cpp");
  EXPECT_EQ(VLIBCErrGetLine(), 42);
  EXPECT_EQ(VLIBCErrGetErrno(), ENOENT);

  VLIBCErrClear();
  EXPECT_EQ(VLIBCErrGet(), 0);
  EXPECT_STREQ(VLIBCErrGetFile(), "");
  EXPECT_EQ(VLIBCErrGetErrno(), 0);
}

TEST(ErrRegister, MacroCapturesSourcePathBelowSrc) {
  VLIBCErrClear();
  const int line = __LINE__ + 1;
  VLIBC_ERR_SET(VLIBC_ERR_BAD_PARAMETER);
  EXPECT_EQ(VLIBCErrGet(), 0x0D00);
  EXPECT_EQ(VLIBCErrGetLine(), line);
  // This file lives under tests/, not src/: the whole compiler path is kept, never cut short.
  EXPECT_NE(std::string(VLIBCErrGetFile()).find("err_test.cpp"), std::string::npos);
}

TEST(ErrRegister, NullFileAndLongFileAreSafe) {
  VLIBCErrSetEx(VLIBC_ERR_IO, nullptr, 7);
  EXPECT_STREQ(VLIBCErrGetFile(), "");
  const std::string longName(1000, 'x');
  VLIBCErrSetEx(VLIBC_ERR_IO, longName.c_str(), 8);
  EXPECT_LT(std::string(VLIBCErrGetFile()).size(), longName.size());
  EXPECT_EQ(std::string(VLIBCErrGetFile()),
            std::string(std::string(VLIBCErrGetFile()).size(), 'x'));
}

TEST(ErrRegister, IsPerThread) {
  VLIBCErrSetEx(VLIBC_ERR_BUSY, "a.cpp", 1);
  int otherBefore = -1;
  int otherAfter = -1;
  std::thread t([&] {
    otherBefore = VLIBCErrGet();
    VLIBCErrSetEx(VLIBC_ERR_CRYPT, "b.cpp", 2);
    otherAfter = VLIBCErrGet();
  });
  t.join();
  EXPECT_EQ(otherBefore, 0);
  EXPECT_EQ(otherAfter, VLIBC_ERR_CRYPT);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_BUSY);
  EXPECT_STREQ(VLIBCErrGetFile(), "a.cpp");
}

}  // namespace
