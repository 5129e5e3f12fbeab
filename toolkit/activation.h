#ifndef ORVA_TOOLKIT_ACTIVATION_H_
#define ORVA_TOOLKIT_ACTIVATION_H_

#include <json/json.h>

#include "platform/olib/olib_plugin.h"
#include "platform/olib/orva_conf.h"
#include "platform/webapi/api_response.h"

// Which handler activates a newly installed server certificate. The two
// run the same kinds of step in a different order, and two of their log
// messages differ.
enum ActivationSequence {
  // Self-signed set creation: FTP, user web server, WebDAV, plug-ins, then
  // the host's web server.
  kActivateAfterCreation,
  // Import: the host's web server first, then WebDAV, FTP, user web server
  // and plug-ins.
  kActivateAfterImport,
};

// Makes the device take the server certificate just installed: restarts
// the enabled TLS services ("ftpd-ssl", "webdav-httpd-ssl", and "pagora" or
// else "httpd-user" when "runWebHTTPS" is exactly "yes"), announces
// "certificate/change" to the "certificate" plug-ins with the post action,
// and when "runHTTPS" is exactly "yes" asks the host to restart its web
// server and sets result["restart_httpd"] to true.
//
// Best effort: every failure is logged once and the next step runs; the
// caller answers success whatever happened. Messages name `sourceFile` and
// `sourceLine` (the caller's __FILE__ and __LINE__).
//
// `result`: the caller's answer object, holding "restart_httpd" false.
// `conf`: the request's configuration reader. `handle`: the address of the
// request's plug-in handle, null on entry. The plug-in step fills it and
// the handle is released right after the post action, so *handle is null
// again on return and nothing is left for the caller to release.
void activateCertificate(ActivationSequence sequence,
                         ORVA::APIResponse* response, Json::Value& result,
                         const OrvaConf& conf, OLIBPLUGIN_HANDLE* handle,
                         const char* sourceFile, int sourceLine);

// Closing step of a request that may have activated, run on every path
// before answering: releases a handle that is still held (OLIBPluginExit
// takes null as well) and leaves *handle null.
void closePluginHandle(OLIBPLUGIN_HANDLE* handle);

// Ends a request that installs a server certificate. When `code` is 5502
// (the certificate is in place) runs `sequence` and answers success with
// the object `result` (the caller's further answer, empty by default)
// holding "restart_httpd": bool as well; otherwise answers `code` with
// null data. The plug-in handle is released on both paths.
void answerInstallRequest(ActivationSequence sequence, int code,
                          ORVA::APIResponse* response, const char* sourceFile,
                          int sourceLine,
                          Json::Value result = Json::Value(Json::objectValue));

#endif  // ORVA_TOOLKIT_ACTIVATION_H_
