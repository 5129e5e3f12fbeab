#include <regex>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "tests/support/test_support.h"
#include "toolkit/activation.h"

namespace {

const std::vector<std::string> kAll = {"ftpd-ssl", "webdav-httpd-ssl", "pagora", "httpd-user",
                                       "plugin"};
const char kYesYes[] = "runHTTPS=\"yes\"\nrunWebHTTPS=yes\n";
const char kCreated[] =
    "ftpd-ssl restart\npagora restart\nwebdav-httpd-ssl restart\nplugin certificate/change 5\n";
const char kImported[] =
    "webdav-httpd-ssl restart\nftpd-ssl restart\npagora restart\nplugin certificate/change 5\n";

}  // namespace

// What each sequence restarts, in which order, what it logs (messages only,
// each naming the caller's file) and whether it asks for the host's restart.
TEST(Activation, RestartsEnabledServicesInTheSequencesOrderAndLogsEachFailureOnce) {
  const struct {
    ActivationSequence sequence;
    std::vector<std::string> services;  // "plugin" is the certificate plug-in
    int status;                         // with which every script exits
    const char *configuration, *events, *log;
    bool host_restart;
  } cases[] = {
      {kActivateAfterCreation, kAll, 0, kYesYes, kCreated, "", true},
      {kActivateAfterImport, kAll, 0, kYesYes, kImported, "", true},
      // The user web server only for exactly "yes"; "httpd-user" when
      // "pagora" is disabled, without asking whether it is enabled.
      {kActivateAfterImport, {"pagora", "httpd-user"}, 0, "runWebHTTPS=\"YES\"\nrunHTTPS=\"Yes\"\n",
       "", "", false},
      {kActivateAfterImport, {"pagora", "httpd-user"}, 0, "runWebHTTPS=\"yes \"\nrunHTTPS=no\n", "",
       "", false},
      {kActivateAfterImport, {"pagora", "httpd-user"}, 0, "runWebHTTPS=no\nrunHTTPS=\"yes\"\n", "",
       "", true},
      {kActivateAfterImport, {"httpd-user"}, 0, "runWebHTTPS=yes\n", "httpd-user restart\n", "",
       false},
      {kActivateAfterCreation, {}, 0, "runWebHTTPS=yes\n", "", "Failed to restart httpd user\n",
       false},
      {kActivateAfterCreation, kAll, 3, kYesYes, kCreated,
       "Failed to restart FTP\nFailed to restart Pagora\nFailed to restart https WebDAV\n"
       "Fail to do post action for certificate plugin\n", true},
      {kActivateAfterImport, kAll, 3, kYesYes, kImported,
       "Failed to restart https webdav\nFailed to restart service ftps\nFailed to restart Pagora\n"
       "Fail to do post action for certificate plugin\n", true},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(std::to_string(c.sequence) + " " + c.configuration + c.events + c.log);
    TempDeviceRoot root;
    for (const std::string& name : c.services) {
      root.WriteScript(name == "plugin" ? "/usr/orva/etc/plugins/certificate/notify"
                                        : "/usr/orva/etc/services/" + name,
                       "echo " + name + " $1 $2 >> \"$ORVA_ROOT/events.log\"; exit " +
                           std::to_string(c.status));
    }
    root.WriteFile("/usr/orva/etc/orva.conf", c.configuration);
    ORVA::APIResponse response;
    Json::Value result(Json::objectValue);
    result["restart_httpd"] = false;
    OLIBPLUGIN_HANDLE handle = nullptr;
    LogCapture log;
    activateCertificate(c.sequence, &response, result, OrvaConf(), &handle,
                        "/src/upload/uploadsslca.cc");
    const std::regex prefix("orva-test: uploadsslca\\.cc:[0-9]+ ");
    EXPECT_EQ(c.log, std::regex_replace(log.Text(), prefix, ""));
    EXPECT_EQ(c.events, ReadFile(root.Path("/events.log")));
    EXPECT_EQ(c.host_restart, result["restart_httpd"].asBool());
    EXPECT_EQ(c.host_restart, response.httpd_restart());
    EXPECT_EQ(ORVA::APIResponse::Outcome::kNone, response.outcome());
    EXPECT_EQ(nullptr, handle) << "the filled handle is released after use";
  }
}
