#include "tests/toolkit/toolkit_test_util.h"

#include <dirent.h>
#include <grp.h>
#include <ftw.h>
#include <sys/wait.h>
#include <unistd.h>

#include <openssl/pem.h>
#include <openssl/x509.h>

#include <cstdio>

#include "common/pem_password.h"
#include "common/raii.h"

namespace {

constexpr uid_t kNobody = 65534;

int HandToNobody(const char* path, const struct stat*, int, struct FTW*) {
  return lchown(path, kNobody, kNobody);
}

}  // namespace

CSR_ARGUMENT FullSubject() {
  CSR_ARGUMENT subject;
  subject.country = "TW";
  subject.state = "Taipei";
  subject.city = "Neihu";
  subject.organization = "Storage Works";
  subject.department = "Lab";
  subject.common_name = "nas.local";
  subject.email = "admin@nas.local";
  return subject;
}

std::string CertificateText(const std::string& path) {
  FilePtr file(std::fopen(path.c_str(), "r"));
  if (!file) return "";
  X509Ptr certificate(
      PEM_read_X509(file.get(), nullptr, RefusePemPassword, nullptr));
  BioPtr bio(BIO_new(BIO_s_mem()));
  if (!certificate || !bio || X509_print(bio.get(), certificate.get()) != 1) {
    return "";
  }
  char* data = nullptr;
  long size = BIO_get_mem_data(bio.get(), &data);
  return std::string(data, static_cast<size_t>(size));
}

std::string TemporaryFilesIn(const std::string& directory) {
  std::string names;
  DirPtr dir(opendir(directory.c_str()));
  if (!dir) return names;
  while (struct dirent* entry = readdir(dir.get())) {
    if (std::string(entry->d_name).find(".tmp") != std::string::npos) {
      names += std::string(entry->d_name) + " ";
    }
  }
  return names;
}

bool RunAsUnprivilegedUser(const TempDeviceRoot& root,
                           const std::function<bool()>& body) {
  if (geteuid() != 0) return body();
  if (nftw(root.root().c_str(), HandToNobody, 16, FTW_PHYS) != 0) return false;
  pid_t child = fork();
  if (child == 0) {
    bool done = setgroups(0, nullptr) == 0 && setgid(kNobody) == 0 &&
                setuid(kNobody) == 0 && geteuid() == kNobody && body();
    _exit(done ? 0 : 1);
  }
  int status = 0;
  return child > 0 && waitpid(child, &status, 0) == child &&
         WIFEXITED(status) && WEXITSTATUS(status) == 0;
}

void FailToolSubcommand(const TempDeviceRoot& root, const std::string& failing) {
  root.WriteScript("/usr/orva/bin/openssl",
                   "if [ \"$1\" = " + failing + " ]; then exit 1; fi\n"
                   "exec /usr/bin/openssl \"$@\"");
}
