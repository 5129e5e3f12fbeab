// Runs a fuzz target once on every file of the corpus folders given as
// arguments, so the seeds and every input that once crashed a target are
// replayed by each build's tests. A folder that is missing or empty fails:
// a corpus must not vanish unnoticed.

#include <dirent.h>

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <fstream>
#include <iterator>
#include <string>
#include <vector>

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size);

namespace {

bool ListFiles(const std::string& folder, std::vector<std::string>* files) {
  DIR* directory = opendir(folder.c_str());
  if (directory == nullptr) return false;
  while (struct dirent* entry = readdir(directory)) {
    if (entry->d_name[0] == '.') continue;
    files->push_back(folder + "/" + entry->d_name);
  }
  closedir(directory);
  std::sort(files->begin(), files->end());
  return true;
}

}  // namespace

int main(int argc, char** argv) {
  if (argc < 2) {
    std::fprintf(stderr, "usage: %s CORPUS_FOLDER...\n", argv[0]);
    return 2;
  }
  for (int i = 1; i < argc; ++i) {
    std::vector<std::string> files;
    if (!ListFiles(argv[i], &files) || files.empty()) {
      std::fprintf(stderr, "%s: no corpus files in %s\n", argv[0], argv[i]);
      return 1;
    }
    for (const std::string& file : files) {
      std::ifstream stream(file, std::ios::binary);
      std::vector<uint8_t> input((std::istreambuf_iterator<char>(stream)),
                                 std::istreambuf_iterator<char>());
      if (!stream.eof() && stream.fail()) {
        std::fprintf(stderr, "%s: cannot read %s\n", argv[0], file.c_str());
        return 1;
      }
      LLVMFuzzerTestOneInput(input.data(), input.size());
    }
    std::printf("%s: %zu inputs of %s ran\n", argv[0], files.size(), argv[i]);
  }
  return 0;
}
