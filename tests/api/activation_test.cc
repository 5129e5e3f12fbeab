#include <regex>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "api/activation.h"
#include "tests/support/test_support.h"

namespace {

// Services and the plug-in record "NAME ARG" in events.log and exit with
// `status`.
void WriteRecorders(const TempDeviceRoot& root, const std::vector<std::string>& services,
                    int status = 0) {
  for (const std::string& name : services) {
    std::string path = name == "plugin" ? "/usr/orva/etc/plugins/certificate/notify"
                                        : "/usr/orva/etc/services/" + name;
    root.WriteScript(path, "echo \"" + name + " $1 $2\" >> \"$ORVA_ROOT/events.log\"; exit " +
                               std::to_string(status));
  }
}

// Runs the sequence; true when it asked for the host's restart in both the
// result and the response, and released the plug-in handle.
bool Activate(ActivationSequence sequence) {
  ORVA::APIResponse response;
  Json::Value result(Json::objectValue);
  result["restart_httpd"] = false;
  OLIBPLUGIN_HANDLE handle = nullptr;
  activateCertificate(sequence, &response, result, OrvaConf(), &handle, "/src/upload/uploadsslca.cc");
  EXPECT_EQ(nullptr, handle) << "the filled handle is released after use";
  EXPECT_EQ(ORVA::APIResponse::Outcome::kNone, response.outcome());
  EXPECT_EQ(result["restart_httpd"].asBool(), response.httpd_restart());
  return response.httpd_restart();
}

}  // namespace

TEST(Activation, SequencesRestartEnabledServicesInTheirOrderThenNotifyPlugins) {
  const struct { ActivationSequence sequence; const char* events; } cases[] = {
      {kActivateAfterCreation,
       "ftpd-ssl restart \npagora restart \nwebdav-httpd-ssl restart \n"
       "plugin certificate/change 5\n"},
      {kActivateAfterImport,
       "webdav-httpd-ssl restart \nftpd-ssl restart \npagora restart \n"
       "plugin certificate/change 5\n"},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.sequence);
    TempDeviceRoot root;
    WriteRecorders(root, {"ftpd-ssl", "webdav-httpd-ssl", "pagora", "httpd-user", "plugin"});
    root.WriteFile("/usr/orva/etc/orva.conf", "runHTTPS=\"yes\"\nrunWebHTTPS=yes\n");
    LogCapture log;
    EXPECT_TRUE(Activate(c.sequence));
    EXPECT_EQ(c.events, ReadFile(root.Path("/events.log")));
    EXPECT_EQ("", log.Text());
  }
}

TEST(Activation, HttpdUserIsRestartedWithoutAskingWhetherItIsEnabled) {
  TempDeviceRoot root;
  root.WriteFile("/usr/orva/etc/orva.conf", "runWebHTTPS=\"yes\"\n");
  for (ActivationSequence sequence : {kActivateAfterCreation, kActivateAfterImport}) {
    SCOPED_TRACE(sequence);
    LogCapture log;
    Activate(sequence);
    EXPECT_TRUE(log.Contains("uploadsslca.cc:")) << log.Text();
    EXPECT_TRUE(log.Contains(" Failed to restart httpd user\n")) << log.Text();
  }
  WriteRecorders(root, {"httpd-user"});
  Activate(kActivateAfterImport);
  EXPECT_EQ("httpd-user restart \n", ReadFile(root.Path("/events.log")));
}

TEST(Activation, OnlyExactlyYesRestartsTheUserWebServerOrTheHost) {
  const struct { const char* configuration; bool host_restart; } cases[] = {
      {"", false},
      {"runWebHTTPS=\"YES\"\nrunHTTPS=\"Yes\"\n", false},
      {"runWebHTTPS=\"yes \"\nrunHTTPS=\"no\"\n", false},
      {"runWebHTTPS=\"no\"\nrunHTTPS=\"yes\"\n", true},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.configuration);
    TempDeviceRoot root;
    WriteRecorders(root, {"pagora", "httpd-user"});
    root.WriteFile("/usr/orva/etc/orva.conf", c.configuration);
    LogCapture log;
    EXPECT_EQ(c.host_restart, Activate(kActivateAfterImport));
    EXPECT_EQ("", ReadFile(root.Path("/events.log")));
    EXPECT_EQ("", log.Text());
  }
}

TEST(Activation, EveryFailureIsLoggedOnceInOrderWithTheSequencesTexts) {
  const struct { ActivationSequence sequence; const char* log; } cases[] = {
      {kActivateAfterCreation,
       "Failed to restart FTP\nFailed to restart Pagora\nFailed to restart https WebDAV\n"
       "Fail to do post action for certificate plugin\n"},
      {kActivateAfterImport,
       "Failed to restart https webdav\nFailed to restart service ftps\n"
       "Failed to restart Pagora\nFail to do post action for certificate plugin\n"},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.sequence);
    TempDeviceRoot root;
    WriteRecorders(root, {"ftpd-ssl", "webdav-httpd-ssl", "pagora", "plugin"}, 3);
    root.WriteFile("/usr/orva/etc/orva.conf", "runHTTPS=\"yes\"\nrunWebHTTPS=\"yes\"\n");
    LogCapture log;
    EXPECT_TRUE(Activate(c.sequence));
    std::string messages =
        std::regex_replace(log.Text(), std::regex("orva-test: uploadsslca\\.cc:[0-9]+ "), "");
    EXPECT_EQ(c.log, messages) << log.Text();
  }
}
