#include <openssl/err.h>
#include <openssl/pem.h>
#include <openssl/pkcs12.h>
#include <unistd.h>

#include <cstdio>
#include <string>
#include <vector>

#include "common/api_errors.h"
#include "common/log.h"
#include "common/pem_password.h"
#include "common/raii.h"
#include "common/store_paths.h"
#include "platform/olib/orva_root.h"
#include "platform/webapi/api_download.h"
#include "toolkit/generation_area.h"
#include "toolkit/mkcert.h"
#include "upload/certificate_bundle.h"

namespace {

// Below this a password falls to a search of every short password.
constexpr size_t kMinExportPasswordLength = 8;

// The installed server set, read whole.
struct InstalledSet {
  X509Ptr certificate;
  std::vector<X509Ptr> chain;
  EvpPkeyPtr key;
};

// False (logged) when the certificate or key is missing or unreadable; an
// absent intermediate file is an empty chain.
bool ReadInstalledSet(InstalledSet* set) {
  std::vector<X509Ptr> certificates;
  const std::string key_path = OrvaPath(kServerKeyPath);
  FilePtr key_file(std::fopen(key_path.c_str(), "r"));
  if (key_file) {
    set->key.reset(PEM_read_PrivateKey(key_file.get(), nullptr, RefusePemPassword, nullptr));
  }
  if (loadCrtList(OrvaPath(kServerCrtPath).c_str(), certificates) != 0 ||
      certificates.empty() || !set->key) {
    ERR_clear_error();
    ORVA_LOG("Read the installed certificate or key failed");
    return false;
  }
  set->certificate = std::move(certificates.front());
  // Without an intermediate file the chain is empty; an unreadable one is
  // logged by the reader and sent as an empty chain.
  const std::string chain = OrvaPath(kInterCrtPath);
  if (access(chain.c_str(), F_OK) == 0) loadCrtList(chain.c_str(), set->chain);
  ERR_clear_error();
  return true;
}

std::string BioText(BIO* bio) {
  char* data = nullptr;
  long size = BIO_get_mem_data(bio, &data);
  return std::string(data == nullptr ? "" : data, static_cast<size_t>(size));
}

// The PKCS#12 file of `set`: OpenSSL 3's defaults, or the 3DES and SHA-1
// form that older systems read when `legacy`. "" (logged) on failure.
std::string Pkcs12Of(const InstalledSet& set, const std::string& password, bool legacy) {
  X509StackPtr chain(sk_X509_new_null());
  for (const X509Ptr& certificate : set.chain) {
    if (!chain || X509_up_ref(certificate.get()) != 1) return "";
    if (sk_X509_push(chain.get(), certificate.get()) <= 0) {
      X509_free(certificate.get());
      return "";
    }
  }
  const int algorithm = legacy ? NID_pbe_WithSHA1And3_Key_TripleDES_CBC : 0;
  // The legacy form's MAC is set below: the library's default is SHA-256.
  Pkcs12Ptr file(PKCS12_create(password.c_str(), "server", set.key.get(), set.certificate.get(),
                               chain.get(), algorithm, algorithm, PKCS12_DEFAULT_ITER,
                               legacy ? -1 : PKCS12_DEFAULT_ITER, 0));
  BioPtr der(BIO_new(BIO_s_mem()));
  if (!file || !der ||
      (legacy && PKCS12_set_mac(file.get(), password.c_str(), -1, nullptr, 0,
                                PKCS12_DEFAULT_ITER, EVP_sha1()) != 1) ||
      i2d_PKCS12_bio(der.get(), file.get()) != 1) {
    ERR_clear_error();
    ORVA_LOG("Make the PKCS#12 file failed");
    return "";
  }
  return BioText(der.get());
}

// The certificate, the chain and, when `withKey`, the key as PEM text; ""
// (logged) on failure.
std::string FullChainOf(const InstalledSet& set, bool withKey) {
  BioPtr text(BIO_new(BIO_s_mem()));
  bool written = text && PEM_write_bio_X509(text.get(), set.certificate.get()) == 1;
  for (const X509Ptr& certificate : set.chain) {
    written = written && PEM_write_bio_X509(text.get(), certificate.get()) == 1;
  }
  if (written && withKey) {
    written = PEM_write_bio_PrivateKey(text.get(), set.key.get(), nullptr, nullptr, 0, nullptr,
                                       nullptr) == 1;
  }
  if (!written) {
    ERR_clear_error();
    ORVA_LOG("Write the full chain failed");
    return "";
  }
  return BioText(text.get());
}

// Hands `content` out as the file `name`. False (logged) when it cannot.
bool SendDownload(const std::string& content, const char* name, const char* type,
                  ORVA::APIResponse* response) {
  GenerationWorkFile file(".bundle-export");
  if (!MakeGenerationArea() || !file.Write(content)) {
    ORVA_LOG_LASTERR("Write the export %s failed", name);
    return false;
  }
  ORVA::APIDownload download;
  download.SetHeader("content-disposition", std::string("attachment; filename=\"") + name + "\"");
  download.SetHeader("content-type", type);
  if (!download.Output(file.path())) {
    ORVA_LOG("Send the export %s failed", name);
    return false;
  }
  response->SetEnableOutput(false);
  return true;
}

}  // namespace

void ExportBundle(ORVA::APIRequest* request, ORVA::APIResponse* response) {
  const std::string format = request->GetParam("format", "").asString();
  const std::string password = request->GetParam("password", "").asString();
  const bool pkcs12 = format == "pkcs12";
  if (!pkcs12 && format != "pem") {
    ORVA_LOG("Export format \"%s\" refused: \"pkcs12\" or \"pem\"", format.c_str());
    response->SetError(kErrBadParameter, Json::Value());
    return;
  }
  if (pkcs12 && password.size() < kMinExportPasswordLength) {
    ORVA_LOG("A PKCS#12 export needs a password of at least %zu characters",
             kMinExportPasswordLength);
    response->SetError(kErrBadParameter, Json::Value());
    return;
  }
  InstalledSet set;
  if (!ReadInstalledSet(&set)) {
    response->SetError(kErrFileMissing, Json::Value());
    return;
  }
  const std::string content =
      pkcs12 ? Pkcs12Of(set, password, request->GetParam("legacy", "").asString() == "yes")
             : FullChainOf(set, request->GetParam("include_key", "").asString() == "yes");
  const char* name = pkcs12 ? "server.p12" : "fullchain.pem";
  const char* type = pkcs12 ? "application/x-pkcs12" : "application/x-pem-file";
  if (content.empty() || !SendDownload(content, name, type, response)) {
    response->SetError(kErrFailed, Json::Value());
  }
}
