// Fuzz target: the PEM header checks of uploaded files on arbitrary file
// contents, for every kind of upload, looking for crashes and undefined
// behaviour. What each check answers is pinned by the import tests.

#include <cstdint>
#include <string>
#include <utility>

#include <json/json.h>

#include "fuzz/fuzz_scratch.h"
#include "upload/sslca_form_handler.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  static const std::string path = ScratchRoot() + "/upload.pem";
  WriteScratchFile(path, data, size);

  SSLCAFormHandler handler;
  Json::Value reply;
  const std::pair<const char*, __CA> checks[] = {{"CERTIFICATE", CA_CRT},
                                                 {"PRIVATE KEY", CA_KEY},
                                                 {"CERTIFICATE", CA_INTERCRT},
                                                 {"CERTIFICATE REQUEST", CA_CSR}};
  for (const auto& [header, kind] : checks) {
    __tag_CYPHER cypher = CYPHER_NONE;
    handler.checkHeaderType(path.c_str(), header, &cypher, reply, kind);
  }
  handler.checkCSRHeader(path.c_str());
  return 0;
}
