#ifndef ORVA_UPLOAD_STAGED_COPY_H_
#define ORVA_UPLOAD_STAGED_COPY_H_

#include <sys/types.h>

#include <string>

// One uploaded file on its way into the certificate store. Stage() copies
// it under a temporary name in the store file's directory; Commit() renames
// the complete copy over the store file, so a reader sees the old file or
// the new one, never a cut one. A copy that is not committed is removed when
// the object goes away.
class StagedCopy {
 public:
  StagedCopy() = default;
  ~StagedCopy();

  StagedCopy(const StagedCopy&) = delete;
  StagedCopy& operator=(const StagedCopy&) = delete;

  // `source` and `target` are real paths. Makes the directory of `target`
  // with "/bin/mkdir -p" when it is missing, copies `source` with "/bin/cp"
  // into a new temporary file beside `target` and gives the copy `mode`.
  // Returns 5502, or 5515 (logged) when the directory cannot be made or the
  // copy fails; the store file itself is untouched either way (a directory
  // made on the way stays).
  int Stage(const std::string& source, const std::string& target, mode_t mode);

  // Renames the copy staged by a successful Stage() over the target.
  // Returns 5502, or 5515 (logged) when the rename fails; the target then
  // keeps its old content.
  int Commit();

 private:
  std::string temporary_;
  std::string target_;
};

#endif  // ORVA_UPLOAD_STAGED_COPY_H_
