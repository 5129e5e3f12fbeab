#include "host/temporary_uploads.h"

#include <stdlib.h>
#include <unistd.h>

#include <fcntl.h>

#include <cstdlib>

#include "common/file_util.h"

TemporaryUploads::~TemporaryUploads() {
  for (const std::string& path : paths_) {
    unlink(path.c_str());  // Ignoring errors: the handler may have moved it.
  }
}

bool TemporaryUploads::Add(const std::string& name, const std::string& content,
                           const std::string& clientFileName,
                           Json::Value* params) {
  const char* directory = std::getenv("TMPDIR");
  std::string path = std::string(directory != nullptr && *directory != '\0'
                                     ? directory
                                     : "/tmp") +
                     "/orva-upload-XXXXXX";
  int fd = mkostemp(&path[0], O_CLOEXEC);  // mkostemp makes mode 0600.
  if (fd < 0) return false;
  bool written = WriteAll(fd, content.data(), content.size());
  if (close(fd) != 0) written = false;
  if (!written) {
    unlink(path.c_str());
    return false;
  }
  paths_.push_back(path);
  (*params)[name + "_tmp"] = path;
  (*params)[name] = clientFileName;
  return true;
}
