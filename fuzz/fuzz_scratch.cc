#include "fuzz/fuzz_scratch.h"

#include <fcntl.h>
#include <ftw.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>

namespace {

int RemoveEntry(const char* path, const struct stat*, int, struct FTW*) {
  return remove(path);
}

void MakeParents(const std::string& path) {
  for (std::string::size_type slash = path.find('/', 1);
       slash != std::string::npos; slash = path.find('/', slash + 1)) {
    mkdir(path.substr(0, slash).c_str(), 0700);  // Existing folders are fine.
  }
}

}  // namespace

FuzzScratch& FuzzScratch::Get() {
  static FuzzScratch scratch;
  return scratch;
}

FuzzScratch::FuzzScratch() {
  const char* tmp = std::getenv("TMPDIR");
  std::string pattern =
      std::string(tmp != nullptr && *tmp != '\0' ? tmp : "/tmp") + "/orva-fuzz-XXXXXX";
  if (mkdtemp(&pattern[0]) == nullptr) {
    std::perror("orva-fuzz: mkdtemp");
    std::abort();
  }
  root_ = pattern;
  setenv("ORVA_ROOT", root_.c_str(), 1);
}

FuzzScratch::~FuzzScratch() {
  nftw(root_.c_str(), RemoveEntry, 8, FTW_DEPTH | FTW_PHYS);
}

void FuzzScratch::WriteFile(const std::string& path, const uint8_t* data,
                            size_t size) const {
  MakeParents(path);
  int fd = open(path.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0600);
  if (fd < 0) {
    std::perror("orva-fuzz: open");
    std::abort();
  }
  size_t done = 0;
  while (done < size) {
    ssize_t written = write(fd, data + done, size - done);
    if (written <= 0) {
      std::perror("orva-fuzz: write");
      std::abort();
    }
    done += static_cast<size_t>(written);
  }
  close(fd);
}
