#include "tests/toolkit/toolkit_test_util.h"

#include <ftw.h>
#include <grp.h>
#include <sys/wait.h>
#include <unistd.h>

#include "common/raii.h"

namespace {

constexpr uid_t kNobody = 65534;

int HandToNobody(const char* path, const struct stat*, int, struct FTW*) {
  return lchown(path, kNobody, kNobody);
}

}  // namespace

CSR_ARGUMENT FullSubject() {
  return {"TW", "Taipei", "Neihu", "Storage Works", "Lab", "nas.local", "admin@nas.local"};
}

std::string TemporaryFilesIn(const std::string& directory) {
  std::string names;
  DirPtr dir(opendir(directory.c_str()));
  while (struct dirent* entry = dir ? readdir(dir.get()) : nullptr) {
    std::string name = entry->d_name;
    if (name.find(".tmp") != std::string::npos) names += name + " ";
  }
  return names;
}

bool RunAsUnprivilegedUser(const TempDeviceRoot& root, const std::function<bool()>& body) {
  if (geteuid() != 0) return body();
  if (nftw(root.root().c_str(), HandToNobody, 16, FTW_PHYS) != 0) return false;
  pid_t child = fork();
  if (child == 0) {
    bool done = setgroups(0, nullptr) == 0 && setgid(kNobody) == 0 && setuid(kNobody) == 0 &&
                geteuid() == kNobody && body();
    _exit(done ? 0 : 1);
  }
  int status = 0;
  return child > 0 && waitpid(child, &status, 0) == child && WIFEXITED(status) &&
         WEXITSTATUS(status) == 0;
}

void FailToolSubcommand(const TempDeviceRoot& root, const std::string& failing) {
  root.WriteScript("/usr/orva/bin/openssl", "if [ \"$1\" = " + failing +
                                                " ]; then exit 1; fi\n"
                                                "exec /usr/bin/openssl \"$@\"");
}
