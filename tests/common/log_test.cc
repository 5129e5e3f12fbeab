#include <cerrno>

#include <gtest/gtest.h>

#include "common/log.h"
#include "platform/olib/olib_error.h"
#include "tests/support/test_support.h"

// "FILE:LINE message": the reporting file's base name, or the caller's for
// the _AS forms; errno as the caller left it; the last error on request.
TEST(Log, PrefixesFileAndLineAndAppendsTheLastErrorOnRequest) {
  OLIBCErrSet(0x2A, "/src/olib/olib_file.cc", 77);
  LogCapture log;
  const std::string line = std::to_string(__LINE__ + 2);
  errno = ENOENT;
  ORVA_LOG("%s failed.(errno:%d/%m)", "mkdir", errno);
  ORVA_LOG_LASTERR_AS("/src/upload/caller.cc", 4242, "Open %s failed", "ca.cfg");
  EXPECT_EQ("orva-test: log_test.cc:" + line + " mkdir failed.(errno:2/No such file or directory)\n"
            "orva-test: caller.cc:4242 Open ca.cfg failed[0x002A olib_file.cc:77]\n",
            log.Text());
}
