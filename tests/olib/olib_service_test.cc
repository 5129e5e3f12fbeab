#include <signal.h>
#include <time.h>

#include <string>

#include <gtest/gtest.h>

#include "platform/olib/olib_error.h"
#include "platform/olib/olib_plugin.h"
#include "platform/olib/olib_process.h"
#include "platform/olib/olib_service.h"
#include "tests/support/test_support.h"

TEST(OlibService, RestartRunsTheEnabledServiceExecutableAndReportsFailures) {
  TempDeviceRoot root;
  root.WriteScript("/usr/orva/etc/services/ftpd-ssl", "echo \"$1\" >> \"$ORVA_ROOT/ftpd.log\"");
  root.WriteFile("/usr/orva/etc/services/pagora", "#!/bin/sh\n", 0644);
  root.WriteScript("/usr/orva/etc/services/broken", "exit 3");

  EXPECT_NE(0, OLIBServiceIsEnabled("ftpd-ssl"));
  EXPECT_EQ(0, OLIBServiceRestart("ftpd-ssl"));
  EXPECT_EQ("restart\n", ReadFile(root.Path("/ftpd.log")));
  EXPECT_EQ(0, OLIBServiceIsEnabled("pagora")) << "not executable: disabled";
  EXPECT_EQ(0, OLIBServiceIsEnabled("missing"));
  EXPECT_LT(OLIBServiceRestart("broken"), 0);
  EXPECT_EQ(OLIB_ERR_CHILD_FAILED, OLIBCErrGet());
  EXPECT_LT(OLIBServiceRestart("missing"), 0);
  EXPECT_LT(OLIBServiceRestart("../../bin/sh"), 0);
  EXPECT_EQ(OLIB_ERR_BAD_ARGUMENT, OLIBCErrGet());
}

TEST(OlibProcess, WaitKillsChildThatOutlivesTheLimit) {
  const char* argv[] = {"/bin/sleep", "30", nullptr};
  pid_t pid = OLIBProcessSpawn(argv, nullptr);
  ASSERT_GT(pid, 0);
  time_t start = time(nullptr);
  EXPECT_EQ(-1, OLIBProcessWait(pid, 1));
  EXPECT_EQ(OLIB_ERR_TIMEOUT, OLIBCErrGet());
  EXPECT_LE(time(nullptr) - start, 5);
  EXPECT_NE(0, kill(pid, 0)) << "the child must be gone";
}

TEST(OlibPlugin, ActionRunsEveryPluginOfTheGroupInNameOrder) {
  TempDeviceRoot root;
  OLIBPLUGIN_HANDLE handle = nullptr;
  ASSERT_EQ(0, OLIBPluginSDKInit("certificate", "certificate/change", &handle));
  EXPECT_EQ(0, OLIBPluginAction(5, handle)) << "a group without plug-ins";
  OLIBPluginExit(handle);

  const std::string group = "/usr/orva/etc/plugins/certificate/";
  root.WriteScript(group + "20-second", "echo \"second $1 $2\" >> \"$ORVA_ROOT/plugins.log\"");
  root.WriteScript(group + "10-first",
                   "echo \"first $1 $2\" >> \"$ORVA_ROOT/plugins.log\"; exit 1");
  ASSERT_EQ(0, OLIBPluginSDKInit("certificate", "certificate/change", &handle));
  ASSERT_NE(0, OLIBPluginHasInit(handle));
  EXPECT_LT(OLIBPluginAction(5, handle), 0) << "one plug-in failed";
  OLIBPluginExit(handle);
  EXPECT_EQ("first certificate/change 5\nsecond certificate/change 5\n",
            ReadFile(root.Path("/plugins.log")));

  OLIBPLUGIN_HANDLE refused = nullptr;
  EXPECT_LT(OLIBPluginSDKInit("../etc", "certificate/change", &refused), 0);
  EXPECT_EQ(nullptr, refused);
  EXPECT_EQ(0, OLIBPluginHasInit(nullptr));
  EXPECT_LT(OLIBPluginAction(5, nullptr), 0);
}
