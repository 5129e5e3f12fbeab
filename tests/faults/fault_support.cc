#include "tests/faults/fault_support.h"

#include <dirent.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <unistd.h>

#include <openssl/pem.h>
#include <openssl/x509.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>

#include <gtest/gtest.h>

#include "api/certificate.h"
#include "common/pem_password.h"
#include "common/raii.h"
#include "platform/webapi/api_download.h"
#include "tests/support/certificates.h"

namespace {

constexpr char kFiller[] = ".filler";

std::string StorePath(const TempDeviceRoot& root) { return root.Path(kStore); }

// Calls `visit` with the path relative to `base` of every regular file
// under `base/relative`.
void WalkFiles(const std::string& base, const std::string& relative,
               const std::function<void(const std::string&)>& visit) {
  DirPtr directory(opendir((base + "/" + relative).c_str()));
  if (!directory) return;
  while (struct dirent* entry = readdir(directory.get())) {
    std::string name = entry->d_name;
    if (name == "." || name == "..") continue;
    std::string child = relative.empty() ? name : relative + "/" + name;
    struct stat info;
    if (lstat((base + "/" + child).c_str(), &info) != 0) continue;
    if (S_ISDIR(info.st_mode)) {
      WalkFiles(base, child, visit);
    } else {
      visit(child);
    }
  }
}

void RemoveContents(const std::string& folder) {
  DirPtr directory(opendir(folder.c_str()));
  if (!directory) return;
  while (struct dirent* entry = readdir(directory.get())) {
    std::string name = entry->d_name;
    if (name == "." || name == "..") continue;
    std::string path = folder + "/" + name;
    struct stat info;
    if (lstat(path.c_str(), &info) == 0 && S_ISDIR(info.st_mode)) {
      RemoveContents(path);
      rmdir(path.c_str());
    } else {
      unlink(path.c_str());
    }
  }
}

std::string BaseName(const std::string& path) {
  return path.substr(path.rfind('/') == std::string::npos ? 0 : path.rfind('/') + 1);
}

bool EndsWith(const std::string& text, const std::string& end) {
  return text.size() >= end.size() &&
         text.compare(text.size() - end.size(), end.size(), end) == 0;
}

// Names of files in progress: the toolkit's "NAME.tmpXXXXXX", and any
// hidden file (".new-NAME", ".server.key.XXXXXX" and the like) but the
// serial file and a file a test put in place of the generation folder.
bool IsWorkFile(const std::string& name) {
  return name.find(".tmp") != std::string::npos ||
         (name[0] == '.' && name != ".mkcert.serial" && name != ".gen");
}

BioPtr MemoryBio(const std::string& content) {
  return BioPtr(BIO_new_mem_buf(content.data(), static_cast<int>(content.size())));
}

size_t CountOf(const std::string& text, const std::string& part) {
  size_t count = 0;
  for (size_t at = text.find(part); at != std::string::npos;
       at = text.find(part, at + 1)) {
    ++count;
  }
  return count;
}

bool IsWholeKey(const std::string& content) {
  BioPtr bio = MemoryBio(content);
  EvpPkeyPtr key(PEM_read_bio_PrivateKey(bio.get(), nullptr, RefusePemPassword, nullptr));
  return key != nullptr && CountOf(content, "-----BEGIN") == 1;
}

bool IsWholeCertificateFile(const std::string& content) {
  BioPtr bio = MemoryBio(content);
  size_t decoded = 0;
  while (X509Ptr(PEM_read_bio_X509(bio.get(), nullptr, RefusePemPassword, nullptr))) {
    ++decoded;
  }
  return decoded > 0 && decoded == CountOf(content, "-----BEGIN");
}

bool IsWholeRequest(const std::string& content) {
  BioPtr bio = MemoryBio(content);
  X509_REQ* request = PEM_read_bio_X509_REQ(bio.get(), nullptr, RefusePemPassword, nullptr);
  X509_REQ_free(request);
  return request != nullptr && CountOf(content, "-----BEGIN") == 1;
}

bool IsWholeSerial(const std::string& content) {
  std::string digits = content;
  if (!digits.empty() && digits.back() == '\n') digits.pop_back();
  return !digits.empty() &&
         digits.find_first_not_of("0123456789ABCDEFabcdef") == std::string::npos;
}

// True when `content` is a complete file of the kind its store path holds.
bool IsWholeFileOfItsKind(const std::string& name, const std::string& content) {
  if (EndsWith(name, ".key")) return IsWholeKey(content);
  if (EndsWith(name, ".crt")) return IsWholeCertificateFile(content);
  if (EndsWith(name, ".csr")) return IsWholeRequest(content);
  if (name == ".mkcert.serial") return IsWholeSerial(content);
  if (name.rfind("cfg.d/", 0) == 0) return !content.empty() && content.back() == '\n';
  if (name == ".gen/archive.zip") return content.rfind("PK", 0) == 0;
  return false;
}

EvpPkeyPtr ReadKey(const std::string& content) {
  BioPtr bio = MemoryBio(content);
  return EvpPkeyPtr(PEM_read_bio_PrivateKey(bio.get(), nullptr, RefusePemPassword, nullptr));
}

void ExpectCertificatePair(const StoreState& state, const std::string& key,
                           const std::string& certificate) {
  auto key_file = state.find(key);
  auto certificate_file = state.find(certificate);
  if (key_file == state.end() || certificate_file == state.end()) return;
  EvpPkeyPtr private_key = ReadKey(key_file->second.content);
  BioPtr bio = MemoryBio(certificate_file->second.content);
  X509Ptr cert(PEM_read_bio_X509(bio.get(), nullptr, RefusePemPassword, nullptr));
  EXPECT_TRUE(private_key && cert && X509_check_private_key(cert.get(), private_key.get()) == 1)
      << key << " does not belong to " << certificate;
}

void ExpectRequestPair(const StoreState& state, const std::string& key,
                       const std::string& request) {
  auto key_file = state.find(key);
  auto request_file = state.find(request);
  if (key_file == state.end() || request_file == state.end()) return;
  EvpPkeyPtr private_key = ReadKey(key_file->second.content);
  BioPtr bio = MemoryBio(request_file->second.content);
  X509_REQ* req = PEM_read_bio_X509_REQ(bio.get(), nullptr, RefusePemPassword, nullptr);
  EXPECT_TRUE(private_key && req && X509_REQ_check_private_key(req, private_key.get()) == 1)
      << key << " does not belong to " << request;
  X509_REQ_free(req);
}

// Makes the test process's mounts its own, once.
bool EnterPrivateMounts(std::string* why) {
  static int result = -1;
  static std::string reason;
  if (result == -1) {
    if (geteuid() != 0) {
      reason = "the tests do not run as root";
    } else if (unshare(CLONE_NEWNS) != 0) {
      reason = std::string("unshare(CLONE_NEWNS): ") + std::strerror(errno);
    } else if (mount("none", "/", "none", MS_REC | MS_PRIVATE, nullptr) != 0) {
      reason = std::string("making mounts private: ") + std::strerror(errno);
    }
    result = reason.empty() ? 1 : 0;
  }
  if (why != nullptr) *why = reason;
  return result == 1;
}

Json::Value SubjectParams(const char* prefix) {
  Json::Value params(Json::objectValue);
  const char* fields[][2] = {{"country", "TW"},       {"state", "Taipei"},
                             {"city", "Neihu"},       {"organization", "Storage Works"},
                             {"department", "Lab"},   {"common_name", "new.local"},
                             {"email", "admin@new.local"}};
  for (const auto& field : fields) params[std::string(prefix) + field[0]] = field[1];
  return params;
}

ORVA::APIResponse Call(void (*handler)(ORVA::APIRequest*, ORVA::APIResponse*),
                       const char* api, const char* method, const Json::Value& params) {
  ORVA::APIRequest request(api, method, 1, params);
  ORVA::APIResponse response;
  handler(&request, &response);
  return response;
}

}  // namespace

StoreState ReadStore(const TempDeviceRoot& root) {
  StoreState state;
  const std::string store = StorePath(root);
  WalkFiles(store, "", [&](const std::string& name) {
    if (name == kFiller) return;
    struct stat info;
    lstat((store + "/" + name).c_str(), &info);
    state[name] = {ReadFile(store + "/" + name), info.st_mode & 07777};
  });
  return state;
}

void RestoreStore(const TempDeviceRoot& root, const StoreState& state) {
  const std::string store = StorePath(root);
  RemoveContents(store);
  for (const auto& [name, file] : state) {
    root.WriteFile(std::string(kStore) + "/" + name, file.content, file.mode);
  }
}

void InstallOldStore(const TempDeviceRoot& root) {
  const std::string ssl = StorePath(root);
  ASSERT_TRUE(MakeSelfSignedCa(ssl + "/ssl.key/ca.key", ssl + "/ssl.crt/ca.crt",
                               "/CN=Old Root", 1024));
  MakeDirs(ssl + "/ssl.csr");
  ASSERT_TRUE(RunForTest("openssl req -new -key '" + ssl + "/ssl.key/ca.key' -subj '/CN=Old Root' -out '" +
                         ssl + "/ssl.csr/ca.csr'"));
  ASSERT_TRUE(MakeSignedCertificate(ssl + "/ssl.key/ca.key", ssl + "/ssl.crt/ca.crt",
                                    ssl + "/ssl.key/server.key",
                                    ssl + "/ssl.crt/server.crt", "/C=TW/O=Old Works/CN=old.local", 1024));
  root.WriteFile(std::string(kStore) + "/ssl.intercrt/server-ca.crt",
                 ReadFile(ssl + "/ssl.crt/ca.crt"));
  ASSERT_TRUE(MakeRequest(ssl + "/.gen/server.key", ssl + "/.gen/server.csr",
                          "/CN=pending.local", 1024));
  root.WriteFile(std::string(kStore) + "/.gen/server.crt",
                 ReadFile(ssl + "/ssl.crt/server.crt"), 0400);
  root.WriteFile(std::string(kStore) + "/.mkcert.serial", "5F3A11");
  root.WriteFile(std::string(kStore) + "/cfg.d/ca.cfg", "[ req ]\n");
  for (const char* key : {"/ssl.key/ca.key", "/ssl.key/server.key", "/.gen/server.key"}) {
    chmod((ssl + key).c_str(), 0400);
  }
  ASSERT_TRUE(MakeRequest(root.Path("/outside/request.key"),
                          root.Path("/outside/request.csr"), "/CN=client.local", 1024));
  ASSERT_TRUE(MakeSignedCertificate(ssl + "/ssl.key/ca.key", ssl + "/ssl.crt/ca.crt",
                                    root.Path("/outside/server.key"),
                                    root.Path("/outside/server.crt"), "/CN=imported.local", 1024));
  root.WriteFile("/outside/server-ca.crt", ReadFile(ssl + "/ssl.crt/ca.crt"));
}

void ExpectStoreWhole(const TempDeviceRoot& root, const StoreState& before) {
  const StoreState now = ReadStore(root);
  for (const auto& [name, file] : now) {
    SCOPED_TRACE(name);
    EXPECT_FALSE(IsWorkFile(BaseName(name))) << "a file in progress was left behind";
    auto old = before.find(name);
    if (old != before.end() && old->second.content == file.content) continue;
    EXPECT_TRUE(IsWholeFileOfItsKind(name, file.content))
        << "neither the old file nor a whole new one (" << file.content.size() << " bytes)";
  }
  ExpectCertificatePair(now, "ssl.key/server.key", "ssl.crt/server.crt");
  ExpectCertificatePair(now, "ssl.key/ca.key", "ssl.crt/ca.crt");
  ExpectRequestPair(now, "ssl.key/ca.key", "ssl.csr/ca.csr");
  ExpectRequestPair(now, ".gen/server.key", ".gen/server.csr");
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

void InstallFaultyOpenssl(const TempDeviceRoot& root, const ToolFault& fault) {
  const std::string runs = root.Path("/openssl.runs");
  unlink(runs.c_str());
  // At most 16 MiB of filler, so a store that is not on a small disk is
  // never used to fill the machine's.
  root.WriteScript(
      "/usr/orva/bin/openssl",
      "runs=$(cat '" + runs + "' 2>/dev/null || echo 0)\n"
      "runs=$((runs + 1))\n"
      "echo \"$runs\" > '" + runs + "'\n"
      "if [ \"$runs\" -eq " + std::to_string(fault.fail_run) + " ]; then exit 1; fi\n"
      "if [ \"$runs\" -eq " + std::to_string(fault.fill_disk_run) + " ]; then\n"
      "  dd if=/dev/zero of='" + StorePath(root) + "/" + kFiller +
      "' bs=4096 count=4096 2>/dev/null\n"
      "fi\n"
      "exec /usr/bin/openssl \"$@\"");
}

int ToolRuns(const TempDeviceRoot& root) {
  return std::atoi(ReadFile(root.Path("/openssl.runs")).c_str());
}

void FillDisk(const TempDeviceRoot& root, off_t room) {
  const std::string path = StorePath(root) + "/" + kFiller;
  {
    FilePtr filler(std::fopen(path.c_str(), "w"));
    ASSERT_TRUE(filler != nullptr);
    static const char kBlock[4096] = {0};
    for (int i = 0; i < 4096; ++i) {
      if (std::fwrite(kBlock, 1, sizeof(kBlock), filler.get()) != sizeof(kBlock) ||
          std::fflush(filler.get()) != 0) {
        break;
      }
    }
  }
  struct stat info;
  ASSERT_TRUE(stat(path.c_str(), &info) == 0 && info.st_size >= room);
  ASSERT_EQ(0, truncate(path.c_str(), info.st_size - room));
}

void FreeDisk(const TempDeviceRoot& root) {
  unlink((StorePath(root) + "/" + kFiller).c_str());
}

TestMounts::~TestMounts() {
  for (auto path = mounted_.rbegin(); path != mounted_.rend(); ++path) {
    umount2(path->c_str(), MNT_DETACH);  // Ignoring errors: nothing else to do.
  }
}

bool TestMounts::Available(std::string* why) { return EnterPrivateMounts(why); }

bool TestMounts::Tmpfs(const std::string& path, size_t bytes) {
  if (!EnterPrivateMounts(nullptr)) return false;
  std::string options = "size=" + std::to_string(bytes) + ",mode=0755";
  if (mount("tmpfs", path.c_str(), "tmpfs", 0, options.c_str()) != 0) return false;
  mounted_.push_back(path);
  return true;
}

// The kernel ignores the source and type of bind mounts and of changes to
// mounts; "none" is given where it takes no null.
bool TestMounts::ReadOnly(const std::string& path) {
  if (!EnterPrivateMounts(nullptr)) return false;
  if (mount(path.c_str(), path.c_str(), "none", MS_BIND, nullptr) != 0) return false;
  mounted_.push_back(path);
  return mount("none", path.c_str(), "none", MS_REMOUNT | MS_BIND | MS_RDONLY, nullptr) == 0;
}

ORVA::APIResponse CallCreateCsr() {
  Json::Value params = SubjectParams("");
  params["key_length"] = "1024";
  return Call(doCertificateCreateCSR_v1, "ORVA.Core.Certificate.CSR", "create", params);
}

ORVA::APIResponse CallRenew() {
  return Call(doCertificateRenew_v1, "ORVA.Core.Certificate.CSR", "renew",
              Json::Value(Json::objectValue));
}

ORVA::APIResponse CallSign(const std::string& csrPath) {
  Json::Value params(Json::objectValue);
  params["days"] = "30";
  params["csr"] = "request.csr";
  params["csr_tmp"] = csrPath;
  params["alias"] = "client.local";
  return Call(doCertificateSign_v1, "ORVA.Core.Certificate.CSR", "sign", params);
}

ORVA::APIResponse CallCreateCrt() {
  Json::Value params = SubjectParams("");
  Json::Value ca = SubjectParams("ca_");
  for (const std::string& name : ca.getMemberNames()) params[name] = ca[name];
  params["ca_common_name"] = "New Root";
  params["key_length"] = "1024";
  params["ca_key_length"] = "1024";
  params["alias"] = "new.local;10.0.0.1";
  return Call(doCertificateCreateCRT_v1, "ORVA.Core.Certificate.CRT", "create", params);
}

ORVA::APIResponse CallList() {
  return Call(doCertificateList_v1, "ORVA.Core.Certificate", "list",
              Json::Value(Json::objectValue));
}

ORVA::APIResponse CallImport(const std::string& certPath, const std::string& keyPath,
                             const std::string& interPath) {
  Json::Value params(Json::objectValue);
  params["cert_tmp"] = certPath;
  params["key_tmp"] = keyPath;
  params["inter_cert_tmp"] = interPath;
  return Call(doCertificateImport_v1, "ORVA.Core.Certificate", "import", params);
}

bool CallExport(const char* set, ORVA::APIResponse* response) {
  Json::Value params(Json::objectValue);
  params["file"] = set;
  ORVA::APIRequest request("ORVA.Core.Certificate", "export", 1, params);
  ORVA::DownloadCollector collector;
  doCertificateExport_v1(&request, response);
  return collector.result().has_body;
}

std::vector<StoreWriter> StoreWriters() {
  return {
      {"CSR create", [](const TempDeviceRoot&) { return CallCreateCsr(); }},
      {"CSR renew", [](const TempDeviceRoot&) { return CallRenew(); }},
      {"CSR sign",
       [](const TempDeviceRoot& root) { return CallSign(root.Path("/outside/request.csr")); }},
      {"CRT create", [](const TempDeviceRoot&) { return CallCreateCrt(); }},
  };
}

StoreWriter ImportWriter() {
  return {"import",
          [](const TempDeviceRoot& root) {
            return CallImport(root.Path("/outside/server.crt"), root.Path("/outside/server.key"),
                              root.Path("/outside/server-ca.crt"));
          },
          5515};
}

std::vector<StoreWriter> StoreWritersAndImport() {
  std::vector<StoreWriter> writers = StoreWriters();
  writers.push_back(ImportWriter());
  return writers;
}
