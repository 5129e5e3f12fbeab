#include "fuzz/fuzz_scratch.h"

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <system_error>

namespace {

class Scratch {
 public:
  Scratch() {
    const char* tmp = std::getenv("TMPDIR");
    root = std::string(tmp != nullptr && *tmp != '\0' ? tmp : "/tmp") + "/orva-fuzz-XXXXXX";
    if (mkdtemp(&root[0]) == nullptr) {
      std::perror("orva-fuzz: mkdtemp");
      std::abort();
    }
    setenv("ORVA_ROOT", root.c_str(), 1);
  }
  ~Scratch() {
    std::error_code ignored;  // Nothing more to do for a folder that stays.
    std::filesystem::remove_all(root, ignored);
  }
  std::string root;
};

}  // namespace

const std::string& ScratchRoot() {
  static const Scratch scratch;
  return scratch.root;
}

void WriteScratchFile(const std::string& path, const uint8_t* data, size_t size) {
  std::error_code error;
  std::filesystem::create_directories(std::filesystem::path(path).parent_path(), error);
  std::ofstream file(path, std::ios::binary | std::ios::trunc);
  file.write(reinterpret_cast<const char*>(data), static_cast<std::streamsize>(size));
  file.close();
  if (error || !file) {
    std::fprintf(stderr, "orva-fuzz: cannot write %s\n", path.c_str());
    std::abort();
  }
}
