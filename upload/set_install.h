#ifndef ORVA_UPLOAD_SET_INSTALL_H_
#define ORVA_UPLOAD_SET_INSTALL_H_

#include <string>

// Installs a server certificate set that arrived as PEM text (a bundle's
// parts, an ACME order) exactly as the import installs its uploads: the
// texts wait in private work files of the generation area, pass the
// import's checks (SSLCAFormHandler::checkCAContent: headers, key
// strength, the proved pair, the chain that issued the certificate) and
// are installed by InstallUploads (`chain` "" removes the installed
// intermediate file). Returns 5502 when the set is in place; otherwise the
// import's code (5514, 5515, 5517, 5518...) with the store as it was. The
// work files are removed on every path. Activation is the caller's.
int ProveAndInstallSet(const std::string& certificate, const std::string& key,
                       const std::string& chain);

#endif  // ORVA_UPLOAD_SET_INSTALL_H_
