// Services and plug-ins.

#include <string>

#include <gtest/gtest.h>

#include "platform/olib/olib_error.h"
#include "platform/olib/olib_plugin.h"
#include "platform/olib/olib_service.h"
#include "tests/support/test_support.h"

// A service is enabled when its file is executable; names that are not one
// folder entry are refused.
TEST(OlibService, OnlyAnExecutableServiceFileIsEnabled) {
  TempDeviceRoot root;
  root.WriteFile("/usr/orva/etc/services/pagora", "#!/bin/sh\n", 0644);
  EXPECT_EQ(0, OLIBServiceIsEnabled("pagora"));
  EXPECT_EQ(0, OLIBServiceIsEnabled("missing"));
  EXPECT_LT(OLIBServiceRestart("../../bin/sh"), 0);
  EXPECT_EQ(OLIB_ERR_BAD_ARGUMENT, OLIBCErrGet());
}

TEST(OlibPlugin, ActionRunsEveryPluginOfTheGroupInNameOrderDespiteFailures) {
  TempDeviceRoot root;
  const std::string group = "/usr/orva/etc/plugins/certificate/";
  root.WriteScript(group + "20-second", "echo \"second $1 $2\" >> \"$ORVA_ROOT/plugins.log\"");
  root.WriteScript(group + "10-first",
                   "echo \"first $1 $2\" >> \"$ORVA_ROOT/plugins.log\"; exit 1");
  OLIBPLUGIN_HANDLE handle = nullptr;
  ASSERT_EQ(0, OLIBPluginSDKInit("certificate", "certificate/change", &handle));
  EXPECT_LT(OLIBPluginAction(5, handle), 0) << "one plug-in failed";
  OLIBPluginExit(handle);
  EXPECT_EQ("first certificate/change 5\nsecond certificate/change 5\n",
            ReadFile(root.Path("/plugins.log")));
  OLIBPLUGIN_HANDLE refused = nullptr;
  EXPECT_LT(OLIBPluginSDKInit("../etc", "certificate/change", &refused), 0);
  EXPECT_EQ(nullptr, refused);
}
