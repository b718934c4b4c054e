#include "vornplatform/str.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace {

std::vector<std::string> Items(PVLIBSZLIST l) {
  std::vector<std::string> v;
  for (int i = 0; i < VLIBCSzListCount(l); ++i) v.emplace_back(VLIBCSzListGet(l, i));
  return v;
}

TEST(StrTrimSpace, TrimsBothEndsInPlace) {
  char a[] = "  \t hello world \r\n";
  EXPECT_EQ(VLIBCStrTrimSpace(a), a);
  EXPECT_STREQ(a, "hello world");
  char b[] = "   ";
  EXPECT_STREQ(VLIBCStrTrimSpace(b), "");
  char c[] = "";
  EXPECT_STREQ(VLIBCStrTrimSpace(c), "");
  char d[] = "x";
  EXPECT_STREQ(VLIBCStrTrimSpace(d), "x");
  EXPECT_EQ(VLIBCStrTrimSpace(nullptr), nullptr);
}

TEST(StrSep, SplitsKeepingEmptyPieces) {
  PVLIBSZLIST l = VLIBCSzListAlloc(8);
  EXPECT_EQ(VLIBCStrSep("Vorn_USB_E3372_ x", "_", &l), 4);
  EXPECT_EQ(Items(l), (std::vector<std::string>{"Vorn", "USB", "E3372", " x"}));
  EXPECT_EQ(VLIBCStrSep("a__b", "_", &l), 3);  // list cleaned first
  EXPECT_EQ(Items(l), (std::vector<std::string>{"a", "", "b"}));
  EXPECT_EQ(VLIBCStrSep("a b\tc", " \t", &l), 3);
  EXPECT_EQ(Items(l), (std::vector<std::string>{"a", "b", "c"}));
  EXPECT_EQ(VLIBCStrSep("", "_", &l), 1);
  EXPECT_EQ(Items(l), (std::vector<std::string>{""}));
  VLIBCSzListFree(l);
}

TEST(StrSep, AllocatesListAndRefusesNull) {
  PVLIBSZLIST l = nullptr;
  EXPECT_EQ(VLIBCStrSep("x,y", ",", &l), 2);
  ASSERT_NE(l, nullptr);
  EXPECT_EQ(VLIBCStrSep(nullptr, ",", &l), -1);
  EXPECT_EQ(VLIBCStrSep("x", nullptr, &l), -1);
  EXPECT_EQ(VLIBCStrSep("x", ",", nullptr), -1);
  VLIBCSzListFree(l);
}

TEST(UnicodeIsUTF8, AcceptsValidText) {
  EXPECT_EQ(VLIBCUnicodeIsUTF8(""), 1);
  EXPECT_EQ(VLIBCUnicodeIsUTF8("plain ascii"), 1);
  EXPECT_EQ(VLIBCUnicodeIsUTF8("gr\xC3\xBC\xC3\x9F"
                               "e \xE2\x82\xAC \xF0\x9F\x98\x80"),
            1);
  EXPECT_EQ(VLIBCUnicodeIsUTF8("\xEF\xBB\xBFwith bom"), 1);
  EXPECT_EQ(VLIBCUnicodeIsUTF8("\xF4\x8F\xBF\xBF"), 1);  // U+10FFFF
}

TEST(UnicodeIsUTF8, RefusesInvalidText) {
  EXPECT_EQ(VLIBCUnicodeIsUTF8("latin1 \xE9t\xE9"), 0);
  EXPECT_EQ(VLIBCUnicodeIsUTF8("\xC0\xAF"), 0);          // overlong '/'
  EXPECT_EQ(VLIBCUnicodeIsUTF8("\xE0\x80\xAF"), 0);      // overlong
  EXPECT_EQ(VLIBCUnicodeIsUTF8("\xED\xA0\x80"), 0);      // surrogate
  EXPECT_EQ(VLIBCUnicodeIsUTF8("\xF4\x90\x80\x80"), 0);  // above U+10FFFF
  EXPECT_EQ(VLIBCUnicodeIsUTF8("\x80"), 0);              // lone continuation
  EXPECT_EQ(VLIBCUnicodeIsUTF8("abc\xE2\x82"), 0);       // cut short
  EXPECT_EQ(VLIBCUnicodeIsUTF8("\xFF"), 0);
  EXPECT_EQ(VLIBCUnicodeIsUTF8(nullptr), 0);
}

}  // namespace
