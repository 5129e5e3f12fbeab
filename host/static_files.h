#ifndef ORVA_HOST_STATIC_FILES_H_
#define ORVA_HOST_STATIC_FILES_H_

#include <httplib.h>

#include <string>

// The web page's files, served from one folder and from nothing outside it.
class StaticFiles {
 public:
  StaticFiles() = default;

  // Serves the folder `directory`. Returns false when it is not a folder;
  // every request then answers 404.
  bool Open(const std::string& directory);

  // The folder being served (resolved, without a trailing slash), or "".
  const std::string& directory() const { return directory_; }

  // Answers a GET or HEAD of `request.path` (already percent-decoded): the
  // regular file it names inside the folder, "index.html" for a path that
  // ends in "/", with a content type from the file's extension. Answers 404
  // (status only, no body) for a path with a "." or ".." segment, a NUL or
  // a backslash, for a path that leads outside the folder through a
  // symbolic link, and for anything that is not a readable regular file.
  void Serve(const httplib::Request& request, httplib::Response* response) const;

  // The folder served by default: "web" beside the executable when it
  // exists, otherwise the web folder of the source tree it was built from.
  static std::string DefaultDirectory();

 private:
  std::string directory_;
};

#endif  // ORVA_HOST_STATIC_FILES_H_
