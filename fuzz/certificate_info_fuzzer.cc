// Fuzz target: the certificate information reader on arbitrary file
// contents, and the encoding of its entries into an answer.
//
// Input: one byte of options, then the file contents.
//   bit 0, bit 1  "additional" holds "valid_from", "valid_till"
//   bit 2         the file is the store's server certificate (entries get a
//                 "type"), else a file elsewhere
//   bit 3         the rest is DER, written as one PEM certificate block, so
//                 mutations reach the certificate decoder directly
//   bit 4         the entries start as null instead of an empty array

#include <openssl/bio.h>
#include <openssl/evp.h>
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
#include "platform/olib/orva_root.h"
#include "platform/webapi/api_request.h"

namespace {

std::string PemCertificate(const uint8_t* der, size_t size) {
  BioPtr bio(BIO_new(BIO_s_mem()));
  if (!bio) std::abort();
  // Ignoring the result: it counts only the body, which may be empty.
  PEM_write_bio(bio.get(), "CERTIFICATE", "", der, static_cast<long>(size));
  char* text = nullptr;
  long length = BIO_get_mem_data(bio.get(), &text);
  return std::string(text, static_cast<size_t>(length));
}

bool IsNameObject(const Json::Value& name) {
  if (name.isNull()) return true;
  if (!name.isObject() || name.empty()) return false;
  for (const std::string& key : name.getMemberNames()) {
    const Json::Value& value = name[key];
    if (!value.isString() || value.asString().empty() ||
        value.asString().size() > 1023) {
      return false;
    }
  }
  return true;
}

// The rules every entry follows, whatever the certificate holds.
bool IsValidEntry(const Json::Value& entry, bool from, bool till, bool typed) {
  return entry.isObject() && IsNameObject(entry["issuer"]) &&
         IsNameObject(entry["subject"]) && entry["signature_algorithm"].isString() &&
         entry.isMember("valid_from") == from && entry.isMember("valid_till") == till &&
         (typed ? entry["type"] == Json::Value("server_cert") : !entry.isMember("type"));
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  if (size == 0) return 0;
  const uint8_t options = data[0];
  const bool from = options & 1, till = options & 2, typed = options & 4;
  const FuzzScratch& scratch = FuzzScratch::Get();
  static const std::string store_path = OrvaPath(kServerCrtPath);
  static const std::string other_path = scratch.Path("/upload.crt");
  const std::string& path = typed ? store_path : other_path;
  if (options & 8) {
    std::string pem = PemCertificate(data + 1, size - 1);
    scratch.WriteFile(path, reinterpret_cast<const uint8_t*>(pem.data()), pem.size());
  } else {
    scratch.WriteFile(path, data + 1, size - 1);
  }

  Json::Value params(Json::objectValue);
  params["additional"] = Json::Value(Json::arrayValue);
  if (till) params["additional"].append("valid_till");
  params["additional"].append(42);
  if (from) params["additional"].append("valid_from");
  if (from) params["additional"].append("valid_from");
  ORVA::APIRequest request("ORVA.Core.Certificate", "list", 1, params);

  Json::Value entries =
      (options & 16) ? Json::Value() : Json::Value(Json::arrayValue);
  if (getCertificateInfo(path, entries, &request) != 0) std::abort();
  if (!entries.isNull() && !entries.isArray()) std::abort();
  for (const Json::Value& entry : entries) {
    if (!IsValidEntry(entry, from, till, typed)) std::abort();
  }

  // The answer goes out as the host writes it, and must read back.
  Json::Value answer(Json::objectValue);
  answer["certificates"] = entries;
  Json::StreamWriterBuilder writer;
  writer["indentation"] = "";
  writer["emitUTF8"] = true;
  const std::string text = Json::writeString(writer, answer);
  Json::CharReaderBuilder reader_builder;
  std::unique_ptr<Json::CharReader> reader(reader_builder.newCharReader());
  Json::Value parsed;
  std::string errors;
  if (!reader->parse(text.data(), text.data() + text.size(), &parsed, &errors) ||
      parsed != answer) {
    std::abort();
  }
  return 0;
}
