#ifndef ORVA_TESTS_SUPPORT_TEST_SUPPORT_H_
#define ORVA_TESTS_SUPPORT_TEST_SUPPORT_H_

#include <sys/types.h>

#include <optional>
#include <string>

// A private device root for one test: a fresh temporary folder with the
// machine's openssl and 7z linked into usr/orva/bin, a store folder and a
// MAC address file, exported as ORVA_ROOT while the object lives and
// removed with everything in it afterwards.
class TempDeviceRoot {
 public:
  TempDeviceRoot();
  ~TempDeviceRoot();

  TempDeviceRoot(const TempDeviceRoot&) = delete;
  TempDeviceRoot& operator=(const TempDeviceRoot&) = delete;

  const std::string& root() const { return root_; }
  // `devicePath` (absolute, e.g. "/usr/orva/etc/ssl") under this root.
  std::string Path(const std::string& devicePath) const { return root_ + devicePath; }

  // Replaces the file at the device path with `content`, making folders.
  void WriteFile(const std::string& devicePath, const std::string& content,
                 mode_t mode = 0644) const;
  // Writes an executable shell script to the device path.
  void WriteScript(const std::string& devicePath, const std::string& body) const;

 private:
  std::string root_;
  std::optional<std::string> previous_root_;
};

// Collects what the system logs (the tests log to stderr as well) while
// the object lives.
class LogCapture {
 public:
  LogCapture();
  ~LogCapture() { Text(); }
  // Ends the capture (first call only) and returns everything logged.
  const std::string& Text();
  bool Contains(const std::string& message) { return Text().find(message) != std::string::npos; }

 private:
  bool capturing_ = true;
  std::string text_;
};

// Reads a whole file; "" when it cannot be read.
std::string ReadFile(const std::string& path);
// Makes the folder `path` with its parents.
void MakeDirs(const std::string& path);
// The mode bits (07777) of `path`, or -1 when it does not exist.
int FileMode(const std::string& path);
bool FileExists(const std::string& path);

#endif  // ORVA_TESTS_SUPPORT_TEST_SUPPORT_H_
