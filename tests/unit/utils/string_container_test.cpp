// Conversions and set operations between the string containers.
#include "vornwireless/utils/string_container.h"

#include <gtest/gtest.h>

#include "support/syslog_capture.h"
#include "support/test_util.h"

using namespace vornwireless::utils;
using vorntest::LogLine;
using vorntest::SyslogCapture;

namespace {
Json::Value Arr(std::initializer_list<const char*> items) {
  Json::Value v(Json::arrayValue);
  for (auto i : items) v.append(i);
  return v;
}
}  // namespace

TEST(ParseToVector, DropsEmptyPiecesAndTrimsTheOthers) {
  EXPECT_EQ((StrVector{"a", "b", "c d"}), ParseToVector(" a ,, b\t, c d ,", ","));
  EXPECT_EQ((StrVector{"x", "y", "z"}), ParseToVector("x;y, z", ";,"));
  EXPECT_TRUE(ParseToVector(nullptr, ",").empty());
  EXPECT_TRUE(ParseToVector("a,b", nullptr).empty());
  EXPECT_TRUE(ParseToVector("", ",").empty());
  EXPECT_TRUE(ParseToVector(" , ,", ",").empty());
}

TEST(ParseToVector, JsonArrayAndSetForms) {
  EXPECT_EQ(Arr({"b", "a", "b"}), ParseToJsonArray("b a b", " "));
  EXPECT_EQ((StrSet{"a", "b"}), ParseToSet("b a b", " "));
  EXPECT_EQ(Json::Value(Json::arrayValue), ParseToJsonArray(nullptr, " "));
}

TEST(ConvertToString, JsonValue) {
  EXPECT_EQ("null", ConvertToString(Json::Value()));
  Json::Value obj;
  obj["k"] = "v";
  EXPECT_EQ("{\n\t\"k\" : \"v\"\n}\n", ConvertToString(obj));
}

TEST(ConvertToString, RangesOfEveryContainer) {
  StrVector v{"a", "b", "c", "d"};
  EXPECT_EQ("a,b,c,d", ConvertToString(v, ","));
  EXPECT_EQ("b c", ConvertToString(v, " ", 1, 2));
  EXPECT_EQ("c d", ConvertToString(v, " ", 2, -1));
  EXPECT_EQ("c d", ConvertToString(v, " ", 2, 99));
  EXPECT_EQ("", ConvertToString(v, " ", 9, -1));
  EXPECT_EQ("a|b", ConvertToString(StrSet{"b", "a"}, "|"));
  EXPECT_EQ("x--y", ConvertToString(Arr({"w", "x", "y"}), "--", 1, -1));
  EXPECT_EQ("", ConvertToString(StrVector{}, ","));
}

TEST(ConvertToString, NonArrayAndBadElementsGiveEmptyAndAnErrorLine) {
  SyslogCapture log;
  Json::Value obj;
  obj["a"] = 1;
  EXPECT_EQ("", ConvertToString(obj, ","));
  EXPECT_TRUE(log.HasOnce(LOG_ERR, LogLine("utils/string_container.cpp", "Bad Parameter."))) << log.Dump();

  log.Clear();
  Json::Value mixed = Arr({"a"});
  mixed.append(Json::Value(Json::objectValue));
  EXPECT_EQ("", ConvertToString(mixed, ","));
  EXPECT_EQ(1u, log.Matching("^utils/string_container.cpp:[0-9]+ Failed to convert element 1 to string$").size())
      << log.Dump();
}

TEST(ConvertToJsonArray, FromEveryForm) {
  EXPECT_EQ(Arr({"b", "a"}), ConvertToJsonArray(StrVector{"b", "a"}));
  EXPECT_EQ(Arr({"a", "b"}), ConvertToJsonArray(StrSet{"b", "a"}));
  EXPECT_EQ(Json::Value(Json::arrayValue), ConvertToJsonArray(static_cast<PVLIBSZLIST>(nullptr)));
  PVLIBSZLIST list = VLIBCSzListAlloc(1);
  ASSERT_EQ(2, ConvertToVLIBList(StrVector{"x", "y"}, list));
  EXPECT_EQ(Arr({"x", "y"}), ConvertToJsonArray(list));
  VLIBCSzListFree(list);
}

TEST(ConvertToVLIBList, CleansTheListAndPushesEverything) {
  PVLIBSZLIST list = VLIBCSzListAlloc(2);
  ASSERT_NE(nullptr, list);
  ASSERT_EQ(1, VLIBCSzListPush(&list, "old"));
  // More items than the capacity: the list grows.
  EXPECT_EQ(5, ConvertToVLIBList(StrVector{"1", "2", "3", "4", "5"}, list));
  EXPECT_STREQ("1", VLIBCSzListGet(list, 0));
  EXPECT_STREQ("5", VLIBCSzListGet(list, 4));
  EXPECT_EQ(2, ConvertToVLIBList(StrSet{"b", "a"}, list));
  EXPECT_STREQ("a", VLIBCSzListGet(list, 0));
  EXPECT_EQ(1, ConvertToVLIBList(Arr({"j"}), list));
  EXPECT_EQ((StrVector{"j"}), ConvertToVector(list));
  EXPECT_EQ((StrSet{"j"}), ConvertToSet(list));
  VLIBCSzListFree(list);

  PVLIBSZLIST none = nullptr;
  EXPECT_EQ(-1, ConvertToVLIBList(StrVector{"a"}, none));
}

TEST(ConvertToSetAndVector, BetweenForms) {
  EXPECT_EQ((StrSet{"a", "b"}), ConvertToSet(StrVector{"b", "a", "b"}));
  EXPECT_EQ((StrVector{"a", "b"}), ConvertToVector(StrSet{"b", "a"}));
  EXPECT_EQ((StrVector{"b", "a", "b"}), ConvertToVector(Arr({"b", "a", "b"})));
  EXPECT_EQ((StrSet{"a", "b"}), ConvertToSet(Arr({"b", "a"})));
  EXPECT_TRUE(ConvertToVector(static_cast<PVLIBSZLIST>(nullptr)).empty());
  EXPECT_TRUE(ConvertToVector(Json::Value()).empty());
}

TEST(VectorSearch, FindIsExistRemove) {
  StrVector v{"a", "b", "a"};
  EXPECT_EQ(0, Find("a", v));
  EXPECT_EQ(1, Find("b", v));
  EXPECT_EQ(-1, Find("z", v));
  EXPECT_TRUE(IsExist("b", v));
  EXPECT_FALSE(IsExist("z", v));
  Remove("a", v);
  EXPECT_EQ((StrVector{"b", "a"}), v);
  Remove("z", v);
  EXPECT_EQ((StrVector{"b", "a"}), v);
}

TEST(GetElementInRange, Slices) {
  StrVector v{"0", "1", "2", "3"};
  EXPECT_EQ((StrVector{"1", "2"}), GetElementInRange(v, 1, 2));
  EXPECT_EQ((StrVector{"2", "3"}), GetElementInRange(v, 2, -1));
  EXPECT_EQ((StrVector{"2", "3"}), GetElementInRange(v, 2, 10));
  EXPECT_TRUE(GetElementInRange(v, 4, 1).empty());
  EXPECT_TRUE(GetElementInRange(v, 1, 0).empty());
}

TEST(GetDiff, EmptyArgumentsAndSortedUniqueResult) {
  EXPECT_TRUE(GetDiff(StrVector{}, StrVector{"a"}).empty());
  EXPECT_EQ((StrVector{"c", "a", "c"}), GetDiff(StrVector{"c", "a", "c"}, StrVector{}));
  EXPECT_EQ((StrVector{"a", "c"}), GetDiff(StrVector{"c", "b", "a", "c"}, StrVector{"b"}));
  EXPECT_TRUE(GetDiff(StrSet{}, StrSet{"a"}).empty());
  EXPECT_EQ((StrSet{"x"}), GetDiff(StrSet{"x"}, StrSet{}));
  EXPECT_EQ((StrSet{"a"}), GetDiff(StrSet{"a", "b"}, StrSet{"b", "z"}));
}

TEST(GetIntersection, SortedCommonElements) {
  EXPECT_EQ((StrVector{"a", "b"}), GetIntersection(StrVector{"b", "a", "c", "b"}, StrVector{"a", "b", "z"}));
  EXPECT_TRUE(GetIntersection(StrVector{}, StrVector{"a"}).empty());
  EXPECT_TRUE(GetIntersection(StrVector{"a"}, StrVector{}).empty());
  EXPECT_EQ((StrSet{"b"}), GetIntersection(StrSet{"a", "b"}, StrSet{"b"}));
  EXPECT_TRUE(GetIntersection(StrSet{"a"}, StrSet{}).empty());
}

TEST(GetUniqueStrVector, SortsAndDedupes) {
  StrVector v{"b", "a", "b", "c", "a"};
  EXPECT_EQ(3, GetUniqueStrVector(v));
  EXPECT_EQ((StrVector{"a", "b", "c"}), v);
}

TEST(Print, OneInfoLineEach) {
  SyslogCapture log;
  Print(StrVector{"a", "b"});
  Print(StrSet{"z", "y"});
  Print(Arr({"q"}));
  auto lines = log.Lines();
  ASSERT_EQ(3u, lines.size()) << log.Dump();
  for (auto& l : lines) EXPECT_EQ(LOG_INFO, l.level);
  EXPECT_TRUE(log.HasOnce(LOG_INFO, LogLine("utils/string_container.cpp", "a b")));
  EXPECT_TRUE(log.HasOnce(LOG_INFO, LogLine("utils/string_container.cpp", "y z")));
  EXPECT_TRUE(log.HasOnce(LOG_INFO, LogLine("utils/string_container.cpp", "[\"q\"]")));
}
