#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "api/activation.h"
#include "tests/support/test_support.h"

namespace {

const char kSource[] = "/src/upload/uploadsslca.cc";

// A service whose restart records "NAME ARG" in events.log and exits with
// `status`.
void WriteService(const TempDeviceRoot& root, const std::string& name,
                  int status = 0) {
  root.WriteScript("/usr/orva/etc/services/" + name,
                   "echo \"" + name + " $1\" >> \"$ORVA_ROOT/events.log\"; exit " +
                       std::to_string(status));
}

void WritePlugin(const TempDeviceRoot& root, int status = 0) {
  root.WriteScript("/usr/orva/etc/plugins/certificate/notify",
                   "echo \"plugin $1 $2\" >> \"$ORVA_ROOT/events.log\"; exit " +
                       std::to_string(status));
}

struct Activation {
  ORVA::APIResponse response;
  Json::Value result{Json::objectValue};
  OLIBPLUGIN_HANDLE handle = nullptr;
};

void Activate(ActivationSequence sequence, Activation* activation) {
  activation->result["restart_httpd"] = false;
  OrvaConf conf;
  activateCertificate(sequence, &activation->response, activation->result, conf,
                      &activation->handle, kSource);
}

std::string Events(const TempDeviceRoot& root) {
  return ReadFile(root.Path("/events.log"));
}

}  // namespace

TEST(Activation, ImportSequenceAsksHostFirstThenWebdavFtpPagoraAndPlugins) {
  TempDeviceRoot root;
  for (const char* service : {"ftpd-ssl", "webdav-httpd-ssl", "pagora", "httpd-user"}) {
    WriteService(root, service);
  }
  WritePlugin(root);
  root.WriteFile("/usr/orva/etc/orva.conf", "runHTTPS=\"yes\"\nrunWebHTTPS=\"yes\"\n");
  LogCapture log;
  Activation activation;
  Activate(kActivateAfterImport, &activation);

  EXPECT_EQ(
      "webdav-httpd-ssl restart\nftpd-ssl restart\npagora restart\n"
      "plugin certificate/change 5\n",
      Events(root));
  EXPECT_TRUE(activation.result["restart_httpd"].asBool());
  EXPECT_TRUE(activation.response.httpd_restart());
  EXPECT_EQ(ORVA::APIResponse::Outcome::kNone, activation.response.outcome());
  EXPECT_EQ(nullptr, activation.handle) << "the filled handle is released after use";
  EXPECT_EQ("", log.Text());
}

TEST(Activation, CreationSequenceRestartsFtpThenUserWebThenWebdav) {
  TempDeviceRoot root;
  for (const char* service : {"ftpd-ssl", "webdav-httpd-ssl", "pagora"}) {
    WriteService(root, service);
  }
  WritePlugin(root);
  root.WriteFile("/usr/orva/etc/orva.conf", "runHTTPS=yes\nrunWebHTTPS=yes\n");
  Activation activation;
  Activate(kActivateAfterCreation, &activation);

  EXPECT_EQ(
      "ftpd-ssl restart\npagora restart\nwebdav-httpd-ssl restart\n"
      "plugin certificate/change 5\n",
      Events(root));
  EXPECT_TRUE(activation.result["restart_httpd"].asBool());
  EXPECT_TRUE(activation.response.httpd_restart());
  EXPECT_EQ(nullptr, activation.handle);
}

TEST(Activation, HttpdUserIsRestartedWithoutAskingWhetherItIsEnabled) {
  TempDeviceRoot root;
  root.WriteFile("/usr/orva/etc/orva.conf", "runWebHTTPS=\"yes\"\n");
  for (ActivationSequence sequence : {kActivateAfterCreation, kActivateAfterImport}) {
    SCOPED_TRACE(sequence);
    LogCapture log;
    Activation activation;
    Activate(sequence, &activation);
    EXPECT_TRUE(log.Contains("uploadsslca.cc:")) << log.Text();
    EXPECT_TRUE(log.Contains(" Failed to restart httpd user\n")) << log.Text();
  }
  WriteService(root, "httpd-user");
  Activation activation;
  Activate(kActivateAfterImport, &activation);
  EXPECT_EQ("httpd-user restart\n", Events(root));
}

TEST(Activation, UserWebServerIsLeftAloneUnlessRunWebHttpsIsExactlyYes) {
  const std::vector<std::string> configurations = {
      "", "runWebHTTPS=\"YES\"\n", "runWebHTTPS=\"yes \"\n", "runWebHTTPS=\"no\"\n",
      "runHTTPS=\"yes\"\n"};
  for (const std::string& configuration : configurations) {
    SCOPED_TRACE(configuration);
    TempDeviceRoot root;
    WriteService(root, "pagora");
    WriteService(root, "httpd-user");
    root.WriteFile("/usr/orva/etc/orva.conf", configuration);
    LogCapture log;
    Activation activation;
    Activate(kActivateAfterImport, &activation);
    EXPECT_EQ("", Events(root));
    EXPECT_EQ("", log.Text());
  }
}

TEST(Activation, QuietDeviceAnswersNoRestartAndLogsNothing) {
  TempDeviceRoot root;
  root.WriteFile("/usr/orva/etc/orva.conf", "runHTTPS=\"Yes\"\nrunWebHTTPS=\"no\"\n");
  for (ActivationSequence sequence : {kActivateAfterCreation, kActivateAfterImport}) {
    SCOPED_TRACE(sequence);
    LogCapture log;
    Activation activation;
    Activate(sequence, &activation);
    EXPECT_FALSE(activation.result["restart_httpd"].asBool());
    EXPECT_FALSE(activation.response.httpd_restart());
    EXPECT_EQ("", log.Text());
  }
}

TEST(Activation, EveryFailureIsLoggedOnceWithTheSequencesTexts) {
  struct Case {
    ActivationSequence sequence;
    std::vector<std::string> messages;
  };
  const Case cases[] = {
      {kActivateAfterCreation,
       {" Failed to restart FTP\n", " Failed to restart Pagora\n",
        " Failed to restart https WebDAV\n",
        " Fail to do post action for certificate plugin\n"}},
      {kActivateAfterImport,
       {" Failed to restart https webdav\n", " Failed to restart service ftps\n",
        " Failed to restart Pagora\n",
        " Fail to do post action for certificate plugin\n"}},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.sequence);
    TempDeviceRoot root;
    for (const char* service : {"ftpd-ssl", "webdav-httpd-ssl", "pagora"}) {
      WriteService(root, service, 1);
    }
    WritePlugin(root, 3);
    root.WriteFile("/usr/orva/etc/orva.conf", "runHTTPS=\"yes\"\nrunWebHTTPS=\"yes\"\n");
    LogCapture log;
    Activation activation;
    Activate(c.sequence, &activation);
    const std::string& text = log.Text();
    size_t lines = 0;
    for (char ch : text) lines += ch == '\n';
    EXPECT_EQ(c.messages.size(), lines) << text;
    size_t position = 0;
    for (const std::string& message : c.messages) {
      size_t found = text.find(message, position);
      EXPECT_NE(std::string::npos, found) << message << " in order, in:\n" << text;
      if (found != std::string::npos) position = found;
    }
    EXPECT_TRUE(activation.result["restart_httpd"].asBool());
    EXPECT_EQ(nullptr, activation.handle);
  }
}
