// Fuzz target: the certificate information reader on arbitrary file
// contents, and the encoding of its entries into an answer.
//
// Input: one byte of options, then the file contents.
//   bit 0, bit 1  "additional" holds "valid_from", "valid_till"
//   bit 2         the file is the store's server certificate (entries get a
//                 "type"), else a file elsewhere
//   bit 3         the rest is DER, written as one PEM certificate block, so
//                 mutations reach the certificate decoder directly
//
// Beyond crashes it checks what holds whatever the certificate holds: each
// entry has the fields asked for, names are objects of non-empty texts, and
// the answer written as the host writes it reads back the same.

#include <openssl/pem.h>

#include <cstdint>
#include <cstdlib>
#include <memory>
#include <string>

#include <json/json.h>

#include "api/certificate_info.h"
#include "common/raii.h"
#include "common/store_paths.h"
#include "fuzz/fuzz_scratch.h"
#include "platform/webapi/api_request.h"

namespace {

std::string PemCertificate(const uint8_t* der, size_t size) {
  BioPtr bio(BIO_new(BIO_s_mem()));
  // Ignoring the result: it counts only the body, which may be empty.
  PEM_write_bio(bio.get(), "CERTIFICATE", "", der, static_cast<long>(size));
  char* text = nullptr;
  const long length = BIO_get_mem_data(bio.get(), &text);
  return std::string(text, static_cast<size_t>(length));
}

bool IsName(const Json::Value& name) {
  if (name.isNull()) return true;
  if (!name.isObject() || name.empty()) return false;
  for (const Json::Value& value : name) {
    if (!value.isString() || value.asString().empty()) return false;
  }
  return true;
}

bool ReadsBack(const Json::Value& answer) {
  Json::StreamWriterBuilder writer;
  writer["indentation"] = "";
  writer["emitUTF8"] = true;
  const std::string text = Json::writeString(writer, answer);
  std::unique_ptr<Json::CharReader> reader(Json::CharReaderBuilder().newCharReader());
  Json::Value parsed;
  return reader->parse(text.data(), text.data() + text.size(), &parsed, nullptr) &&
         parsed == answer;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  if (size == 0) return 0;
  const bool from = data[0] & 1, till = data[0] & 2, typed = data[0] & 4;
  const std::string path = ScratchRoot() + (typed ? kServerCrtPath : "/upload.crt");
  if (data[0] & 8) {
    const std::string pem = PemCertificate(data + 1, size - 1);
    WriteScratchFile(path, reinterpret_cast<const uint8_t*>(pem.data()), pem.size());
  } else {
    WriteScratchFile(path, data + 1, size - 1);
  }

  // Names it does not know, and names twice, are ignored.
  Json::Value params(Json::objectValue);
  params["additional"] = Json::Value(Json::arrayValue);
  if (till) params["additional"].append("valid_till");
  params["additional"].append(42);
  for (int twice = 0; from && twice < 2; ++twice) params["additional"].append("valid_from");
  ORVA::APIRequest request("ORVA.Core.Certificate", "list", 1, params);

  Json::Value answer(Json::objectValue);
  if (getCertificateInfo(path, answer["certificates"], &request) != 0) std::abort();
  for (const Json::Value& entry : answer["certificates"]) {
    if (!entry.isObject() || !IsName(entry["issuer"]) || !IsName(entry["subject"]) ||
        !entry["signature_algorithm"].isString() || entry.isMember("valid_from") != from ||
        entry.isMember("valid_till") != till ||
        (typed ? entry["type"] != "server_cert" : entry.isMember("type"))) {
      std::abort();
    }
  }
  if (!ReadsBack(answer)) std::abort();
  return 0;
}
