#include <gtest/gtest.h>

#include "common/log.h"
#include "platform/olib/olib_error.h"
#include "tests/support/test_support.h"

TEST(Log, PrefixesFileBaseNameAndLineAndSeesTheCallersErrno) {
  LogCapture log;
  int line = __LINE__ + 1;
  ORVA_LOG("Key is not existed");
  errno = ENOENT;
  ORVA_LOG("%s failed.(errno:%d/%m)", "mkdir", errno);
  EXPECT_TRUE(log.Contains("log_test.cc:" + std::to_string(line) + " Key is not existed\n"))
      << log.Text();
  EXPECT_TRUE(log.Contains(" mkdir failed.(errno:2/No such file or directory)\n")) << log.Text();
}

TEST(Log, AppendsTheSystemLibraryLastError) {
  OLIBCErrSet(0x2A, "/src/olib/olib_file.cc", 77);
  LogCapture log;
  ORVA_LOG_LASTERR("Open %s failed", "/usr/orva/etc/ssl/cfg.d/ca.cfg");
  EXPECT_TRUE(log.Contains(" Open /usr/orva/etc/ssl/cfg.d/ca.cfg failed[0x002A olib_file.cc:77]\n"))
      << log.Text();
}

TEST(Log, AsVariantNamesTheCallersFile) {
  OLIBCErrSet(0x1001, "olib_plugin.cc", 12);
  LogCapture log;
  ORVA_LOG_AS("/src/upload/uploadsslca.cc", "Failed to restart %s", "FTP");
  ORVA_LOG_LASTERR_AS("/src/upload/uploadsslca.cc", "Fail to do certificate plugin init ");
  EXPECT_TRUE(log.Contains("uploadsslca.cc:")) << log.Text();
  EXPECT_TRUE(log.Contains(" Failed to restart FTP\n")) << log.Text();
  EXPECT_TRUE(log.Contains(" Fail to do certificate plugin init [0x1001 olib_plugin.cc:12]\n"))
      << log.Text();
  EXPECT_FALSE(log.Contains("log_test.cc")) << log.Text();
}
