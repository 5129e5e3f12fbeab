#include <sys/stat.h>

#include <string>

#include <gtest/gtest.h>

#include "platform/olib/olib_error.h"
#include "platform/olib/olib_file.h"
#include "platform/olib/olib_unicode.h"
#include "tests/support/test_support.h"

namespace {
ino_t Inode(const std::string& path) {
  struct stat info;
  return stat(path.c_str(), &info) == 0 ? info.st_ino : 0;
}
}  // namespace

TEST(OlibFile, BomStripRemovesTheMarkInPlaceAndLeavesOtherFilesAlone) {
  TempDeviceRoot root;
  std::string marked = root.Path("/upload.pem");
  root.WriteFile("/upload.pem", "\xEF\xBB\xBF-----BEGIN X-----\nbody\n", 0640);
  ASSERT_EQ(0, OLIBCFileUTF8BomStrip(marked.c_str()));
  EXPECT_EQ("-----BEGIN X-----\nbody\n", ReadFile(marked));
  EXPECT_EQ(0640, FileMode(marked));

  std::string plain = root.Path("/plain.pem");
  root.WriteFile("/plain.pem", "\xEF\xBB no full mark", 0600);
  ino_t before = Inode(plain);
  ASSERT_EQ(0, OLIBCFileUTF8BomStrip(plain.c_str()));
  EXPECT_EQ(before, Inode(plain)) << "the file must not be rewritten";
  EXPECT_EQ("\xEF\xBB no full mark", ReadFile(plain));

  EXPECT_EQ(-1, OLIBCFileUTF8BomStrip(root.Path("/missing").c_str()));
  EXPECT_EQ(ENOENT, OLIBCErrGet());
  EXPECT_STREQ("olib_file.cc", OLIBCErrorGetFile());
  EXPECT_GT(OLIBCErrorGetLine(), 0);
  EXPECT_EQ(-1, OLIBCFileUTF8BomStrip(nullptr));
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
  EXPECT_EQ(0, OLIBCUnicodeIsUTF8(nullptr));
}

TEST(OlibFile, SafeFileNamesNameOneEntry) {
  EXPECT_TRUE(OLIBIsSafeFileName("httpd_user-2.d"));
  for (const char* name : {"", ".", "..", "a/b", "../x", "a b", "a;b", "$(x)"}) {
    EXPECT_FALSE(OLIBIsSafeFileName(name)) << name;
  }
  EXPECT_FALSE(OLIBIsSafeFileName(nullptr));
}
