#include <syslog.h>

#include <gtest/gtest.h>

// Every test binary logs to stderr as well, so LogCapture sees the texts.
int main(int argc, char** argv) {
  openlog("orva-test", LOG_PERROR, LOG_USER);
  testing::InitGoogleTest(&argc, argv);
  return RUN_ALL_TESTS();
}
