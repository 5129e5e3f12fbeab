#include "api/csr_generate.h"

#include <string>

#include "common/log.h"
#include "common/store_paths.h"
#include "platform/olib/orva_root.h"
#include "toolkit/generation_area.h"
#include "toolkit/mkcert.h"
#include "toolkit/store_file.h"

int generateCSR(const KeyKind& kind, CSR_ARGUMENT& record) {
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
  StoreFileSet pending;
  const std::string request =
      pending.Add(OrvaPath(kGenCsrPath), StoreContent::kRequest);
  const std::string key =
      pending.Add(OrvaPath(kGenKeyPath), StoreContent::kPrivateKey);
  if (genKeyOf(key.c_str(), kind) == -1) {
    ORVA_LOG("genKey Error path: %s", kGenKeyPath);
    return 0;
  }
  if (genCsr(OrvaPath(kCaCfgPath).c_str(), key.c_str(), request.c_str(),
             &record) != 0) {
    ORVA_LOG("genCsr Error path: %s", kGenCsrPath);
    return 0;
  }
  if (pending.Install() != 0) {
    ORVA_LOG("genCsr Error path: %s", kGenCsrPath);
    return 0;
  }
  return 1;
}
