#include "api/compatibility.h"

#include <arpa/inet.h>
#include <openssl/err.h>
#include <openssl/objects.h>
#include <openssl/x509v3.h>
#include <strings.h>

#include <string>

#include "common/raii.h"
#include "toolkit/key_strength.h"
#include "toolkit/x509_names.h"

namespace {

using Clients = std::vector<const char*>;

const Clients kEveryClient = {"Chrome", "Firefox", "Safari", "iOS", "curl",
                              "Python", "Go",      "GnuTLS", "OpenSSL"};
const Clients kApple = {"Safari", "iOS"};
// Clients that take a server's names from subjectAltName alone.
const Clients kNamesOnly = {"Chrome", "Firefox", "Safari", "iOS", "Go"};
const Clients kEmptyNames = {"Chrome", "Python 3.13", "OpenSSL (strict)"};
const Clients kStrict = {"Python 3.13", "OpenSSL (strict)"};
// A CA key too small for Apple's rules and the default security level of
// the TLS library the command-line clients use.
const Clients kWeakCaKey = {"Safari", "iOS", "curl", "Python"};
// Clients that never fetch an intermediate certificate the server left out.
const Clients kNoIntermediateFetch = {"curl", "Python", "Go", "GnuTLS", "OpenSSL"};

constexpr long kSoonSeconds = 30L * 24 * 60 * 60;
constexpr int kMaxServerDays = 825;

void Add(Json::Value* verdict, const char* code, const Clients& clients) {
  Json::Value problem(Json::objectValue);
  problem["code"] = code;
  problem["clients"] = Json::Value(Json::arrayValue);
  for (const char* client : clients) problem["clients"].append(client);
  verdict->append(problem);
}

// `text` in the form the name reader writes an address, or "" when it is
// no address literal.
std::string AddressForm(const std::string& text) {
  unsigned char address[16];
  char form[INET6_ADDRSTRLEN] = {0};
  for (int family : {AF_INET, AF_INET6}) {
    if (inet_pton(family, text.c_str(), address) == 1 &&
        inet_ntop(family, address, form, sizeof(form)) != nullptr) {
      return form;
    }
  }
  return "";
}

void CheckNames(X509* certificate, bool server, Json::Value* verdict) {
  GeneralNamesPtr entries(static_cast<GENERAL_NAMES*>(
      X509_get_ext_d2i(certificate, NID_subject_alt_name, nullptr, nullptr)));
  bool present = X509_get_ext_by_NID(certificate, NID_subject_alt_name, -1) >= 0;
  if (present && (!entries || sk_GENERAL_NAME_num(entries.get()) == 0)) {
    Add(verdict, "empty_names", kEmptyNames);
  }
  if (!server) return;
  const std::string common_name = CommonNameOf(X509_get_subject_name(certificate));
  const std::string address = AddressForm(common_name);
  bool host_names = false, listed = false;
  for (const AltName& name : AltNamesOf(entries.get())) {
    if (name.kind == "DNS") {
      host_names = true;
      listed = listed || (address.empty() && strcasecmp(name.value.c_str(), common_name.c_str()) == 0);
    } else if (name.kind == "IP") {
      host_names = true;
      listed = listed || (!address.empty() && name.value == address);
    }
  }
  if (!listed && (!common_name.empty() || !host_names)) {
    Add(verdict, "name_missing", host_names || common_name.empty() ? kEveryClient : kNamesOnly);
  }
}

void CheckServerUse(X509* certificate, Json::Value* verdict) {
  if ((X509_get_extension_flags(certificate) & EXFLAG_XKUSAGE) == 0) {
    Add(verdict, "no_server_auth", kApple);
  } else if ((X509_get_extended_key_usage(certificate) & (XKU_SSL_SERVER | XKU_ANYEKU)) == 0) {
    Add(verdict, "no_server_auth", kEveryClient);
  }
  int days = 0, seconds = 0;
  if (ASN1_TIME_diff(&days, &seconds, X509_get0_notBefore(certificate),
                     X509_get0_notAfter(certificate)) == 1 &&
      (days > kMaxServerDays || (days == kMaxServerDays && seconds > 0))) {
    Add(verdict, "validity_too_long", kApple);
  }
}

bool WeakDigest(X509* certificate) {
  int digest = NID_undef, key = NID_undef;
  if (OBJ_find_sigid_algs(X509_get_signature_nid(certificate), &digest, &key) != 1) return false;
  return digest == NID_md5 || digest == NID_sha1 || digest == NID_md4 || digest == NID_md2;
}

bool IsStrictCa(X509* certificate) {
  int index = X509_get_ext_by_NID(certificate, NID_basic_constraints, -1);
  bool critical = index >= 0 && X509_EXTENSION_get_critical(X509_get_ext(certificate, index)) == 1;
  bool signs = (X509_get_extension_flags(certificate) & EXFLAG_KUSAGE) != 0 &&
               (X509_get_key_usage(certificate) & KU_KEY_CERT_SIGN) != 0;
  return critical && signs;
}

bool IssuedByOneOf(X509* certificate, const std::vector<X509*>& issuers) {
  for (X509* issuer : issuers) {
    if (issuer != certificate && IssuedBy(certificate, issuer)) {
      return true;
    }
  }
  return false;
}

}  // namespace

Json::Value CompatibilityVerdict(X509* certificate, const std::vector<X509*>& issuers,
                                 time_t now) {
  Json::Value verdict(Json::arrayValue);
  const bool ca = X509_check_ca(certificate) != 0;
  const bool self_signed = X509_self_signed(certificate, 0) == 1;
  time_t soon = now + kSoonSeconds;
  if (X509_cmp_time(X509_get0_notAfter(certificate), &now) == -1) {
    Add(&verdict, "expired", kEveryClient);
  } else if (X509_cmp_time(X509_get0_notBefore(certificate), &now) == 1) {
    Add(&verdict, "not_yet_valid", kEveryClient);
  } else if (X509_cmp_time(X509_get0_notAfter(certificate), &soon) == -1) {
    Add(&verdict, "expires_soon", kEveryClient);
  }
  CheckNames(certificate, !ca, &verdict);
  if (!ca) CheckServerUse(certificate, &verdict);
  if (!IsStrongKey(X509_get0_pubkey(certificate))) {
    Add(&verdict, "weak_key", ca ? kWeakCaKey : kEveryClient);
  }
  if (!self_signed && WeakDigest(certificate)) Add(&verdict, "weak_signature", kEveryClient);
  if (ca && !IsStrictCa(certificate)) Add(&verdict, "ca_not_strict", kStrict);
  if (!ca && !self_signed && !IssuedByOneOf(certificate, issuers)) {
    Add(&verdict, "incomplete_chain", kNoIntermediateFetch);
  }
  ERR_clear_error();
  return verdict;
}
