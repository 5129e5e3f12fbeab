#ifndef ORVA_TOOLKIT_MKCERT_H_
#define ORVA_TOOLKIT_MKCERT_H_

#include <string>
#include <vector>

#include "api/csr_argument.h"
#include "common/raii.h"
#include "platform/olib/olib_szlist.h"
#include "platform/olib/olib_types.h"

// The certificate toolkit: keys, requests and certificates made with the
// device's openssl tool, key/certificate matching and chain verification.
// It returns integers and logs; it never answers a web request.
//
// Every path argument is a real path (callers place fixed device paths
// under the device root with OrvaPath). Files the toolkit writes are
// written under a temporary name beside the target, given mode 0400 and
// renamed over the target only when complete: on failure the earlier file
// stays as it was.

// Key algorithm named by the first line of a private-key file.
typedef enum __tag_CYPHER {
  CYPHER_NONE = 0,
  CYPHER_RSA = 1,
  CYPHER_DSA = 2,
} CYPHER;

// Makes sure the directory that will hold `path` exists (with parents).
// 0 on success; -1 when the path is null or empty or the directory cannot be
// made.
int genDir(const char* path);

// Makes a new RSA key of `bits` bits at `keyPath`, mode 0400. 0 on success;
// -1 (logged) on failure, a size of 0 or above 16384 included.
int genKey(const char* keyPath, unsigned int bits);

// Writes the request configuration at `configPath` from `subject` and makes
// a request for the existing key `keyPath` at `requestPath` (mode 0400).
// 0 on success; -1 for a missing path or key, a directory, configuration
// or tool failure; -2 for a null subject, a country that is not exactly 2
// bytes, or a value holding a control character (nothing written then).
int genCsr(const char* configPath, const char* keyPath,
           const char* requestPath, CSR_ARGUMENT* subject);

// Writes the CA serial file from the time and the MAC address. 0 or -1.
int genSerial();

// Write the CA and server extension files. 0 or -1.
int generateCACNF(const char* path);
int generateServerCNF(const char* path, OLIBSZLIST* aliases);

// Signs `requestPath`. Self-signed (`selfSigned` == TRUE): written to
// `caOrOutput`, signed with `keyPath`, `serialPath` and `outputPath` unused.
// CA-signed (any other value): signed by the CA certificate `caOrOutput` and
// CA key `keyPath`, serial from `serialPath`, written to `outputPath`, with
// the names of `aliases` (";"-separated; null counts as empty). 0 on
// success with the certificate at mode 0400; -1 (logged) otherwise.
int genCrt(const char* extFile, const char* requestPath, const char* caOrOutput,
           const char* serialPath, const char* outputPath, const char* keyPath,
           BOOL selfSigned, int days, const char* aliases);

// genCrt with the server extension file and the store's serial file (made
// when absent).
int genServerCrtHelper(const char* requestPath, const char* caCertPath,
                       const char* outputPath, const char* caKeyPath, int days,
                       const char* aliases);
// genServerCrtHelper with the store's local CA certificate and key.
int genServerCrt(const char* requestPath, const char* outputPath, int days,
                 const char* aliases);
// genCrt, self-signed, with the CA extension file.
int genCACrtHelper(const char* requestPath, const char* outputPath,
                   const char* keyPath, int days);

// Runs `command` and copies the first line of its output into `output`
// (cut to `size`). 1 when a line was read, 0 otherwise.
int getMd5(char* output, int size, const char* command);

// 0 when the key at `keyPath` belongs to the certificate at `certPath`;
// 1 when not (or, for a key type other than CYPHER_RSA, when the key's
// modulus could not be read); -1 when a byte order mark could not be
// stripped, the certificate's modulus could not be read, or the key's could
// not be read for CYPHER_RSA. Strips a leading UTF-8 byte order mark from
// both files in place first.
int verifyCrtAndKey(const char* certPath, const char* keyPath, CYPHER keyType);

// Makes the local CA: key (`bits`), request from `subject`, self-signed
// certificate for 3650 days, and proves the pair. 0 on success, otherwise
// the result of the first failed step (-1, -2 for a refused subject, 1).
int genCASet(CSR_ARGUMENT* subject, int bits);

// Appends every certificate of the PEM file at `path` to `certificates`
// (which owns them). 0 when the file was opened, -1 when not.
int loadCrtList(const char* path, std::vector<X509Ptr>& certificates);

// 0 when the certificates of both files form one issuing chain; 1 when not
// or when neither file holds a certificate; -1 for a null, empty or absent
// path or a file that cannot be opened.
int verifyCrtChain(const char* certPath, const char* upperPath);

#endif  // ORVA_TOOLKIT_MKCERT_H_
