#ifndef ORVA_TOOLKIT_GENERATION_AREA_H_
#define ORVA_TOOLKIT_GENERATION_AREA_H_

#include <string>

// The generation area "/usr/orva/etc/ssl/.gen" holds what waits to be
// handed out once: a pending key and request, a signed certificate.

// Makes the generation area with mode 0700 when it is missing (one level,
// its parent must exist); an existing one is given mode 0700 when it has
// another. Returns false (errno set) when it cannot be made, is not a
// folder or its mode cannot be set.
bool MakeGenerationArea();

// A path in the generation area under the device root for work in progress
// named `name` (for example ".new-server.key"); such files are removed or
// renamed before the request ends.
std::string GenerationWorkPath(const char* name);

// A private file (0600) at GenerationWorkPath(name) for work in progress,
// removed with the object. The caller makes the area first.
class GenerationWorkFile {
 public:
  explicit GenerationWorkFile(const char* name) : path_(GenerationWorkPath(name)) {}
  ~GenerationWorkFile();

  GenerationWorkFile(const GenerationWorkFile&) = delete;
  GenerationWorkFile& operator=(const GenerationWorkFile&) = delete;

  // Replaces the file's content with `content`, never through a link.
  // False (errno set) when it cannot be written.
  bool Write(const std::string& content);
  const std::string& path() const { return path_; }

 private:
  std::string path_;
};

#endif  // ORVA_TOOLKIT_GENERATION_AREA_H_
