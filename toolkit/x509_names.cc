#include "toolkit/x509_names.h"

#include <arpa/inet.h>
#include <openssl/crypto.h>
#include <openssl/err.h>

std::string Utf8Text(const ASN1_STRING* value) {
  unsigned char* text = nullptr;
  int length = ASN1_STRING_to_UTF8(&text, value);
  std::string result;
  if (length > 0) result.assign(reinterpret_cast<char*>(text), static_cast<size_t>(length));
  OPENSSL_free(text);
  return result;
}

std::string CommonNameOf(const X509_NAME* name) {
  int index = X509_NAME_get_index_by_NID(name, NID_commonName, -1);
  return index < 0 ? "" : Utf8Text(X509_NAME_ENTRY_get_data(X509_NAME_get_entry(name, index)));
}

namespace {

std::string AddressText(const ASN1_OCTET_STRING* address) {
  char text[INET6_ADDRSTRLEN] = {0};
  int length = ASN1_STRING_length(address);
  int family = length == 4 ? AF_INET : length == 16 ? AF_INET6 : 0;
  if (family == 0 ||
      inet_ntop(family, ASN1_STRING_get0_data(address), text, sizeof(text)) == nullptr) {
    return "";
  }
  return text;
}

}  // namespace

std::vector<AltName> AltNamesOf(const GENERAL_NAMES* names) {
  std::vector<AltName> entries;
  for (int i = 0; names != nullptr && i < sk_GENERAL_NAME_num(names); ++i) {
    const GENERAL_NAME* name = sk_GENERAL_NAME_value(names, i);
    switch (name->type) {
      case GEN_DNS:
        entries.push_back({"DNS", Utf8Text(name->d.dNSName)});
        break;
      case GEN_IPADD:
        entries.push_back({"IP", AddressText(name->d.iPAddress)});
        break;
      case GEN_EMAIL:
        entries.push_back({"email", Utf8Text(name->d.rfc822Name)});
        break;
      case GEN_URI:
        entries.push_back({"URI", Utf8Text(name->d.uniformResourceIdentifier)});
        break;
      default:
        entries.push_back({"other", ""});
    }
  }
  return entries;
}

bool IssuedBy(X509* subject, X509* issuer) {
  const bool issued = X509_check_issued(issuer, subject) == X509_V_OK &&
                      X509_verify(subject, X509_get0_pubkey(issuer)) == 1;
  ERR_clear_error();
  return issued;
}
