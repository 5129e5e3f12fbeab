#include "common/file_util.h"

#include <fcntl.h>
#include <limits.h>
#include <net/if.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cctype>
#include <cerrno>
#include <cstdio>
#include <cstdlib>

#include "common/log.h"
#include "common/raii.h"
#include "common/shell_command.h"

namespace {

// A folder path of the store with the command around it fits in this many
// bytes on the device.
constexpr size_t kMakeDirectoriesCommandSize = 512;

// The first line of a small system file, without its line end.
std::string ReadFirstLine(const std::string& path) {
  FilePtr file(std::fopen(path.c_str(), "r"));
  char buffer[128] = {0};
  if (!file || std::fgets(buffer, sizeof(buffer), file.get()) == nullptr) {
    return "";
  }
  std::string line(buffer);
  while (!line.empty() && std::isspace(static_cast<unsigned char>(line.back()))) {
    line.pop_back();
  }
  return line;
}

// "aa:bb:cc:dd:ee:ff" as 12 upper-case hex digits; "" for anything else,
// an all-zero address included.
std::string EthernetDigits(const std::string& address) {
  std::string digits;
  for (char c : address) {
    if (c == ':') continue;
    if (!std::isxdigit(static_cast<unsigned char>(c))) return "";
    digits += static_cast<char>(std::toupper(static_cast<unsigned char>(c)));
  }
  if (digits.size() != 12 || digits == "000000000000") return "";
  return digits;
}

}  // namespace

std::string DirectoryOf(const std::string& path) {
  std::string::size_type slash = path.rfind('/');
  if (slash == std::string::npos) return ".";
  return slash == 0 ? "/" : path.substr(0, slash);
}

bool MakeDirectories(const std::string& path) {
  // Nearly always the folder is there: the command (a shell and mkdir, two
  // processes) runs only when there is something to make.
  struct stat info;
  if (stat(path.c_str(), &info) == 0 && S_ISDIR(info.st_mode)) return true;
  ShellCommand command(RootedCommandSize(kMakeDirectoriesCommandSize));
  command.Append("/bin/mkdir -p %s", {path});
  int status = RunShellCommand(command);
  if (status != 0) {
    ORVA_LOG("%s failed.(errno:%d/%m)", command.line(), errno);
    return false;
  }
  return true;
}

bool ReadWholeFile(const std::string& path, std::string* content) {
  FilePtr file(std::fopen(path.c_str(), "re"));
  if (!file) return false;
  char chunk[4096];
  size_t got;
  while ((got = std::fread(chunk, 1, sizeof(chunk), file.get())) > 0) {
    content->append(chunk, got);
  }
  return true;
}

bool OverwriteFile(const std::string& path, const std::string& text) {
  int fd = open(path.c_str(), O_WRONLY | O_TRUNC | O_CLOEXEC | O_NOFOLLOW);
  if (fd < 0) return false;
  bool written = WriteAll(fd, text.data(), text.size());
  int error = errno;
  if (close(fd) != 0 && written) return false;
  errno = error;
  return written;
}

bool WriteAll(int fd, const char* data, size_t size) {
  while (size > 0) {
    ssize_t written = write(fd, data, size);
    if (written < 0 && errno == EINTR) continue;
    if (written <= 0) return false;
    data += written;
    size -= static_cast<size_t>(written);
  }
  return true;
}

std::string ExecutableDirectory() {
  char executable[PATH_MAX];
  ssize_t length = readlink("/proc/self/exe", executable, sizeof(executable) - 1);
  if (length <= 0) return ".";
  return DirectoryOf(std::string(executable, static_cast<size_t>(length)));
}

void SyncDirectory(const std::string& path) {
  int fd = open(path.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
  if (fd < 0) return;
  fsync(fd);
  close(fd);
}

std::vector<std::string> VisibleEntries(const std::string& path) {
  std::vector<std::string> names;
  DirPtr directory(opendir(path.c_str()));
  if (!directory) return names;
  while (struct dirent* entry = readdir(directory.get())) {
    if (entry->d_name[0] != '.') names.push_back(entry->d_name);
  }
  std::sort(names.begin(), names.end());
  return names;
}

bool RemoveFolderEntries(const std::string& path) {
  DirPtr directory(opendir(path.c_str()));
  if (!directory) return errno == ENOENT;
  bool removed = true;
  int error = 0;
  while (struct dirent* entry = readdir(directory.get())) {
    const std::string name = entry->d_name;
    if (name == "." || name == "..") continue;
    if (unlink((path + "/" + name).c_str()) != 0) {
      removed = false;
      error = errno;
    }
  }
  errno = error;
  return removed;
}

std::string FirstInterfaceMacAddress(const std::string& interfaces) {
  for (const std::string& name : VisibleEntries(interfaces)) {
    std::string base = interfaces + "/" + name;
    unsigned long flags =
        std::strtoul(ReadFirstLine(base + "/flags").c_str(), nullptr, 0);
    if (flags & IFF_LOOPBACK) continue;
    std::string digits = EthernetDigits(ReadFirstLine(base + "/address"));
    if (!digits.empty()) return digits;
  }
  return "";
}
