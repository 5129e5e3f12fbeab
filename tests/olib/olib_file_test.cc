#include <sys/stat.h>

#include <string>

#include <gtest/gtest.h>

#include "platform/olib/olib_error.h"
#include "platform/olib/olib_file.h"
#include "platform/olib/olib_unicode.h"
#include "tests/support/test_support.h"

TEST(OlibFile, BomStripRemovesMarkInPlaceAndKeepsMode) {
  TempDeviceRoot root;
  root.WriteFile("/upload.pem", "\xEF\xBB\xBF-----BEGIN X-----\nbody\n", 0640);
  std::string path = root.Path("/upload.pem");

  ASSERT_EQ(0, OLIBCFileUTF8BomStrip(path.c_str()));

  EXPECT_EQ("-----BEGIN X-----\nbody\n", ReadFile(path));
  EXPECT_EQ(0640, FileMode(path));
}

TEST(OlibFile, BomStripLeavesFileWithoutMarkAlone) {
  TempDeviceRoot root;
  root.WriteFile("/plain.pem", "\xEF\xBB no full mark", 0600);
  std::string path = root.Path("/plain.pem");
  struct stat before;
  ASSERT_EQ(0, stat(path.c_str(), &before));

  ASSERT_EQ(0, OLIBCFileUTF8BomStrip(path.c_str()));

  struct stat after;
  ASSERT_EQ(0, stat(path.c_str(), &after));
  EXPECT_EQ(before.st_ino, after.st_ino) << "file must not be rewritten";
  EXPECT_EQ("\xEF\xBB no full mark", ReadFile(path));
}

TEST(OlibFile, BomStripOfMissingFileFailsWithLastError) {
  TempDeviceRoot root;
  EXPECT_EQ(-1, OLIBCFileUTF8BomStrip(root.Path("/missing").c_str()));
  EXPECT_EQ(ENOENT, OLIBCErrGet());
  EXPECT_STREQ("olib_file.cc", OLIBCErrorGetFile());
  EXPECT_GT(OLIBCErrorGetLine(), 0);
  EXPECT_EQ(-1, OLIBCFileUTF8BomStrip(nullptr));
}

TEST(OlibFile, FileExistAndUnlink) {
  TempDeviceRoot root;
  root.WriteFile("/a", "x");
  EXPECT_EQ(1, OLIBCFileExist(root.Path("/a").c_str()));
  EXPECT_EQ(0, OLIBCSysUnlink(root.Path("/a").c_str()));
  EXPECT_EQ(0, OLIBCFileExist(root.Path("/a").c_str()));
  EXPECT_EQ(-1, OLIBCSysUnlink(root.Path("/a").c_str()));
  EXPECT_EQ(0, OLIBCFileExist(""));
}

TEST(OlibUnicode, AcceptsWellFormedAndRefusesMalformedUtf8) {
  struct Case {
    const char* text;
    int valid;
  } cases[] = {
      {"plain ascii", 1},
      {"\xEF\xBB\xBF-----BEGIN CERTIFICATE-----", 1},
      {"Z\xC3\xBCrich \xE6\x9D\xB1\xE4\xBA\xAC \xF0\x9F\x94\x91", 1},
      {"", 1},
      {"\xC0\xAF", 0},          // overlong "/"
      {"\xE0\x80\xAF", 0},      // overlong three-byte form
      {"\xED\xA0\x80", 0},      // surrogate
      {"\xF4\x90\x80\x80", 0},  // above U+10FFFF
      {"\xC3", 0},              // cut sequence
      {"\x80start", 0},         // stray continuation byte
      {"\xFF", 0},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.text);
    EXPECT_EQ(c.valid, OLIBCUnicodeIsUTF8(c.text) != 0 ? 1 : 0);
  }
  EXPECT_EQ(0, OLIBCUnicodeIsUTF8(nullptr));
}

TEST(OlibFile, SafeFileNames) {
  EXPECT_TRUE(OLIBIsSafeFileName("ftpd-ssl"));
  EXPECT_TRUE(OLIBIsSafeFileName("httpd_user.2"));
  for (const char* name : {"", ".", "..", "a/b", "../x", "a b", "a;b", "$(x)"}) {
    SCOPED_TRACE(name);
    EXPECT_FALSE(OLIBIsSafeFileName(name));
  }
  EXPECT_FALSE(OLIBIsSafeFileName(nullptr));
}
