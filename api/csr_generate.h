#ifndef ORVA_API_CSR_GENERATE_H_
#define ORVA_API_CSR_GENERATE_H_

#include "api/subject_reader.h"
#include "toolkit/key_kind.h"

// Makes a new key of `kind` and a request for `record` as the pending pair
// of the generation area ("/usr/orva/etc/ssl/.gen/server.key" and
// "server.csr", both 0400), made under temporary names and renamed into
// place only when both exist. Returns 1 on success; 0 (logged) when the
// generation area cannot be made, the subject or key kind is refused, or the
// key or request cannot be made; the earlier pending pair then stays as it
// was.
int generateCSR(const KeyKind& kind, CSR_ARGUMENT& record);

#endif  // ORVA_API_CSR_GENERATE_H_
