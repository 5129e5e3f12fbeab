#ifndef ORVA_TOOLKIT_MKCERT_H_
#define ORVA_TOOLKIT_MKCERT_H_

#include <string>
#include <vector>

#include "common/raii.h"
#include "common/shell_command.h"
#include "platform/olib/olib_szlist.h"
#include "platform/olib/olib_types.h"
#include "toolkit/csr_argument.h"
#include "toolkit/key_kind.h"
#include "toolkit/request_facts.h"
#include "toolkit/store_file.h"

// The certificate toolkit: keys, requests and certificates made with the
// device's openssl tool, key/certificate matching and chain verification.
// It returns integers and logs every failure; it never answers a web
// request.
//
// Every path argument is a real path (callers place fixed device paths
// under the device root with OrvaPath) and reaches the tool quoted, whatever
// it holds. Keys, requests and certificates are written by the tool under a
// temporary name beside the target, given mode 0400 and renamed over the
// target only when they decode whole (the tool reports success for output
// it could not write on a full disk): on failure the earlier file stays as
// it was and no temporary file is left. Configuration, extension and serial
// files are replaced whole the same way; directories made on the way stay.

// Key algorithm named by the first line of a private-key file.
typedef enum __tag_CYPHER {
  CYPHER_NONE = 0,
  CYPHER_RSA = 1,
  CYPHER_DSA = 2,
} CYPHER;

// Makes sure the directory that will hold the file `path` exists (with its
// parents; "." for a path without a slash). 0 on success; -1 when the path
// is null or empty (logged) or the directory cannot be made.
int genDir(const char* path);

// Makes a new RSA key of `bits` bits at `keyPath`, mode 0400, replacing an
// existing file even when it is read-only. 0 on success; -1 (logged) for a
// null or empty path, a size checkKeySize refuses, a directory that cannot
// be made, or a tool failure.
int genKey(const char* keyPath, unsigned int bits);

// 0 for a key size genKey makes: kMinRsaKeyBits (2048, the smallest the
// device's own HTTPS can use) to 16384 bits; -1 (logged with the size)
// otherwise.
int checkKeySize(unsigned int bits);

// genKey for any kind: RSA keys as genKey makes them, EC keys on the named
// curve of `kind` (written by the tool as "BEGIN PRIVATE KEY"). 0 on
// success; -1 (logged) as genKey, or for a kind checkKeyKind refuses.
int genKeyOf(const char* keyPath, const KeyKind& kind);

// 0 for a kind genKeyOf makes: RSA sizes checkKeySize accepts, EC on P-256
// or P-384; -1 (logged with the kind) otherwise.
int checkKeyKind(const KeyKind& kind);

// Writes the request configuration at `configPath` from `subject` and makes
// a request for the existing key `keyPath` at `requestPath` (mode 0400).
// Subject values arrive in the request exactly as they stand.
// 0 on success; -1 (logged) for a missing path or key, a directory,
// configuration or tool failure; -2 (logged) for a null subject, a country
// that is not exactly 2 bytes, or a value holding a control character
// (below 0x20, or 0x7F). The key is tested before the subject; on -2
// nothing is written.
int genCsr(const char* configPath, const char* keyPath,
           const char* requestPath, CSR_ARGUMENT* subject);

// The subject rules of genCsr, checked alone so a caller can refuse a
// subject before it writes anything: 0 when `subject` is acceptable; -2
// (logged as genCsr logs it) for a null subject, a country that is not
// exactly 2 bytes, or a value holding a control character.
int checkCsrSubject(const CSR_ARGUMENT* subject);

// The name rules of the server extension file for a request whose common
// name is `commonName`, checked alone: 0 when every non-empty name of the
// ";"-separated `aliases` (null counts as empty) is an IPv4 or IPv6
// literal or made of letters, digits, ".", "-", "_" and "*", and the
// certificate would name at least one host (the common name is such a name,
// or an alias is given); -1 (logged) otherwise.
int checkServerNames(const char* commonName, const char* aliases);

// Writes the CA serial file "/usr/orva/etc/ssl/.mkcert.serial": the time in
// seconds, then the MAC address word from its ninth character on, cut to 31
// characters and padded with "1" to an even length. The MAC address comes
// from "/proc/sys/kernel/orva_mac_address1", or where that is missing from
// the machine's first non-loopback network interface. 0 on success; -1
// (logged) when neither source can be read or the file cannot be written
// (no file is left then).
int genSerial();

// Write the CA and the server extension file at `path`, replacing its
// content. 0 on success; -1 (logged) for a null or empty path, a null list,
// a refused name (before anything is written), or a directory or file
// failure.
//
// The CA file: critical basic constraints (CA, path length 0), critical
// key usage keyCertSign and cRLSign, a subject key identifier, and the
// e-mail address as alternative name when `withEmail`.
//
// The server file: critical basic constraints (no CA), critical key usage
// digitalSignature (and keyEncipherment unless `request` has an EC key),
// extended key usage serverAuth, subject and authority key identifiers,
// and one subjectAltName line: the request's common name when it is a
// host name or an address literal, then every non-empty name of `aliases`
// or, when it has none, the request's own DNS and IP names (those that
// break the alias rule are left out, logged), each name once, "IP:" for an
// IPv4 or IPv6 literal and "DNS:" otherwise, and the subject's e-mail
// address last when it has one. Refused: an alias that is neither an
// address literal nor made of letters, digits, ".", "-", "_" and "*", and
// a certificate that would name no host.
int generateCACNF(const char* path, bool withEmail);
int generateServerCNF(const char* path, const RequestFacts& request, OLIBSZLIST* aliases);

// Signs `requestPath` for `days` days (above 0). Self-signed (`selfSigned`
// == TRUE): written to `caOrOutput`, signed with `keyPath`, with the CA
// extension file written at `extFile`; `serialPath`, `outputPath` and
// `aliases` are unused. CA-signed (any other value): signed by the CA
// certificate `caOrOutput` and CA key `keyPath`, serial from the existing
// file `serialPath` (advanced by the tool), written to `outputPath`, with
// the server extension file written at `extFile` from the request and
// `aliases` (";"-separated; null counts as empty). Both extension files
// are those of generateCACNF and generateServerCNF for the request. 0 on
// success with the certificate at mode 0400; -1 (logged) otherwise. Checks
// run before anything is written: arguments, request, key, then serial
// file and names.
int genCrt(const char* extFile, const char* requestPath, const char* caOrOutput,
           const char* serialPath, const char* outputPath, const char* keyPath,
           BOOL selfSigned, int days, const char* aliases);

// The validity of server certificates the local CA signs for the device
// itself: the longest Apple's clients accept. The local CA keeps its ten
// years.
inline constexpr int kServerValidityDays = 825;

// genCrt, CA-signed, with the server extension file
// "/usr/orva/etc/ssl/cfg.d/server.crt.cfg" and the serial file, which
// genSerial makes when it is absent (-1 when that fails).
int genServerCrtHelper(const char* requestPath, const char* caCertPath,
                       const char* outputPath, const char* caKeyPath, int days,
                       const char* aliases);
// genServerCrtHelper with the store's local CA certificate and key.
int genServerCrt(const char* requestPath, const char* outputPath, int days,
                 const char* aliases);
// genCrt, self-signed, with the CA extension file
// "/usr/orva/etc/ssl/cfg.d/ca.crt.cfg".
int genCACrtHelper(const char* requestPath, const char* outputPath,
                   const char* keyPath, int days);

// Runs `command` and copies the first line of its output, line end
// included, into `output` (cut to `size` bytes with the terminating zero).
// 1 when a line was read, 0 (logged) when the command did not start, was
// refused or printed nothing; `output` is untouched then.
int getMd5(char* output, int size, const ShellCommand& command);

// 0 when the key at `keyPath` belongs to the certificate at `certPath`, by
// the digests of their RSA moduli; 1 when not (or, for a key type other
// than CYPHER_RSA, when the key shows no modulus); -1 (logged) when a byte
// order mark could not be stripped, the certificate shows no modulus, or
// the key shows none for CYPHER_RSA. A file whose modulus the tool does not
// print never matches. Strips a leading UTF-8 byte order mark from both
// files in place first (the key's only when the certificate's succeeded).
int verifyCrtAndKey(const char* certPath, const char* keyPath, CYPHER keyType);

// True when the first certificate of `certPath` has an RSA key, the only
// kind whose pair the openssl tool's modulus digests can compare.
bool HasRsaCertificate(const char* certPath);

// The library's proof that the key at `keyPath` belongs to the first
// certificate of `certPath`: 0 when it does, 1 when not, -1 (not logged)
// when either cannot be read. An encrypted key is never opened.
int proveCrtAndKey(const char* certPath, const char* keyPath);

// Whether the key at `keyPath` belongs to the first certificate of
// `certPath`, for any key type: an RSA certificate as verifyCrtAndKey
// compares it (a key that shows no modulus does not match), other
// certificates by the library's comparison of their public keys. 0 when
// they belong together; 1 when not; -1 (logged) when the digest of an RSA
// certificate cannot be made, or another certificate or its key cannot be
// read (an encrypted key is never asked a password for).
int verifyCrtAndKeyOfAnyType(const char* certPath, const char* keyPath);

// Makes the local CA in the store: RSA key (`bits`), request from `subject`
// with the configuration "/usr/orva/etc/ssl/cfg.d/ca.cfg", self-signed
// certificate for 3650 days, and proves the pair. The three are made under
// work names and installed together once proved. 0 on success, otherwise
// the result of the first failed step (-1; -2 for a refused subject; 1 for
// a pair that does not match), logged; the earlier CA then stays as it
// was (only its configuration and extension files are rewritten).
int genCASet(CSR_ARGUMENT* subject, int bits);

// Makes the local CA as genCASet does, with a key of `kind` (refused with
// -1 by checkKeyKind), as members of `set`, which the
// caller installs with files that must go with it. Stores the temporary
// paths of the new CA key and certificate in *key and *certificate (for
// signing before the install). The results are genCASet's; nothing is
// installed either way.
int genCASetInto(StoreFileSet* set, CSR_ARGUMENT* subject, const KeyKind& kind,
                 std::string* key, std::string* certificate);

// Appends every certificate of the PEM file at `path` to `certificates`,
// which owns them; reading stops quietly at the first block that is not a
// readable certificate, and an encrypted block is never asked a password
// for. 0 when the file was opened (also when it held no certificate); -1
// (logged) when not, `certificates` unchanged.
int loadCrtList(const char* path, std::vector<X509Ptr>& certificates);

// 0 when the certificates of both files form one issuing chain: from the
// first certificate of `certPath` upwards, each certificate is issued
// (names agree, signature verifies with the issuer's key) by another of the
// set, in whatever order the files hold them, and none is left over; 1
// when not or when neither file holds a certificate; -1 (logged) for a null, empty or absent
// path or a file that cannot be opened.
int verifyCrtChain(const char* certPath, const char* upperPath);

#endif  // ORVA_TOOLKIT_MKCERT_H_
