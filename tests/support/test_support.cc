#include "tests/support/test_support.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <stdexcept>

#include <gtest/gtest.h>

namespace fs = std::filesystem;

TempDeviceRoot::TempDeviceRoot() {
  if (const char* previous = std::getenv("ORVA_ROOT")) previous_root_ = previous;
  std::string pattern = (fs::temp_directory_path() / "orva-test-XXXXXX").string();
  if (mkdtemp(&pattern[0]) == nullptr) throw std::runtime_error("no temporary device root");
  root_ = pattern;
  MakeDirs(Path("/usr/orva/bin"));
  MakeDirs(Path("/usr/orva/etc/ssl"));
  fs::create_symlink("/usr/bin/openssl", Path("/usr/orva/bin/openssl"));
  fs::create_symlink("/usr/bin/7z", Path("/usr/orva/bin/7z"));
  WriteFile("/proc/sys/kernel/orva_mac_address1", "001132AABBCC\n");
  setenv("ORVA_ROOT", root_.c_str(), 1);
}

TempDeviceRoot::~TempDeviceRoot() {
  std::error_code ignored;  // A test that failed half-way may leave odd modes.
  fs::remove_all(root_, ignored);
  if (previous_root_) {
    setenv("ORVA_ROOT", previous_root_->c_str(), 1);
  } else {
    unsetenv("ORVA_ROOT");
  }
}

void TempDeviceRoot::WriteFile(const std::string& devicePath, const std::string& content,
                               mode_t mode) const {
  const std::string path = Path(devicePath);
  MakeDirs(fs::path(path).parent_path());
  unlink(path.c_str());
  std::ofstream(path, std::ios::binary) << content;
  chmod(path.c_str(), mode);
}

void TempDeviceRoot::WriteScript(const std::string& devicePath, const std::string& body) const {
  WriteFile(devicePath, "#!/bin/sh\n" + body + "\n", 0755);
}

LogCapture::LogCapture() { testing::internal::CaptureStderr(); }

const std::string& LogCapture::Text() {
  if (capturing_) text_ = testing::internal::GetCapturedStderr();
  capturing_ = false;
  return text_;
}

std::string ReadFile(const std::string& path) {
  std::ifstream file(path, std::ios::binary);
  // A read that fails half-way (a /proc file of a thread or process that
  // just ended) ends the text there; the buffer's own reading would throw.
  std::ostringstream content;
  content << file.rdbuf();
  return content.str();
}

void MakeDirs(const std::string& path) {
  std::error_code ignored;  // The writes that follow fail visibly.
  fs::create_directories(path, ignored);
}

int FileMode(const std::string& path) {
  struct stat info;
  return stat(path.c_str(), &info) == 0 ? static_cast<int>(info.st_mode & 07777) : -1;
}

bool FileExists(const std::string& path) {
  struct stat info;
  return lstat(path.c_str(), &info) == 0;
}
