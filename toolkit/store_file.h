#ifndef ORVA_TOOLKIT_STORE_FILE_H_
#define ORVA_TOOLKIT_STORE_FILE_H_

#include <string>
#include <vector>

// What a store file holds. It decides the file's mode and what the file
// must hold to be installed:
//
//   kind                   mode   must hold
//   kPrivateKey            0400   one private key
//   kRequest               0400   one certificate signing request
//   kCertificate           0400   one certificate (made by the tool)
//   kImportedCertificate   0644   a certificate (read by the TLS services)
//   kText                  0644   anything (configuration, serial)
//   kPrivateText           0600   anything (ACME settings, secrets, status)
enum class StoreContent {
  kPrivateKey,
  kRequest,
  kCertificate,
  kImportedCertificate,
  kText,
  kPrivateText,
};

// The one way store files are replaced: whole. Every member of a set is
// written under a temporary name beside its target ("NAME.tmpXXXXXX"),
// then Install() proves each holds a whole object of its kind (the tool may
// report success for output it could not write, and a full disk leaves an
// empty or cut file), flushes it to the disk, gives it its mode and renames
// it over its target, private keys last, then flushes the folders. A reader
// sees each old file or the new one; a 0400 file can be replaced by its
// owner, since only the folder is written. The set is installed whole or
// not at all: the old files are kept under temporary names (hard links)
// until the last rename succeeded, and put back when one fails. Temporary
// files that were not installed are removed by the destructor.
class StoreFileSet {
 public:
  StoreFileSet() = default;
  ~StoreFileSet();

  StoreFileSet(const StoreFileSet&) = delete;
  StoreFileSet& operator=(const StoreFileSet&) = delete;

  // Adds `target` (a real path, in an existing folder) holding `content`
  // and creates its empty temporary file. Returns the temporary file's
  // path, where the caller writes the new content; "" (logged) when it
  // cannot be created, and Install() then fails.
  std::string Add(const std::string& target, StoreContent content);

  // Adds the removal of `target` (a real path) to the set: the file goes
  // when the set is installed, before the private keys, and comes back
  // when the install fails. A missing file is no failure.
  void Remove(const std::string& target);

  // Installs every member as described above. 0 on success; -1 (logged)
  // when a member could not be made, does not hold a whole object of its
  // kind or cannot be flushed, given its mode, kept or renamed: every
  // target then holds its old file again (or is absent, as before).
  int Install();

 private:
  struct Member {
    std::string target;
    std::string temporary;  // the new content; "" for a removal
    StoreContent content;
    std::string kept;       // the old file, while the set is installed
  };
  bool Prepare(const Member& member);
  bool Keep(Member* member);
  bool Replace(Member* member);
  void PutBack(Member* member);

  std::vector<Member> members_;
  bool failed_ = false;
};

// Replaces the file at `path` with `text`, whole, the same way (mode 0644),
// for callers that log their own messages. 0 on success; -1 when the temporary file could not be made,
// -2 when writing, flushing or renaming failed. On failure `path` is
// unchanged, no temporary file is left and the system library's last error
// holds errno; nothing is logged.
int WriteTextFile(const std::string& path, const std::string& text);

#endif  // ORVA_TOOLKIT_STORE_FILE_H_
