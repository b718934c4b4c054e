#include "vornplatform/szhash.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "vornplatform/err.h"

namespace {

std::vector<std::string> WalkKeys(PVLIBSZHASH h) {
  std::vector<std::string> keys;
  for (int i = 0; i < h->nSlot; ++i) {
    if (h->pSlots[i].szKey != nullptr) keys.emplace_back(h->pSlots[i].szKey);
  }
  return keys;
}

TEST(SzHash, SetGetReplaceKeepsInsertionOrder) {
  PVLIBSZHASH h = VLIBCSzHashAlloc(4);
  ASSERT_NE(h, nullptr);
  EXPECT_EQ(VLIBCSzHashSetValue(h, "b", "1"), 0);
  EXPECT_EQ(VLIBCSzHashSetValue(h, "a", "2"), 0);
  EXPECT_EQ(VLIBCSzHashSetValue(h, "c", "3"), 0);
  EXPECT_EQ(VLIBCSzHashSetValue(h, "b", "replaced"), 0);
  EXPECT_STREQ(VLIBCSzHashGetValue(h, "b"), "replaced");
  EXPECT_STREQ(VLIBCSzHashGetValue(h, "a"), "2");
  EXPECT_EQ(VLIBCSzHashGetValue(h, "zz"), nullptr);
  EXPECT_EQ(WalkKeys(h), (std::vector<std::string>{"b", "a", "c"}));
  EXPECT_EQ(VLIBCSzHashCount(h), 3);
  VLIBCSzHashFree(h);
}

TEST(SzHash, GrowsBeyondCapacity) {
  PVLIBSZHASH h = VLIBCSzHashAlloc(2);
  ASSERT_NE(h, nullptr);
  for (int i = 0; i < 1000; ++i) {
    const std::string k = "key" + std::to_string(i);
    ASSERT_EQ(VLIBCSzHashSetValue(h, k.c_str(), std::to_string(i * 2).c_str()), 0);
  }
  EXPECT_EQ(VLIBCSzHashCount(h), 1000);
  EXPECT_GE(h->nCapacity, 1000);
  EXPECT_STREQ(VLIBCSzHashGetValue(h, "key999"), "1998");
  EXPECT_EQ(WalkKeys(h).front(), "key0");
  EXPECT_EQ(WalkKeys(h).back(), "key999");
  VLIBCSzHashFree(h);
}

TEST(SzHash, ZeroOrNegativeCapacityIsAHint) {
  for (int cap : {0, -5}) {
    PVLIBSZHASH h = VLIBCSzHashAlloc(cap);
    ASSERT_NE(h, nullptr);
    EXPECT_EQ(VLIBCSzHashSetValue(h, "k", "v"), 0);
    VLIBCSzHashFree(h);
  }
}

TEST(SzHash, RemovedKeyLeavesEmptySlot) {
  PVLIBSZHASH h = VLIBCSzHashAlloc(8);
  VLIBCSzHashSetValue(h, "a", "1");
  VLIBCSzHashSetValue(h, "clientenabled", "yes");
  VLIBCSzHashSetValue(h, "c", "3");
  EXPECT_EQ(VLIBCSzHashRemoveKey(h, "clientenabled"), 0);
  EXPECT_EQ(VLIBCSzHashRemoveKey(h, "absent"), 0);
  EXPECT_EQ(h->nSlot, 3);
  EXPECT_EQ(h->pSlots[1].szKey, nullptr);
  EXPECT_EQ(VLIBCSzHashGetValue(h, "clientenabled"), nullptr);
  EXPECT_EQ(VLIBCSzHashCount(h), 2);
  // A new key goes after the others.
  VLIBCSzHashSetValue(h, "d", "4");
  EXPECT_EQ(WalkKeys(h), (std::vector<std::string>{"a", "c", "d"}));
  VLIBCSzHashFree(h);
}

TEST(SzHash, RemovingAndAddingManyTimesStaysBounded) {
  PVLIBSZHASH h = VLIBCSzHashAlloc(4);
  VLIBCSzHashSetValue(h, "keep", "1");
  for (int i = 0; i < 10000; ++i) {
    const std::string k = "t" + std::to_string(i);
    ASSERT_EQ(VLIBCSzHashSetValue(h, k.c_str(), "x"), 0);
    ASSERT_EQ(VLIBCSzHashRemoveKey(h, k.c_str()), 0);
  }
  EXPECT_LE(h->nCapacity, 16);
  EXPECT_EQ(WalkKeys(h), (std::vector<std::string>{"keep"}));
  VLIBCSzHashFree(h);
}

TEST(SzHash, RemoveAllEmptiesAndStaysUsable) {
  PVLIBSZHASH h = VLIBCSzHashAlloc(8);
  VLIBCSzHashSetValue(h, "a", "1");
  VLIBCSzHashSetValue(h, "b", "2");
  EXPECT_EQ(VLIBCHashRemoveAll(h), 0);
  EXPECT_EQ(VLIBCSzHashCount(h), 0);
  EXPECT_EQ(VLIBCSzHashGetValue(h, "a"), nullptr);
  EXPECT_EQ(VLIBCSzHashSetValue(h, "c", "3"), 0);
  EXPECT_EQ(WalkKeys(h), (std::vector<std::string>{"c"}));
  VLIBCSzHashFree(h);
}

TEST(SzHash, NullValueIsStoredEmpty) {
  PVLIBSZHASH h = VLIBCSzHashAlloc(8);
  EXPECT_EQ(VLIBCSzHashSetValue(h, "k", nullptr), 0);
  EXPECT_STREQ(VLIBCSzHashGetValue(h, "k"), "");
  VLIBCSzHashFree(h);
}

TEST(SzHash, BadParametersAreRefused) {
  PVLIBSZHASH h = VLIBCSzHashAlloc(8);
  VLIBCErrClear();
  EXPECT_EQ(VLIBCSzHashSetValue(h, nullptr, "v"), -1);
  EXPECT_EQ(VLIBCErrGet(), VLIBC_ERR_BAD_PARAMETER);
  EXPECT_EQ(VLIBCSzHashSetValue(nullptr, "k", "v"), -1);
  EXPECT_EQ(VLIBCSzHashGetValue(nullptr, "k"), nullptr);
  EXPECT_EQ(VLIBCSzHashGetValue(h, nullptr), nullptr);
  EXPECT_EQ(VLIBCSzHashRemoveKey(nullptr, "k"), -1);
  EXPECT_EQ(VLIBCSzHashRemoveKey(h, nullptr), -1);
  EXPECT_EQ(VLIBCHashRemoveAll(nullptr), -1);
  EXPECT_EQ(VLIBCSzHashCount(nullptr), -1);
  VLIBCSzHashFree(nullptr);
  VLIBCSzHashFree(h);
}

TEST(SzList, PushGetGrowClean) {
  PVLIBSZLIST l = VLIBCSzListAlloc(1);
  ASSERT_NE(l, nullptr);
  for (int i = 0; i < 300; ++i) {
    ASSERT_EQ(VLIBCSzListPush(&l, std::to_string(i).c_str()), i + 1);
  }
  EXPECT_EQ(VLIBCSzListCount(l), 300);
  EXPECT_STREQ(VLIBCSzListGet(l, 0), "0");
  EXPECT_STREQ(VLIBCSzListGet(l, 299), "299");
  EXPECT_EQ(VLIBCSzListGet(l, 300), nullptr);
  EXPECT_EQ(VLIBCSzListGet(l, -1), nullptr);
  EXPECT_EQ(VLIBCSzListClean(l), 0);
  EXPECT_EQ(VLIBCSzListCount(l), 0);
  EXPECT_EQ(VLIBCSzListGet(l, 0), nullptr);
  EXPECT_EQ(VLIBCSzListPush(&l, "again"), 1);
  VLIBCSzListFree(l);
}

TEST(SzList, SetReplacesOrAppendsAtEnd) {
  PVLIBSZLIST l = VLIBCSzListAlloc(4);
  EXPECT_EQ(VLIBCSzListSet(&l, 0, "ppp_generic.ko"), 0);  // a fresh list: Set(0) appends
  EXPECT_EQ(VLIBCSzListCount(l), 1);
  EXPECT_EQ(VLIBCSzListSet(&l, 0, "slhc.ko"), 0);
  EXPECT_STREQ(VLIBCSzListGet(l, 0), "slhc.ko");
  EXPECT_EQ(VLIBCSzListCount(l), 1);
  EXPECT_EQ(VLIBCSzListSet(&l, 5, "x"), -1);
  EXPECT_EQ(VLIBCSzListSet(&l, -1, "x"), -1);
  EXPECT_EQ(VLIBCSzListSet(&l, 0, nullptr), -1);
  VLIBCSzListFree(l);
}

TEST(SzList, PushAllocatesNullList) {
  PVLIBSZLIST l = nullptr;
  EXPECT_EQ(VLIBCSzListPush(&l, "a"), 1);
  ASSERT_NE(l, nullptr);
  EXPECT_STREQ(VLIBCSzListGet(l, 0), "a");
  VLIBCSzListFree(l);
}

TEST(SzList, BadParameters) {
  PVLIBSZLIST l = VLIBCSzListAlloc(4);
  EXPECT_EQ(VLIBCSzListPush(nullptr, "a"), -1);
  EXPECT_EQ(VLIBCSzListPush(&l, nullptr), -1);
  EXPECT_EQ(VLIBCSzListCount(nullptr), -1);
  EXPECT_EQ(VLIBCSzListClean(nullptr), -1);
  EXPECT_EQ(VLIBCSzListGet(nullptr, 0), nullptr);
  VLIBCSzListFree(nullptr);
  VLIBCSzListFree(l);
}

}  // namespace

TEST(SzHash, EmptyKeyIsRefused) {
  PVLIBSZHASH h = VLIBCSzHashAlloc(2);
  ASSERT_NE(h, nullptr);
  VLIBCErrClear();
  EXPECT_EQ(-1, VLIBCSzHashSetValue(h, "", "v"));
  EXPECT_EQ(VLIBC_ERR_BAD_PARAMETER, VLIBCErrGet());
  EXPECT_EQ(0, VLIBCSzHashCount(h));
  VLIBCSzHashFree(h);
}
