#include <string>

#include <gtest/gtest.h>

#include "platform/olib/olib_szlist.h"

TEST(OlibSzList, SplitKeepsEmptyPiecesInOrder) {
  OLIBSzListPtr list(OLIBCSzListAlloc(512));
  ASSERT_NE(nullptr, list);
  OLIBSZLIST* raw = list.release();
  ASSERT_EQ(0, OLIBCStrSep("a;;b;", ";", &raw));
  list.reset(raw);

  ASSERT_EQ(4u, list->nItem);
  EXPECT_STREQ("a", OLIBCSzListGet(list.get(), 0));
  EXPECT_STREQ("", OLIBCSzListGet(list.get(), 1));
  EXPECT_STREQ("b", OLIBCSzListGet(list.get(), 2));
  EXPECT_STREQ("", OLIBCSzListGet(list.get(), 3));
  EXPECT_STREQ("", OLIBCSzListGet(list.get(), 4)) << "out of range is empty, never null";
}

TEST(OlibSzList, ItemCountIsTheSecondThirtyTwoBitField) {
  OLIBSzListPtr list(OLIBCSzListAlloc(16));
  OLIBSZLIST* raw = list.release();
  ASSERT_EQ(0, OLIBCStrSep("x;y;z", ";", &raw));
  list.reset(raw);
  const uint32_t* fields = reinterpret_cast<const uint32_t*>(list.get());
  EXPECT_EQ(3u, fields[1]);
}

TEST(OlibSzList, GrowsBeyondItsFirstSize) {
  OLIBSzListPtr list(OLIBCSzListAlloc(8));
  std::string text;
  for (int i = 0; i < 200; ++i) text += "name" + std::to_string(i) + ";";
  text += "last";
  OLIBSZLIST* raw = list.release();
  ASSERT_EQ(0, OLIBCStrSep(text.c_str(), ";", &raw));
  list.reset(raw);
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
