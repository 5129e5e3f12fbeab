// What each activation sequence restarts, in which order, what it logs
// (messages only, each naming the caller's file and line) and whether it asks for
// the host's restart.

#include <regex>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "tests/support/test_support.h"
#include "toolkit/activation.h"

TEST(Activation, RestartsEnabledServicesInTheSequencesOrderAndLogsEachFailureOnce) {
  const std::vector<std::string> all = {"ftpd-ssl", "webdav-httpd-ssl", "pagora", "httpd-user",
                                        "plugin"};  // "plugin" is the certificate plug-in
  const char kYes[] = "runHTTPS=\"yes\"\r\nrunWebHTTPS=yes\n";
  const char kCreated[] =
      "ftpd-ssl restart\npagora restart\nwebdav-httpd-ssl restart\nplugin certificate/change 5\n";
  const char kImported[] =
      "webdav-httpd-ssl restart\nftpd-ssl restart\npagora restart\nplugin certificate/change 5\n";
  const struct {
    ActivationSequence sequence;
    std::vector<std::string> services;
    int status;  // with which every script exits
    const char *configuration, *events, *log;
    bool host_restart;
  } cases[] = {
      {kActivateAfterCreation, all, 0, kYes, kCreated, "", true},
      {kActivateAfterImport, all, 0, kYes, kImported, "", true},
      // The host's restart follows runHTTPS alone; "httpd-user" stands in
      // for a disabled "pagora".
      {kActivateAfterImport, {"pagora"}, 0, "runWebHTTPS=no\nrunHTTPS=\"yes\"\n", "", "", true},
      {kActivateAfterImport, {"httpd-user"}, 0, "runWebHTTPS=yes\n", "httpd-user restart\n", "",
       false},
      {kActivateAfterCreation, all, 3, kYes, kCreated,
       "Failed to restart FTP\nFailed to restart Pagora\nFailed to restart https WebDAV\n"
       "Fail to do post action for certificate plugin\n", true},
      {kActivateAfterImport, all, 3, kYes, kImported,
       "Failed to restart https webdav\nFailed to restart service ftps\nFailed to restart Pagora\n"
       "Fail to do post action for certificate plugin\n", true},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(std::to_string(c.sequence) + " " + c.configuration + c.events + c.log);
    TempDeviceRoot root;
    for (const std::string& name : c.services) {
      root.WriteScript(name == "plugin" ? "/usr/orva/etc/plugins/certificate/notify"
                                        : "/usr/orva/etc/services/" + name,
                       "echo " + name + " $1 $2 >> \"$ORVA_ROOT/events\"; exit " +
                           std::to_string(c.status));
    }
    root.WriteFile("/usr/orva/etc/orva.conf", c.configuration);
    ORVA::APIResponse response;
    Json::Value result(Json::objectValue);
    result["restart_httpd"] = false;
    OLIBPLUGIN_HANDLE handle = nullptr;
    LogCapture log;
    activateCertificate(c.sequence, &response, result, OrvaConf(), &handle, "/src/caller.cc",
                        4242);
    const std::regex prefix("orva-test: caller\\.cc:4242 ");
    EXPECT_EQ(c.log, std::regex_replace(log.Text(), prefix, ""));
    EXPECT_EQ(c.events, ReadFile(root.Path("/events")));
    EXPECT_EQ(c.host_restart, result["restart_httpd"].asBool());
    EXPECT_EQ(c.host_restart, response.httpd_restart());
    EXPECT_EQ(nullptr, handle) << "the filled handle is released after use";
  }
}
