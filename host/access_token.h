#ifndef ORVA_HOST_ACCESS_TOKEN_H_
#define ORVA_HOST_ACCESS_TOKEN_H_

#include <openssl/sha.h>

#include <string>

// The host's access token, which every /webapi request presents as
// "Authorization: Bearer TOKEN".
class AccessToken {
 public:
  AccessToken() = default;

  // Reads the token from the first line of the file at `path` (surrounding
  // blanks and the line end dropped). Returns false with a message in
  // *error when the file cannot be read or holds no token; the object then
  // accepts nothing.
  bool LoadFromFile(const std::string& path, std::string* error);

  // True when `authorization`, the value of an Authorization header, is
  // "Bearer " (scheme in any case) followed by exactly the token. Both sides
  // are compared as SHA-256 digests with a constant-time comparison, so the
  // time taken tells nothing about how much of a guess was right, nor about
  // the token's length.
  bool Accepts(const std::string& authorization) const;

 private:
  bool loaded_ = false;
  unsigned char digest_[SHA256_DIGEST_LENGTH] = {};
};

#endif  // ORVA_HOST_ACCESS_TOKEN_H_
