#ifndef ORVA_FUZZ_FUZZ_SCRATCH_H_
#define ORVA_FUZZ_FUZZ_SCRATCH_H_

#include <cstddef>
#include <cstdint>
#include <string>

// The fuzzing process's private folder, made on first use, exported as the
// device root (ORVA_ROOT) and removed with everything in it when the
// process exits normally. Aborts when it cannot be made.
const std::string& ScratchRoot();

// Replaces the file at the real path `path` (its folder is made) with
// `size` bytes of `data`: the targets read files by path. Aborts when it
// cannot, so a run never goes on with an input it did not write.
void WriteScratchFile(const std::string& path, const uint8_t* data, size_t size);

#endif  // ORVA_FUZZ_FUZZ_SCRATCH_H_
