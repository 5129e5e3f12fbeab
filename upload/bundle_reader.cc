#include "upload/bundle_reader.h"

#include <openssl/err.h>
#include <openssl/pem.h>
#include <openssl/pkcs12.h>
#include <openssl/provider.h>
#include <openssl/x509.h>

#include <algorithm>
#include <cstring>
#include <utility>
#include <vector>

#include "common/api_errors.h"
#include "common/log.h"
#include "common/raii.h"
#include "toolkit/x509_names.h"

namespace {

// Everything a bundle holds, before anything is proved.
struct LooseBundle {
  std::vector<EvpPkeyPtr> keys;
  std::vector<X509Ptr> certificates;
};

// A library context with the algorithms of older PKCS#12 files (RC2, 3DES)
// beside the default ones, for one call: loading them into the process's
// own context would offer them to every TLS handshake too.
class BundleLibrary {
 public:
  BundleLibrary() : context_(OSSL_LIB_CTX_new()) {
    if (!context_) return;
    default_.reset(OSSL_PROVIDER_load(context_.get(), "default"));
    legacy_.reset(OSSL_PROVIDER_load(context_.get(), "legacy"));
  }

  // The context; null when it or a provider could not be made.
  OSSL_LIB_CTX* get() const { return default_ && legacy_ ? context_.get() : nullptr; }

 private:
  LibraryContextPtr context_;  // declared first: freed after the providers
  ProviderPtr default_;
  ProviderPtr legacy_;
};

// Password callback handing out the std::string at `password`; an empty
// password gives none, so an encrypted key fails to open.
int GivePassword(char* buffer, int size, int /*rwflag*/, void* password) {
  const std::string& text = *static_cast<const std::string*>(password);
  if (text.empty() || text.size() > static_cast<size_t>(size)) return 0;
  std::memcpy(buffer, text.data(), text.size());
  return static_cast<int>(text.size());
}

bool IsCertificateBlock(const std::string& name) {
  return name == "CERTIFICATE" || name == "X509 CERTIFICATE" || name == "TRUSTED CERTIFICATE";
}

// "PRIVATE KEY", "ENCRYPTED PRIVATE KEY", "RSA PRIVATE KEY", "EC PRIVATE KEY"...
bool IsKeyBlock(const std::string& name) {
  const std::string suffix = "PRIVATE KEY";
  return name.size() >= suffix.size() &&
         name.compare(name.size() - suffix.size(), suffix.size(), suffix) == 0;
}

// The key of one PEM block, opened with `password`; 5502, 5520 for an
// encrypted block that does not open, 5521 for an unreadable one.
int ReadKeyBlock(const char* name, const char* header, const unsigned char* data, long length,
                 const std::string& password, OSSL_LIB_CTX* library, LooseBundle* bundle) {
  // Written back alone, the block reads through the one reader that knows
  // every key format and both kinds of encryption.
  BioPtr block(BIO_new(BIO_s_mem()));
  EvpPkeyPtr key;
  if (block && PEM_write_bio(block.get(), name, header, data, length) > 0) {
    key.reset(PEM_read_bio_PrivateKey_ex(block.get(), nullptr, GivePassword,
                                         const_cast<std::string*>(&password), library,
                                         nullptr));
  }
  if (key) {
    bundle->keys.push_back(std::move(key));
    return kErrNone;
  }
  if (std::strcmp(name, "ENCRYPTED PRIVATE KEY") == 0 || std::strstr(header, "ENCRYPTED")) {
    ORVA_LOG("The bundle's key does not open with the password given");
    return kErrBundlePassword;
  }
  ORVA_LOG("The bundle's %s block is unreadable", name);
  return kErrBundleNoPair;
}

int ReadPemBundle(const std::string& content, const std::string& password,
                  OSSL_LIB_CTX* library, LooseBundle* bundle) {
  BioPtr text(BIO_new_mem_buf(content.data(), static_cast<int>(content.size())));
  char* name = nullptr;
  char* header = nullptr;
  unsigned char* data = nullptr;
  long length = 0;
  while (text && PEM_read_bio(text.get(), &name, &header, &data, &length) == 1) {
    OpensslMemoryPtr<char> owned_name(name), owned_header(header);
    OpensslMemoryPtr<unsigned char> owned_data(data);
    if (IsCertificateBlock(name)) {
      const unsigned char* cursor = data;
      X509Ptr certificate(std::strcmp(name, "TRUSTED CERTIFICATE") == 0
                              ? d2i_X509_AUX(nullptr, &cursor, length)
                              : d2i_X509(nullptr, &cursor, length));
      if (!certificate) {
        ORVA_LOG("The bundle's %s block is unreadable", name);
        return kErrBundleNoPair;
      }
      bundle->certificates.push_back(std::move(certificate));
    } else if (IsKeyBlock(name)) {
      int read = ReadKeyBlock(name, header, data, length, password, library, bundle);
      if (read != kErrNone) return read;
    }  // Requests and parameters are no part of a certificate set.
  }
  return kErrNone;
}

int ReadPkcs12Bundle(const std::string& content, const std::string& password,
                     OSSL_LIB_CTX* library, LooseBundle* bundle) {
  BioPtr der(BIO_new_mem_buf(content.data(), static_cast<int>(content.size())));
  // Made in `library` first, so its bags decrypt with the older algorithms.
  PKCS12* raw = PKCS12_init_ex(NID_pkcs7_data, library, nullptr);
  const bool read = der && raw && d2i_PKCS12_bio(der.get(), &raw) != nullptr;
  Pkcs12Ptr file(raw);  // The reader frees and clears `raw` when it fails.
  if (!read) {
    ORVA_LOG("The bundle is neither PEM text nor a PKCS#12 file");
    return kErrBundleNoPair;
  }
  const char* given = password.c_str();
  if (PKCS12_mac_present(file.get()) && PKCS12_verify_mac(file.get(), given, -1) != 1 &&
      !(password.empty() && PKCS12_verify_mac(file.get(), nullptr, 0) == 1)) {
    ORVA_LOG("The bundle's password is wrong");
    return kErrBundlePassword;
  }
  EVP_PKEY* key = nullptr;
  X509* certificate = nullptr;
  STACK_OF(X509)* others = nullptr;
  if (PKCS12_parse(file.get(), given, &key, &certificate, &others) != 1) {
    ORVA_LOG("The bundle's content does not open with its password");
    return kErrBundlePassword;
  }
  X509StackPtr owned_others(others);
  if (key != nullptr) bundle->keys.emplace_back(key);
  if (certificate != nullptr) bundle->certificates.emplace_back(certificate);
  while (others != nullptr && sk_X509_num(others) > 0) {
    bundle->certificates.emplace_back(sk_X509_shift(others));
  }
  return kErrNone;
}

// Moves the certificates of `others` that issued `leaf`, and those that
// issued them, into *chain, leaf-upwards. False when any is left over.
bool OrderChain(X509* leaf, std::vector<X509Ptr>* others, std::vector<X509Ptr>* chain) {
  for (X509* current = leaf;;) {
    auto issuer = std::find_if(others->begin(), others->end(), [current](const X509Ptr& other) {
      return IssuedBy(current, other.get());
    });
    if (issuer == others->end()) break;
    chain->push_back(std::move(*issuer));
    others->erase(issuer);
    current = chain->back().get();
  }
  return others->empty();
}

// The PEM text of `certificates`; "" when one cannot be written.
std::string PemOf(const std::vector<X509*>& certificates) {
  BioPtr text(BIO_new(BIO_s_mem()));
  for (X509* certificate : certificates) {
    if (!text || PEM_write_bio_X509(text.get(), certificate) != 1) return "";
  }
  char* data = nullptr;
  long size = text ? BIO_get_mem_data(text.get(), &data) : 0;
  return std::string(data == nullptr ? "" : data, static_cast<size_t>(size));
}

// Finds the leaf of `bundle`, orders its chain and writes the parts.
int SortOut(LooseBundle* bundle, BundleParts* parts) {
  if (bundle->keys.size() != 1) {
    ORVA_LOG("The bundle holds %zu keys: it must hold one", bundle->keys.size());
    return kErrBundleNoPair;
  }
  EVP_PKEY* key = bundle->keys.front().get();
  std::vector<X509Ptr> others;
  X509Ptr leaf;
  for (X509Ptr& certificate : bundle->certificates) {
    const bool repeated = std::any_of(others.begin(), others.end(), [&](const X509Ptr& seen) {
      return X509_cmp(seen.get(), certificate.get()) == 0;
    }) || (leaf && X509_cmp(leaf.get(), certificate.get()) == 0);
    if (repeated) continue;
    if (!leaf && X509_check_private_key(certificate.get(), key) == 1) {
      leaf = std::move(certificate);
    } else {
      others.push_back(std::move(certificate));
    }
  }
  if (!leaf) {
    ORVA_LOG("No certificate of the bundle belongs to its key");
    return kErrBundleNoPair;
  }
  std::vector<X509Ptr> chain;
  if (!OrderChain(leaf.get(), &others, &chain)) {
    ORVA_LOG("%zu certificates of the bundle belong to no path up from its certificate",
             others.size());
    return kErrChain;
  }
  std::vector<X509*> upwards;
  for (const X509Ptr& certificate : chain) upwards.push_back(certificate.get());
  BioPtr key_text(BIO_new(BIO_s_mem()));
  char* data = nullptr;
  if (!key_text ||
      PEM_write_bio_PrivateKey(key_text.get(), key, nullptr, nullptr, 0, nullptr, nullptr) != 1) {
    ORVA_LOG("Write the bundle's key failed");
    return kErrBundleNoPair;
  }
  long size = BIO_get_mem_data(key_text.get(), &data);
  parts->certificate = PemOf({leaf.get()});
  parts->chain = PemOf(upwards);
  parts->key.assign(data, static_cast<size_t>(size));
  return kErrNone;
}

}  // namespace

int ReadBundle(const std::string& content, const std::string& password, BundleParts* parts) {
  // Declared first, so every key and certificate made in it goes before it.
  BundleLibrary library;
  if (library.get() == nullptr) {
    ORVA_LOG("Load the PKCS#12 algorithms failed");
    return kErrFailed;
  }
  int result;
  {
    LooseBundle bundle;
    result = content.find("-----BEGIN ") != std::string::npos
                 ? ReadPemBundle(content, password, library.get(), &bundle)
                 : ReadPkcs12Bundle(content, password, library.get(), &bundle);
    if (result == kErrNone) result = SortOut(&bundle, parts);
  }
  ERR_clear_error();  // The end of PEM text and refused pairs read as failures.
  return result;
}
