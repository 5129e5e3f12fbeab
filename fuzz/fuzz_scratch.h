#ifndef ORVA_FUZZ_FUZZ_SCRATCH_H_
#define ORVA_FUZZ_FUZZ_SCRATCH_H_

#include <cstddef>
#include <cstdint>
#include <string>

// A private folder for one fuzzing process, made on first use, exported as
// the device root (ORVA_ROOT) and removed with everything in it when the
// process exits normally. The targets read files by path, so each input is
// written to a file here first.
class FuzzScratch {
 public:
  // The process's folder. Aborts when it cannot be made.
  static FuzzScratch& Get();

  // `devicePath` (absolute) under the folder.
  std::string Path(const std::string& devicePath) const { return root_ + devicePath; }

  // Replaces the file at the real path `path` (its folder is made) with
  // `size` bytes of `data`. Aborts when it cannot: a fuzz run must not go
  // on with an input it did not write.
  void WriteFile(const std::string& path, const uint8_t* data, size_t size) const;

  ~FuzzScratch();

 private:
  FuzzScratch();
  std::string root_;
};

#endif  // ORVA_FUZZ_FUZZ_SCRATCH_H_
