#ifndef ORVA_TOOLKIT_STORE_FILE_H_
#define ORVA_TOOLKIT_STORE_FILE_H_

#include <string>
#include <vector>

// What a store file written by the tool must hold to be installed.
enum class StoreContent {
  kPrivateKey,   // one private key
  kRequest,      // one certificate signing request
  kCertificate,  // one certificate
};

// Store files are replaced whole: the tool writes a temporary file beside
// the target, which is read back, flushed to the disk, given mode 0400 and
// renamed over the target only when it holds a whole object of its kind.
// The tool may report success for output it could not write (a full disk
// leaves an empty or cut file); such output is never installed. A reader
// sees the old file or the new one, and a 0400 file can be replaced by its
// owner without root's rights, since only the directory is written.
class PendingStoreFile {
 public:
  // Creates an empty temporary file in the directory of `target`, which
  // must exist, for output that must hold `content`. On failure logs why
  // and ok() is false.
  PendingStoreFile(const std::string& target, StoreContent content);
  // Removes the temporary file unless Install succeeded.
  ~PendingStoreFile();

  PendingStoreFile(const PendingStoreFile&) = delete;
  PendingStoreFile& operator=(const PendingStoreFile&) = delete;

  bool ok() const { return !temporary_.empty(); }
  // Where the tool writes; empty when !ok().
  const std::string& temporary() const { return temporary_; }

  // Checks the temporary file, flushes it, gives it mode 0400 and renames
  // it over the target. 0 on success; -1 (logged) when it does not hold a
  // whole object of its kind or cannot be installed, the target being
  // untouched.
  int Install();

 private:
  std::string target_;
  StoreContent content_;
  std::string temporary_;
  bool installed_ = false;
};

// Replaces the file at `path` with `text`, whole: the text is written to a
// temporary file beside it (mode 0644), flushed and renamed over `path`.
// 0 on success; -1 when the temporary file could not be made, -2 when
// writing, flushing or renaming failed. On failure `path` is unchanged, no
// temporary file is left and the system library's last error holds errno;
// nothing is logged.
int WriteTextFile(const std::string& path, const std::string& text);

// A set of store files that belong together (a key with its request and
// certificate), made under work names beside their targets ("DIR/.new-NAME")
// and installed together once the whole set is made and proved: until then
// the earlier set stays whole and usable. Work files that were not
// installed are removed by the destructor.
class StoreFileSet {
 public:
  StoreFileSet() = default;
  ~StoreFileSet();

  StoreFileSet(const StoreFileSet&) = delete;
  StoreFileSet& operator=(const StoreFileSet&) = delete;

  // Adds `target` (a real path) to the set; returns the work path to write
  // it at.
  std::string Add(const std::string& target);

  // Renames every work file over its target, in the order added, and
  // flushes their directories. 0 on success; -1 (logged) at the first
  // failure, the members before it being installed already.
  int Install();

 private:
  struct Member {
    std::string target;
    std::string work;
  };
  std::vector<Member> members_;
  size_t installed_ = 0;
};

#endif  // ORVA_TOOLKIT_STORE_FILE_H_
