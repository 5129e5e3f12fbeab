#ifndef ORVA_API_CSR_GENERATE_H_
#define ORVA_API_CSR_GENERATE_H_

#include "api/subject_reader.h"

// Makes a new RSA key of `keyLength` bits and a request for `record` as the
// pending pair of the generation area ("/usr/orva/etc/ssl/.gen/server.key"
// and "server.csr", both 0400), made under temporary names and renamed into
// place only when both exist. Returns 1 on success; 0 (logged) when the
// generation area cannot be made, the subject is refused, or the key or
// request cannot be made; the earlier pending pair then stays as it was.
int generateCSR(int keyLength, CSR_ARGUMENT& record);

#endif  // ORVA_API_CSR_GENERATE_H_
