#include "host/access_token.h"

#include <openssl/crypto.h>

#include <cctype>
#include <fstream>

namespace {

constexpr char kBearerScheme[] = "bearer ";
constexpr size_t kBearerSchemeLength = sizeof(kBearerScheme) - 1;

void Digest(const std::string& text, unsigned char* digest) {
  SHA256(reinterpret_cast<const unsigned char*>(text.data()), text.size(), digest);
}

std::string Trim(const std::string& text) {
  const char* kBlanks = " \t\r\n";
  std::string::size_type first = text.find_first_not_of(kBlanks);
  if (first == std::string::npos) return "";
  return text.substr(first, text.find_last_not_of(kBlanks) - first + 1);
}

}  // namespace

bool AccessToken::LoadFromFile(const std::string& path, std::string* error) {
  loaded_ = false;
  std::ifstream file(path);
  std::string line;
  if (!file || !std::getline(file, line)) {
    *error = "cannot read the access token " + path;
    return false;
  }
  std::string token = Trim(line);
  if (token.empty()) {
    *error = "the access token file " + path + " is empty";
    return false;
  }
  Digest(token, digest_);
  loaded_ = true;
  return true;
}

bool AccessToken::Accepts(const std::string& authorization) const {
  if (!loaded_ || authorization.size() <= kBearerSchemeLength) return false;
  for (size_t i = 0; i < kBearerSchemeLength; ++i) {
    if (std::tolower(static_cast<unsigned char>(authorization[i])) != kBearerScheme[i]) {
      return false;
    }
  }
  unsigned char presented[SHA256_DIGEST_LENGTH];
  Digest(authorization.substr(kBearerSchemeLength), presented);
  return CRYPTO_memcmp(presented, digest_, sizeof(digest_)) == 0;
}
