#include "api/csr_generate.h"

#include <cstdio>
#include <string>

#include "common/log.h"
#include "common/store_paths.h"
#include "platform/olib/orva_root.h"
#include "toolkit/generation_area.h"
#include "toolkit/mkcert.h"

namespace {

// Work files of one generation; removed when they were not installed.
struct PendingPair {
  std::string key = GenerationWorkPath(".new-server.key");
  std::string request = GenerationWorkPath(".new-server.csr");
  ~PendingPair() {
    std::remove(key.c_str());      // Ignoring errors: absent once installed.
    std::remove(request.c_str());
  }
};

}  // namespace

int generateCSR(int keyLength, CSR_ARGUMENT& record) {
  if (!MakeGenerationArea()) {
    ORVA_LOG("Create %s failed.", kGenDir);
    return 0;
  }
  // The subject is checked before the key is made, so a refused subject
  // leaves the pending pair alone.
  if (checkCsrSubject(&record) != 0) {
    ORVA_LOG("genCsr Error path: %s", kGenCsrPath);
    return 0;
  }
  PendingPair pending;
  if (genKey(pending.key.c_str(), static_cast<unsigned int>(keyLength)) == -1) {
    ORVA_LOG("genKey Error path: %s", kGenKeyPath);
    return 0;
  }
  if (genCsr(OrvaPath(kCaCfgPath).c_str(), pending.key.c_str(),
             pending.request.c_str(), &record) != 0) {
    ORVA_LOG("genCsr Error path: %s", kGenCsrPath);
    return 0;
  }
  if (std::rename(pending.request.c_str(), OrvaPath(kGenCsrPath).c_str()) != 0 ||
      std::rename(pending.key.c_str(), OrvaPath(kGenKeyPath).c_str()) != 0) {
    ORVA_LOG("genCsr Error path: %s", kGenCsrPath);
    return 0;
  }
  return 1;
}
