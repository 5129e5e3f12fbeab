#ifndef ORVA_UPLOAD_CERTIFICATE_BUNDLE_H_
#define ORVA_UPLOAD_CERTIFICATE_BUNDLE_H_

#include "platform/webapi/api_request.h"
#include "platform/webapi/api_response.h"

// The bundle methods of the second module: a certificate set as one file,
// in and out. Each answers through `response` on every path; the host owns
// both objects.

// Import: reads the upload "bundle_tmp" with the parameter "password" (""
// when absent) as ReadBundle does, then puts its parts through the same
// checks (SSLCAFormHandler::checkCAContent), staged install (InstallUploads:
// the chain becomes the intermediate file, and a bundle without one removes
// the installed one) and activation as the import. Answers success with
// {"restart_httpd": bool}, or with null data ReadBundle's code (5521 also
// for an upload that cannot be read) or the import's (5514, 5515, 5517,
// 5518...), the store then as it was. The upload is read, never changed.
void ImportBundle(ORVA::APIRequest* request, ORVA::APIResponse* response);

// Export of the installed server set. "format" "pkcs12": a PKCS#12 file of
// the key, certificate and intermediate certificates under "password" (at
// least 8 characters), AES-256 with PBKDF2 and a SHA-256 MAC, or with
// "legacy" "yes" 3DES with a SHA-1 MAC for older systems, sent as
// "server.p12". "format" "pem": the certificate, the intermediate
// certificates and, only with "include_key" "yes", the key, as
// "fullchain.pem". Answers 5503 for another format or a shorter password,
// 5504 when the certificate or key is not installed, 5501 when the file
// cannot be made. Nothing in the store changes; a private work file in the
// generation area lives only for the call.
void ExportBundle(ORVA::APIRequest* request, ORVA::APIResponse* response);

#endif  // ORVA_UPLOAD_CERTIFICATE_BUNDLE_H_
