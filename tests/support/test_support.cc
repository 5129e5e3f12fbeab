#include "tests/support/test_support.h"

#include <ftw.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdlib>
#include <fstream>
#include <iterator>
#include <stdexcept>

#include <gtest/gtest.h>

namespace {

int RemoveEntry(const char* path, const struct stat*, int, struct FTW*) {
  chmod(path, 0700);  // Key files are 0400; keep removal working as non-root.
  return remove(path);
}

}  // namespace

TempDeviceRoot::TempDeviceRoot() {
  const char* previous = std::getenv("ORVA_ROOT");
  if (previous != nullptr) {
    had_previous_root_ = true;
    previous_root_ = previous;
  }
  const char* tmp = std::getenv("TMPDIR");
  std::string pattern = std::string(tmp != nullptr && *tmp ? tmp : "/tmp") +
                        "/orva-test-XXXXXX";
  if (mkdtemp(&pattern[0]) == nullptr) {
    throw std::runtime_error("cannot make a temporary device root");
  }
  root_ = pattern;
  MakeDirs(Path("/usr/orva/bin"));
  MakeDirs(Path("/usr/orva/etc/ssl"));
  symlink("/usr/bin/openssl", Path("/usr/orva/bin/openssl").c_str());
  symlink("/usr/bin/7z", Path("/usr/orva/bin/7z").c_str());
  WriteFile("/proc/sys/kernel/orva_mac_address1", "001132AABBCC\n");
  setenv("ORVA_ROOT", root_.c_str(), 1);
}

TempDeviceRoot::~TempDeviceRoot() {
  nftw(root_.c_str(), RemoveEntry, 16, FTW_DEPTH | FTW_PHYS);
  if (had_previous_root_) {
    setenv("ORVA_ROOT", previous_root_.c_str(), 1);
  } else {
    unsetenv("ORVA_ROOT");
  }
}

void TempDeviceRoot::WriteFile(const std::string& devicePath,
                               const std::string& content, mode_t mode) const {
  std::string path = Path(devicePath);
  MakeDirs(path.substr(0, path.rfind('/')));
  unlink(path.c_str());
  std::ofstream file(path, std::ios::binary);
  file << content;
  file.close();
  chmod(path.c_str(), mode);
}

void TempDeviceRoot::WriteScript(const std::string& devicePath,
                                 const std::string& body) const {
  WriteFile(devicePath, "#!/bin/sh\n" + body + "\n", 0755);
}

LogCapture::LogCapture() { testing::internal::CaptureStderr(); }

LogCapture::~LogCapture() { Text(); }

const std::string& LogCapture::Text() {
  if (capturing_) {
    text_ = testing::internal::GetCapturedStderr();
    capturing_ = false;
  }
  return text_;
}

std::string ReadFile(const std::string& path) {
  std::ifstream file(path, std::ios::binary);
  return std::string((std::istreambuf_iterator<char>(file)),
                     std::istreambuf_iterator<char>());
}

void MakeDirs(const std::string& path) {
  for (std::string::size_type slash = path.find('/', 1);;
       slash = path.find('/', slash + 1)) {
    mkdir(path.substr(0, slash).c_str(), 0755);
    if (slash == std::string::npos) break;
  }
}

int FileMode(const std::string& path) {
  struct stat info;
  if (stat(path.c_str(), &info) != 0) return -1;
  return static_cast<int>(info.st_mode & 07777);
}

bool FileExists(const std::string& path) {
  struct stat info;
  return lstat(path.c_str(), &info) == 0;
}
