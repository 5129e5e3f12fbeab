#include "host/device_root_init.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <fstream>

#include "common/file_util.h"
#include "common/store_paths.h"

namespace {

bool MakeFolder(const std::string& path, std::string* error) {
  if (MakeDirectories(path)) return true;
  *error = "cannot make " + path;
  return false;
}

// Writes `content` to a new file `path` with `mode`; an existing file is
// left alone.
bool WriteNewFile(const std::string& path, const std::string& content,
                  mode_t mode, std::string* error) {
  int fd = open(path.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, mode);
  if (fd < 0) {
    if (errno == EEXIST) return true;
    *error = "cannot write " + path + ": " + std::strerror(errno);
    return false;
  }
  bool written = WriteAll(fd, content.data(), content.size());
  if (close(fd) != 0) written = false;
  if (!written) {
    unlink(path.c_str());
    *error = "cannot write " + path;
  }
  return written;
}

std::string FindInPath(const char* program) {
  const char* path = std::getenv("PATH");
  std::string directories = path != nullptr ? path : "/usr/bin:/bin";
  std::string::size_type start = 0;
  for (;;) {
    std::string::size_type colon = directories.find(':', start);
    std::string directory = directories.substr(start, colon - start);
    std::string candidate = directory + "/" + program;
    if (!directory.empty() && access(candidate.c_str(), X_OK) == 0) return candidate;
    if (colon == std::string::npos) return "";
    start = colon + 1;
  }
}

bool LinkTool(const std::string& root, const char* program, std::string* error) {
  std::string link = root + "/usr/orva/bin/" + program;
  struct stat existing;
  if (lstat(link.c_str(), &existing) == 0) return true;
  std::string target = FindInPath(program);
  if (target.empty()) {
    *error = std::string("the tool ") + program + " is not installed";
    return false;
  }
  if (symlink(target.c_str(), link.c_str()) != 0) {
    *error = "cannot link " + link + ": " + std::strerror(errno);
    return false;
  }
  return true;
}

std::string RandomToken() {
  unsigned char bytes[32];
  std::ifstream random("/dev/urandom", std::ios::binary);
  if (!random.read(reinterpret_cast<char*>(bytes), sizeof(bytes))) return "";
  static const char kHex[] = "0123456789abcdef";
  std::string token;
  for (unsigned char byte : bytes) {
    token += kHex[byte >> 4];
    token += kHex[byte & 0x0F];
  }
  return token;
}

}  // namespace

bool UseDeviceRoot(const std::string& root, std::string* absolute) {
  char* resolved = realpath(root.c_str(), nullptr);
  if (resolved == nullptr) return false;
  *absolute = resolved;
  std::free(resolved);
  setenv("ORVA_ROOT", absolute->c_str(), 1);
  return true;
}

std::string TokenPath(const std::string& root) {
  return root + "/usr/orva/etc/webapi.token";
}

std::string AcmeChallengeFolder(const std::string& root) {
  return root + kAcmeChallengeDir;
}

bool InitDeviceRoot(const std::string& root, std::string* error) {
  const char* kDirectories[] = {
      "/usr/orva/bin",           "/usr/orva/etc/ssl",
      "/usr/orva/etc/services",  "/usr/orva/etc/plugins/certificate",
      "/proc/sys/kernel",
  };
  for (const char* directory : kDirectories) {
    if (!MakeFolder(root + directory, error)) return false;
  }
  if (!MakeFolder(AcmeChallengeFolder(root), error)) return false;
  if (!LinkTool(root, "openssl", error) || !LinkTool(root, "7z", error) ||
      !LinkTool(root, "lego", error)) {
    return false;
  }
  if (!WriteNewFile(root + "/usr/orva/etc/orva.conf",
                    "runHTTPS=\"no\"\nrunWebHTTPS=\"no\"\n", 0644, error)) {
    return false;
  }
  std::string token = RandomToken();
  if (token.empty()) {
    *error = "cannot read /dev/urandom";
    return false;
  }
  if (!WriteNewFile(TokenPath(root), token + "\n", 0600, error)) return false;
  std::string mac = FirstInterfaceMacAddress();
  if (mac.empty()) mac = "020000000001";  // A locally administered address.
  return WriteNewFile(root + "/proc/sys/kernel/orva_mac_address1", mac + "\n",
                      0644, error);
}
