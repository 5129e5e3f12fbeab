#include <string>

#include <gtest/gtest.h>

#include "platform/olib/olib_szlist.h"

namespace {
// `text` split at ";" into a list that first had room for `size` bytes.
OLIBSzListPtr Split(const char* text, uint32_t size) {
  OLIBSZLIST* list = OLIBCSzListAlloc(size);
  EXPECT_EQ(0, OLIBCStrSep(text, ";", &list));
  return OLIBSzListPtr(list);
}
}  // namespace

TEST(OlibSzList, SplitKeepsEmptyPiecesInOrderAndCountsThemInTheSecondField) {
  OLIBSzListPtr list = Split("a;;b;", 512);
  EXPECT_EQ(4u, reinterpret_cast<const uint32_t*>(list.get())[1]);
  const char* expected[] = {"a", "", "b", "", ""};  // Out of range is empty, never null.
  for (uint32_t i = 0; i < 5; ++i) EXPECT_STREQ(expected[i], OLIBCSzListGet(list.get(), i)) << i;
}

TEST(OlibSzList, GrowsBeyondItsFirstSize) {
  std::string text;
  for (int i = 0; i < 200; ++i) text += "name" + std::to_string(i) + ";";
  OLIBSzListPtr list = Split((text + "last").c_str(), 8);
  ASSERT_EQ(201u, list->nItem);
  EXPECT_STREQ("name137", OLIBCSzListGet(list.get(), 137));
  EXPECT_STREQ("last", OLIBCSzListGet(list.get(), 200));
}

TEST(OlibSzList, NullArgumentsFail) {
  OLIBSZLIST* none = nullptr;
  EXPECT_EQ(-1, OLIBCStrSep("a", ";", &none));
  OLIBSzListPtr list(OLIBCSzListAlloc(8));
  OLIBSZLIST* raw = list.get();
  EXPECT_EQ(-1, OLIBCStrSep(nullptr, ";", &raw));
  EXPECT_EQ(0u, list->nItem);
}
