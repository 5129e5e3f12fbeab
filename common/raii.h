#ifndef ORVA_COMMON_RAII_H_
#define ORVA_COMMON_RAII_H_

#include <dirent.h>
#include <openssl/bio.h>
#include <openssl/crypto.h>
#include <openssl/evp.h>
#include <openssl/pkcs12.h>
#include <openssl/provider.h>
#include <openssl/x509.h>
#include <openssl/x509v3.h>

#include <cstdio>
#include <memory>

// Owners for C resources: each is released on every path by its deleter.

struct FileCloser {
  void operator()(FILE* file) const { std::fclose(file); }
};
using FilePtr = std::unique_ptr<FILE, FileCloser>;

struct X509Deleter {
  void operator()(X509* certificate) const { X509_free(certificate); }
};
using X509Ptr = std::unique_ptr<X509, X509Deleter>;

struct EvpPkeyDeleter {
  void operator()(EVP_PKEY* key) const { EVP_PKEY_free(key); }
};
using EvpPkeyPtr = std::unique_ptr<EVP_PKEY, EvpPkeyDeleter>;

struct X509NameDeleter {
  void operator()(X509_NAME* name) const { X509_NAME_free(name); }
};
using X509NamePtr = std::unique_ptr<X509_NAME, X509NameDeleter>;

struct X509ReqDeleter {
  void operator()(X509_REQ* request) const { X509_REQ_free(request); }
};
using X509ReqPtr = std::unique_ptr<X509_REQ, X509ReqDeleter>;

struct GeneralNamesDeleter {
  void operator()(GENERAL_NAMES* names) const { GENERAL_NAMES_free(names); }
};
using GeneralNamesPtr = std::unique_ptr<GENERAL_NAMES, GeneralNamesDeleter>;

struct BioDeleter {
  void operator()(BIO* bio) const { BIO_free(bio); }
};
using BioPtr = std::unique_ptr<BIO, BioDeleter>;

struct DirCloser {
  void operator()(DIR* directory) const { closedir(directory); }
};
using DirPtr = std::unique_ptr<DIR, DirCloser>;

// A stack of certificates that owns them: all are freed with the stack.
struct X509StackDeleter {
  void operator()(STACK_OF(X509)* stack) const { sk_X509_pop_free(stack, X509_free); }
};
using X509StackPtr = std::unique_ptr<STACK_OF(X509), X509StackDeleter>;

struct Pkcs12Deleter {
  void operator()(PKCS12* bundle) const { PKCS12_free(bundle); }
};
using Pkcs12Ptr = std::unique_ptr<PKCS12, Pkcs12Deleter>;

// A provider loaded into a library context must be unloaded before the
// context is freed.
struct LibraryContextDeleter {
  void operator()(OSSL_LIB_CTX* context) const { OSSL_LIB_CTX_free(context); }
};
using LibraryContextPtr = std::unique_ptr<OSSL_LIB_CTX, LibraryContextDeleter>;

struct ProviderUnloader {
  void operator()(OSSL_PROVIDER* provider) const { OSSL_PROVIDER_unload(provider); }
};
using ProviderPtr = std::unique_ptr<OSSL_PROVIDER, ProviderUnloader>;

// Memory the library allocated (OPENSSL_malloc) for the caller.
struct OpensslFree {
  void operator()(void* memory) const { OPENSSL_free(memory); }
};
template <typename T>
using OpensslMemoryPtr = std::unique_ptr<T, OpensslFree>;

#endif  // ORVA_COMMON_RAII_H_
