#ifndef ORVA_UPLOAD_SSLCA_FORM_HANDLER_H_
#define ORVA_UPLOAD_SSLCA_FORM_HANDLER_H_

#include <json/json.h>

#include "platform/webapi/api_request.h"
#include "platform/webapi/api_response.h"
#include "platform/webapi/server_form_handler.h"
#include "toolkit/mkcert.h"

// Kind of PEM file that checkHeaderType examines. It only selects the code
// returned when the header is missing or the first line is unreadable.
enum __CA {
  CA_KEY = 0,       // private key: 5511
  CA_CRT = 1,       // server certificate: 5510
  CA_INTERCRT = 2,  // intermediate certificate: 5512
  CA_CSR = 3,       // certificate signing request: 5519
};

// The module's file-based certificate work: PEM header checks, validation
// and installation of an uploaded certificate set, and export of store files
// as a ZIP archive. A request handler makes one on its stack for the length
// of one call; the object holds no state of its own.
//
// Checks return an API code: 5502 means the check passed, any other value
// is the error code to answer with. Paths given to the checks are real
// paths (fixed device paths already placed under the device root).
class SSLCAFormHandler : public ServerFormHandler {
 public:
  SSLCAFormHandler();
  ~SSLCAFormHandler() override;

  // The form actions are not used by this module; both do nothing and
  // return 0.
  int HandleLoadAction() override;
  int HandleApplyAction() override;

  // Makes the ZIP archive `archive` (a real path) with the device's 7z tool
  // from those of the `count` paths in `files` that exist; members are
  // stored under their file names. The previous archive is removed first,
  // so on failure no archive is left, except when no member exists: then
  // the previous archive stays as it was. The archive is owner-only while
  // it is made and has mode 0400 on success. Returns 0, or -1 (logged)
  // when no member exists, the old archive cannot be removed or the tool
  // fails.
  int CreateArchive(const char** files, const char* archive, int count);

  // Tests whether the first line of `file` (up to and including the first
  // newline, of any length) contains `header`, case-sensitively.
  // Returns 5502 when it does; 5501 when the file cannot be opened; 5516
  // when the line is not valid UTF-8; otherwise, also for an empty file, the
  // code of `kind`. When `header` is exactly "PRIVATE KEY" and the header
  // is found, stores CYPHER_DSA (line holds "DSA") or else CYPHER_RSA (line
  // holds "RSA") through `cypher`, which must not be null; otherwise
  // *cypher keeps its value. `data` is neither read nor written. Changes
  // nothing on disk.
  int checkHeaderType(const char* file, const char* header,
                      __tag_CYPHER* cypher, Json::Value& data, __CA kind);

  // Tests that `file` begins with a certificate request header line.
  // Returns 5502; 5503 for a null path; else the result of checkHeaderType
  // (5501, 5516 or 5519).
  int checkCSRHeader(const char* file);

  // Decides whether an uploaded certificate, private key and optional
  // intermediate certificate (null or "" for none) may be installed: each
  // file starts with its PEM header, the key is not a DSA key, the
  // intermediate file holds certificates that issued the certificate, and
  // the key belongs to the certificate and is one the device's own HTTPS
  // can use (an RSA key of at least 2048 bits, an EC key of at least 256:
  // a smaller key is refused with 5514). Returns 5502 when the set is
  // acceptable, else the code of the first failed check: 5501, 5510, 5511,
  // 5512, 5514, 5516, 5517 or 5518. Where the openssl tool cannot compare
  // the pair, the library proves it instead (and refuses a DSA key it reads
  // with 5518). An intermediate file that yields no certificate is refused
  // (5517). An encrypted key is refused (5514) without asking anyone for a
  // password. A leading UTF-8 byte order mark
  // is removed from the certificate and key files in place; nothing else
  // changes on disk. `data` is not touched.
  int checkCAContent(const char* cert, const char* key, const char* interCert,
                     Json::Value& data);

  // The import method: validates the uploaded files named by "cert_tmp",
  // "key_tmp" and "inter_cert_tmp", installs them as the server certificate
  // set, runs the import activation and answers through `response` on every
  // path: success with {"restart_httpd": bool}, or an error code with null
  // data. The uploads are copied, never removed.
  void ProcessJsonReq(ORVA::APIRequest* request, ORVA::APIResponse* response);

  // The export method: packs the set named by the parameter "file"
  // ("archive", "csr_set" or "signed_set") into
  // "/usr/orva/etc/ssl/.gen/archive.zip" and sends it as "archive.zip".
  // "csr_set" and "signed_set" are handed out once: their files are removed
  // once they are in the archive. On any failure nothing is answered.
  void DownloadAction(ORVA::APIRequest* request, ORVA::APIResponse* response);
};

#endif  // ORVA_UPLOAD_SSLCA_FORM_HANDLER_H_
