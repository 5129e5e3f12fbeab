// Files and texts: byte order marks, UTF-8 and names of one folder entry.

#include <string>

#include <gtest/gtest.h>

#include "platform/olib/olib_file.h"
#include "platform/olib/olib_unicode.h"
#include "tests/support/test_support.h"

TEST(OlibFile, BomStripRemovesTheMarkInPlaceKeepingTheMode) {
  TempDeviceRoot root;
  root.WriteFile("/marked.pem", "\xEF\xBB\xBF-----BEGIN X-----\n", 0640);
  root.WriteFile("/plain.pem", "\xEF\xBB no full mark", 0600);
  ASSERT_EQ(0, OLIBCFileUTF8BomStrip(root.Path("/marked.pem").c_str()));
  ASSERT_EQ(0, OLIBCFileUTF8BomStrip(root.Path("/plain.pem").c_str()));
  EXPECT_EQ("-----BEGIN X-----\n", ReadFile(root.Path("/marked.pem")));
  EXPECT_EQ(0640, FileMode(root.Path("/marked.pem")));
  EXPECT_EQ("\xEF\xBB no full mark", ReadFile(root.Path("/plain.pem")));
  EXPECT_EQ(-1, OLIBCFileUTF8BomStrip(root.Path("/missing").c_str()));
}

TEST(OlibFile, SafeFileNamesNameOneEntry) {
  EXPECT_TRUE(OLIBIsSafeFileName("httpd_user-2.d"));
  for (const char* name : {"", ".", "..", "a/b", "../x", "a b", "a;b", "$(x)"}) {
    EXPECT_FALSE(OLIBIsSafeFileName(name)) << name;
  }
}

TEST(OlibUnicode, AcceptsWellFormedAndRefusesMalformedUtf8) {
  const struct { const char* text; bool valid; } cases[] = {
      {"", true},
      {"\xEF\xBB\xBF-----BEGIN CERTIFICATE-----", true},
      {"Z\xC3\xBCrich \xE6\x9D\xB1\xE4\xBA\xAC \xF0\x9F\x94\x91", true},
      {"\xC0\xAF", false},          // overlong "/"
      {"\xE0\x80\xAF", false},      // overlong three-byte form
      {"\xED\xA0\x80", false},      // surrogate
      {"\xF4\x90\x80\x80", false},  // above U+10FFFF
      {"\xC3", false},              // cut sequence
      {"\x80start", false},         // stray continuation byte
      {"\xFF", false},
  };
  for (const auto& c : cases) {
    EXPECT_EQ(c.valid, OLIBCUnicodeIsUTF8(c.text) != 0) << c.text;
  }
}
