// Runs a fuzz target once on every file of the corpus folder given, so the
// seeds and every input that once crashed a target are replayed by each
// build's tests. A folder that is missing or empty fails: a corpus must not
// vanish unnoticed.

#include <cstdint>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <set>
#include <string>
#include <vector>

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size);

int main(int argc, char** argv) {
  if (argc != 2) return 2;
  std::set<std::filesystem::path> files;  // In order, so a failing run repeats.
  std::error_code error;
  for (const auto& entry : std::filesystem::directory_iterator(argv[1], error)) {
    if (entry.path().filename().string()[0] != '.') files.insert(entry.path());
  }
  for (const std::filesystem::path& file : files) {
    std::ifstream stream(file, std::ios::binary);
    const std::vector<uint8_t> input((std::istreambuf_iterator<char>(stream)), {});
    if (!stream) {
      std::fprintf(stderr, "%s: cannot read %s\n", argv[0], file.c_str());
      return 1;
    }
    LLVMFuzzerTestOneInput(input.data(), input.size());
  }
  std::printf("%s: %zu inputs of %s ran\n", argv[0], files.size(), argv[1]);
  return files.empty() ? 1 : 0;
}
