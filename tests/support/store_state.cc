#include "tests/support/store_state.h"

#include <sys/stat.h>

#include <openssl/pem.h>
#include <openssl/x509.h>

#include <filesystem>
#include <utility>
#include <vector>

#include <gtest/gtest.h>

#include "common/pem_password.h"
#include "common/raii.h"
#include "common/store_paths.h"
#include "tests/support/certificates.h"

namespace fs = std::filesystem;

namespace {

bool EndsWith(const std::string& text, const std::string& end) {
  return text.size() >= end.size() &&
         text.compare(text.size() - end.size(), end.size(), end) == 0;
}

bool IsWorkFile(const std::string& path) {
  const std::string name = fs::path(path).filename();
  return name.find(".tmp") != std::string::npos ||
         (name[0] == '.' && name != ".mkcert.serial" && name != ".gen");
}

// Reads the PEM objects of `content` as the store path `name` says (key,
// certificate or request): how many decoded, and the public key of the
// first; null when none decoded. A cut object does not decode.
EvpPkeyPtr ReadObjects(const std::string& name, const std::string& content, size_t* decoded) {
  BioPtr bio(BIO_new_mem_buf(content.data(), static_cast<int>(content.size())));
  EvpPkeyPtr first;
  for (*decoded = 0;; ++*decoded) {
    EvpPkeyPtr key;
    if (EndsWith(name, ".key")) {
      key.reset(PEM_read_bio_PrivateKey(bio.get(), nullptr, RefusePemPassword, nullptr));
    } else if (EndsWith(name, ".crt")) {
      X509Ptr certificate(PEM_read_bio_X509(bio.get(), nullptr, RefusePemPassword, nullptr));
      if (certificate) key.reset(X509_get_pubkey(certificate.get()));
    } else if (EndsWith(name, ".csr")) {
      X509_REQ* request = PEM_read_bio_X509_REQ(bio.get(), nullptr, RefusePemPassword, nullptr);
      if (request) key.reset(X509_REQ_get_pubkey(request));
      X509_REQ_free(request);
    }
    if (!key) return first;
    if (!first) first = std::move(key);
  }
}

// Keys and requests hold one object, certificate files one or more.
bool IsWholeFileOfItsKind(const std::string& name, const std::string& content) {
  if (EndsWith(name, ".key") || EndsWith(name, ".crt") || EndsWith(name, ".csr")) {
    size_t blocks = 0, decoded = 0;
    for (size_t at = content.find("-----BEGIN"); at != std::string::npos;
         at = content.find("-----BEGIN", at + 1)) {
      ++blocks;
    }
    ReadObjects(name, content, &decoded);
    return decoded == blocks && (EndsWith(name, ".crt") ? blocks > 0 : blocks == 1);
  }
  if (name == ".mkcert.serial") {
    const std::string digits = content.substr(0, content.find_last_not_of('\n') + 1);
    return !digits.empty() &&
           digits.find_first_not_of("0123456789ABCDEFabcdef") == std::string::npos;
  }
  if (name.rfind("cfg.d/", 0) == 0) return !content.empty() && content.back() == '\n';
  return name == ".gen/archive.zip" && content.rfind("PK", 0) == 0;
}

void ExpectPair(const StoreState& state, const std::string& key, const std::string& other) {
  if (state.count(key) == 0 || state.count(other) == 0) return;
  size_t decoded = 0;
  EvpPkeyPtr privateKey = ReadObjects(key, state.at(key).content, &decoded);
  EvpPkeyPtr publicKey = ReadObjects(other, state.at(other).content, &decoded);
  EXPECT_TRUE(privateKey && publicKey && EVP_PKEY_eq(privateKey.get(), publicKey.get()) == 1)
      << key << " does not belong to " << other;
}

}  // namespace

StoreState ReadStore(const TempDeviceRoot& root) {
  const fs::path store = root.Path(kStore);
  StoreState state;
  std::error_code error;
  for (fs::recursive_directory_iterator entry(store, error), end; !error && entry != end;
       entry.increment(error)) {
    if (entry->is_directory()) continue;
    const fs::perms mode = entry->symlink_status().permissions();
    state[fs::relative(entry->path(), store)] = {ReadFile(entry->path()),
                                                 static_cast<mode_t>(mode)};
  }
  return state;
}

void RestoreStore(const TempDeviceRoot& root, const StoreState& state) {
  // The store may be a mount point, so it stays and only its entries go.
  std::vector<fs::path> entries;
  for (const fs::directory_entry& entry : fs::directory_iterator(root.Path(kStore))) {
    entries.push_back(entry.path());
  }
  for (const fs::path& entry : entries) fs::remove_all(entry);
  for (const auto& [name, file] : state) {
    root.WriteFile(std::string(kStore) + "/" + name, file.content, file.mode);
  }
}

void InstallOldStore(const TempDeviceRoot& root) {
  const std::string caKey = root.Path(kCaKeyPath), caCrt = root.Path(kCaCrtPath);
  ASSERT_TRUE(MakeSelfSignedCa(caKey, caCrt, "/CN=Old Root"));
  MakeDirs(root.Path(kStore) + "/ssl.csr");
  ASSERT_TRUE(RunForTest("openssl req -new -key '" + caKey + "' -subj '/CN=Old Root' -out '" +
                         root.Path(kCaCsrPath) + "'"));
  ASSERT_TRUE(MakeSignedCertificate(caKey, caCrt, root.Path(kServerKeyPath),
                                    root.Path(kServerCrtPath), "/C=TW/O=Old Works/CN=old.local"));
  root.WriteFile(kInterCrtPath, ReadFile(caCrt));
  ASSERT_TRUE(MakeRequest(root.Path(kGenKeyPath), root.Path(kGenCsrPath), "/CN=pending.local"));
  root.WriteFile(kGenCrtPath, ReadFile(root.Path(kServerCrtPath)), 0400);
  root.WriteFile(kSerialPath, "5F3A11");
  root.WriteFile(kCaCfgPath, "[ req ]\n");
  for (const char* key : {kCaKeyPath, kServerKeyPath, kGenKeyPath}) {
    chmod(root.Path(key).c_str(), 0400);
  }
  ASSERT_TRUE(MakeRequest(root.Path("/outside/request.key"), root.Path("/outside/request.csr"),
                          "/CN=client.local"));
  ASSERT_TRUE(MakeSignedCertificate(caKey, caCrt, root.Path("/outside/server.key"),
                                    root.Path("/outside/server.crt"), "/CN=imported.local"));
  root.WriteFile("/outside/server-ca.crt", ReadFile(caCrt));
}

void ExpectStoreWhole(const TempDeviceRoot& root, const StoreState& before) {
  const StoreState now = ReadStore(root);
  for (const auto& [name, file] : now) {
    SCOPED_TRACE(name);
    EXPECT_FALSE(IsWorkFile(name)) << "a file in progress was left behind";
    auto old = before.find(name);
    if (old != before.end() && old->second.content == file.content) continue;
    EXPECT_TRUE(IsWholeFileOfItsKind(name, file.content))
        << "neither the old file nor a whole new one (" << file.content.size() << " bytes)";
  }
  ExpectPair(now, "ssl.key/server.key", "ssl.crt/server.crt");
  ExpectPair(now, "ssl.key/ca.key", "ssl.crt/ca.crt");
  ExpectPair(now, "ssl.key/ca.key", "ssl.csr/ca.csr");
  ExpectPair(now, ".gen/server.key", ".gen/server.csr");
}

std::map<std::string, std::string> CertificateFiles(const StoreState& state) {
  std::map<std::string, std::string> files;
  for (const auto& [name, file] : state) {
    if (EndsWith(name, ".key") || EndsWith(name, ".crt") || EndsWith(name, ".csr")) {
      files[name] = file.content;
    }
  }
  return files;
}
