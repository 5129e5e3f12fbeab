#include "toolkit/activation.h"

#include <string>

#include "common/api_errors.h"
#include "common/log.h"
#include "platform/olib/olib_service.h"

namespace {

// The plug-in action run for "certificate/change".
constexpr int kPostAction = 5;

bool IsYes(const OrvaConf& conf, const char* key) {
  return conf.Info(key, "") == "yes";
}

void RestartIfEnabled(const char* service, const char* failure,
                      const char* sourceFile, int sourceLine) {
  if (OLIBServiceIsEnabled(service) == 0) return;
  if (OLIBServiceRestart(service) < 0) {
    ORVA_LOG_AS(sourceFile, sourceLine, "%s", failure);
  }
}

// "pagora" takes the place of "httpd-user" when it is enabled; "httpd-user"
// is restarted without asking whether it is enabled.
void RestartUserWebServer(const OrvaConf& conf, const char* sourceFile,
                          int sourceLine) {
  if (!IsYes(conf, "runWebHTTPS")) return;
  if (OLIBServiceIsEnabled("pagora") != 0) {
    if (OLIBServiceRestart("pagora") < 0) {
      ORVA_LOG_AS(sourceFile, sourceLine, "Failed to restart Pagora");
    }
  } else if (OLIBServiceRestart("httpd-user") < 0) {
    ORVA_LOG_AS(sourceFile, sourceLine, "Failed to restart httpd user");
  }
}

void NotifyPlugins(OLIBPLUGIN_HANDLE* handle, const char* sourceFile,
                   int sourceLine) {
  if (OLIBPluginSDKInit("certificate", "certificate/change", handle) < 0) {
    ORVA_LOG_LASTERR_AS(sourceFile, sourceLine,
                        "Fail to do certificate plugin init ");
  }
  if (OLIBPluginHasInit(*handle) == 0 ||
      OLIBPluginAction(kPostAction, *handle) < 0) {
    ORVA_LOG_AS(sourceFile, sourceLine,
                "Fail to do post action for certificate plugin");
  }
  // A filled handle answers nonzero to OLIBPluginHasInit for as long as it
  // lives, so it is released here, after its only use.
  closePluginHandle(handle);
}

void AskHostRestart(ORVA::APIResponse* response, Json::Value& result,
                    const OrvaConf& conf) {
  if (!IsYes(conf, "runHTTPS")) return;
  response->SetHttpdRestart(true);
  result["restart_httpd"] = true;
}

}  // namespace

void activateCertificate(ActivationSequence sequence,
                         ORVA::APIResponse* response, Json::Value& result,
                         const OrvaConf& conf, OLIBPLUGIN_HANDLE* handle,
                         const char* sourceFile, int sourceLine) {
  if (sequence == kActivateAfterCreation) {
    RestartIfEnabled("ftpd-ssl", "Failed to restart FTP", sourceFile,
                     sourceLine);
    RestartUserWebServer(conf, sourceFile, sourceLine);
    RestartIfEnabled("webdav-httpd-ssl", "Failed to restart https WebDAV",
                     sourceFile, sourceLine);
    NotifyPlugins(handle, sourceFile, sourceLine);
    AskHostRestart(response, result, conf);
    return;
  }
  AskHostRestart(response, result, conf);
  RestartIfEnabled("webdav-httpd-ssl", "Failed to restart https webdav",
                   sourceFile, sourceLine);
  RestartIfEnabled("ftpd-ssl", "Failed to restart service ftps", sourceFile,
                   sourceLine);
  RestartUserWebServer(conf, sourceFile, sourceLine);
  NotifyPlugins(handle, sourceFile, sourceLine);
}

void closePluginHandle(OLIBPLUGIN_HANDLE* handle) {
  OLIBPluginExit(*handle);
  *handle = nullptr;
}

void answerInstallRequest(ActivationSequence sequence, int code,
                          ORVA::APIResponse* response, const char* sourceFile,
                          int sourceLine, Json::Value result) {
  result["restart_httpd"] = false;
  OrvaConf conf;
  OLIBPLUGIN_HANDLE plugin = nullptr;
  if (code == kErrNone) {
    activateCertificate(sequence, response, result, conf, &plugin, sourceFile,
                        sourceLine);
  }
  closePluginHandle(&plugin);
  if (code == kErrNone) {
    response->SetSuccess(result);
  } else {
    response->SetError(code, Json::Value());
  }
}
