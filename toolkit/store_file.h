#ifndef ORVA_TOOLKIT_STORE_FILE_H_
#define ORVA_TOOLKIT_STORE_FILE_H_

#include <string>

// Store files are replaced whole: the tool writes a temporary file beside
// the target, which gets mode 0400 and is renamed over the target only when
// complete. A reader sees the old file or the new one, and a 0400 file can
// be replaced by its owner without root's rights, since only the directory
// is written.
class PendingStoreFile {
 public:
  // Creates an empty temporary file in the directory of `target`, which
  // must exist. On failure logs why and ok() is false.
  explicit PendingStoreFile(const std::string& target);
  // Removes the temporary file unless Install succeeded.
  ~PendingStoreFile();

  PendingStoreFile(const PendingStoreFile&) = delete;
  PendingStoreFile& operator=(const PendingStoreFile&) = delete;

  bool ok() const { return !temporary_.empty(); }
  // Where the tool writes; empty when !ok().
  const std::string& temporary() const { return temporary_; }

  // Gives the temporary file mode 0400 and renames it over the target.
  // 0 on success; -1 (logged) on failure, the target being untouched.
  int Install();

 private:
  std::string target_;
  std::string temporary_;
  bool installed_ = false;
};

// Writes `text` to `path`, replacing its content. 0 on success; -1 when
// the file could not be opened (unchanged then), -2 when writing or closing
// failed (the file may hold part of the text). On failure the system
// library's last error holds errno; nothing is logged.
int WriteTextFile(const std::string& path, const std::string& text);

#endif  // ORVA_TOOLKIT_STORE_FILE_H_
