#ifndef ORVA_TOOLKIT_REQUEST_FACTS_H_
#define ORVA_TOOLKIT_REQUEST_FACTS_H_

#include <string>
#include <vector>

// What the extension file of a certificate takes from the request it is
// signed from.
struct RequestFacts {
  std::string common_name;         // the first common name as UTF-8; "" for none
  bool has_email = false;          // the subject holds an e-mail address
  std::vector<std::string> names;  // its subjectAltName DNS entries as they
                                   // stand and IP entries as address text
  bool ec_key = false;             // its public key is an EC key
};

// Reads the PEM request at `path` with the library. False (logged) when it
// cannot be opened or does not decode; `facts` is then untouched.
bool ReadRequestFacts(const char* path, RequestFacts* facts);

#endif  // ORVA_TOOLKIT_REQUEST_FACTS_H_
