#include <gtest/gtest.h>

#include "platform/olib/orva_conf.h"
#include "platform/olib/orva_root.h"
#include "tests/support/test_support.h"

TEST(OrvaConf, ReadsQuotedAndBareValuesOfTheDeviceRoot) {
  TempDeviceRoot root;
  EXPECT_EQ("", OrvaConf().Info("runHTTPS", "")) << "a missing file has no settings";
  root.WriteFile("/usr/orva/etc/orva.conf",
                 "# system settings\nrunHTTPS=\"yes\"\nrunWebHTTPS=no\n\nspaced=\"yes \"\r\n");
  OrvaConf conf;
  EXPECT_EQ("yes", conf.Info("runHTTPS", ""));
  EXPECT_EQ("no", conf.Info("runWebHTTPS", ""));
  EXPECT_EQ("yes ", conf.Info("spaced", ""));
  EXPECT_EQ("", conf.Info("unset", ""));
}

TEST(OrvaRoot, PlacesDevicePathsUnderTheRoot) {
  TempDeviceRoot root;
  EXPECT_EQ(root.root() + "/usr/orva/etc/ssl", OrvaPath("/usr/orva/etc/ssl"));
  setenv("ORVA_ROOT", (root.root() + "/").c_str(), 1);
  EXPECT_EQ(root.root() + "/usr/orva", OrvaPath("/usr/orva"));
  setenv("ORVA_ROOT", "", 1);
  EXPECT_EQ("/usr/orva", OrvaPath("/usr/orva"));
}
