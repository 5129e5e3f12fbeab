#ifndef ORVA_UPLOAD_IMPORTED_SET_H_
#define ORVA_UPLOAD_IMPORTED_SET_H_

#include <string>

// Copies a set that SSLCAFormHandler::checkCAContent accepted into the
// store: the certificate, the key and, when `interPath` is not null, the
// intermediate certificate; without one the installed intermediate
// certificate is removed. Only the certificate blocks of the certificate
// files reach their readable (0644) files; the key is installed 0400. Every
// source is checked and every copy made before the first store file is
// replaced, so a refused or failed copy leaves the store files as they
// were. The sources are copied, never removed. Returns 5502 or 5515.
int InstallUploads(const std::string& certPath, const std::string& keyPath,
                   const std::string* interPath);

#endif  // ORVA_UPLOAD_IMPORTED_SET_H_
