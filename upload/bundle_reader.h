#ifndef ORVA_UPLOAD_BUNDLE_READER_H_
#define ORVA_UPLOAD_BUNDLE_READER_H_

#include <string>

// A certificate set as one uploaded file, sorted out and written as PEM text
// for the import's checks.
struct BundleParts {
  std::string certificate;  // the certificate of the key
  std::string chain;        // the other certificates, leaf-upwards; "" for none
  std::string key;          // the key, unencrypted ("BEGIN PRIVATE KEY")
};

// Reads the bundle `content`. Its content decides the format: PEM text (any
// "-----BEGIN " line) holding certificates and one private key in any
// order, the key encrypted or not, other blocks skipped; or else PKCS#12
// (DER), read with the algorithms of older files (RC2, 3DES) as well.
// `password` opens an encrypted key and a PKCS#12 file ("" for none). The
// certificate whose public key matches the key is the leaf; the others are
// ordered from it upwards, each issued (names and signature) by the next,
// and repeats of a certificate are dropped.
//
// Returns 5502 and fills *parts; otherwise, logged, with *parts untouched:
// 5520 when the password does not open the file or its key (or none was
// given for an encrypted one); 5521 when it holds no key or more than one,
// no certificate of the key, an unreadable block, or is neither format;
// 5517 when a certificate belongs to no path up from the leaf. Touches
// nothing on disk and leaves the process's library context as it was.
int ReadBundle(const std::string& content, const std::string& password, BundleParts* parts);

#endif  // ORVA_UPLOAD_BUNDLE_READER_H_
