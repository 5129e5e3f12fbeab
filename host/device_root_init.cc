#include "host/device_root_init.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <vector>

namespace {

bool MakeDirectories(const std::string& path, mode_t mode, std::string* error) {
  std::string partial;
  std::string::size_type start = 0;
  while (start != std::string::npos) {
    std::string::size_type slash = path.find('/', start + 1);
    partial = path.substr(0, slash);
    start = slash;
    if (partial.empty()) continue;
    if (mkdir(partial.c_str(), mode) != 0 && errno != EEXIST) {
      *error = "cannot make " + partial + ": " + std::strerror(errno);
      return false;
    }
  }
  return true;
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
  bool written = write(fd, content.data(), content.size()) ==
                 static_cast<ssize_t>(content.size());
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

// The address of the first non-loopback interface as 12 upper-case hex
// digits, or "" when there is none.
std::string FirstMacAddress() {
  std::vector<std::string> names;
  if (DIR* dir = opendir("/sys/class/net")) {
    while (struct dirent* entry = readdir(dir)) {
      if (entry->d_name[0] != '.' && std::strcmp(entry->d_name, "lo") != 0) {
        names.push_back(entry->d_name);
      }
    }
    closedir(dir);
  }
  std::sort(names.begin(), names.end());
  for (const std::string& name : names) {
    std::ifstream file("/sys/class/net/" + name + "/address");
    std::string address, digits;
    if (!std::getline(file, address)) continue;
    for (char c : address) {
      if (std::isxdigit(static_cast<unsigned char>(c))) {
        digits += static_cast<char>(std::toupper(static_cast<unsigned char>(c)));
      }
    }
    if (digits.size() == 12 && digits != "000000000000") return digits;
  }
  return "";
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

bool InitDeviceRoot(const std::string& root, std::string* error) {
  const char* kDirectories[] = {
      "/usr/orva/bin",           "/usr/orva/etc/ssl",
      "/usr/orva/etc/services",  "/usr/orva/etc/plugins/certificate",
      "/proc/sys/kernel",
  };
  for (const char* directory : kDirectories) {
    if (!MakeDirectories(root + directory, 0755, error)) return false;
  }
  if (!LinkTool(root, "openssl", error) || !LinkTool(root, "7z", error)) {
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
  std::string mac = FirstMacAddress();
  if (mac.empty()) mac = "020000000001";  // A locally administered address.
  return WriteNewFile(root + "/proc/sys/kernel/orva_mac_address1", mac + "\n",
                      0644, error);
}
