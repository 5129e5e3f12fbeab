#include "host/static_files.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cstdlib>
#include <fstream>
#include <iterator>
#include <memory>

#include "common/file_util.h"

namespace {

constexpr int kNotFound = 404;

struct FreeDeleter {
  void operator()(char* pointer) const { std::free(pointer); }
};

// The resolved path of `path` (symbolic links followed), or "".
std::string ResolvedPath(const std::string& path) {
  std::unique_ptr<char, FreeDeleter> resolved(realpath(path.c_str(), nullptr));
  return resolved ? std::string(resolved.get()) : std::string();
}

bool IsDirectory(const std::string& path) {
  struct stat info;
  return stat(path.c_str(), &info) == 0 && S_ISDIR(info.st_mode);
}

// True for a request path that names something below the folder by plain
// names only.
bool IsPlainPath(const std::string& path) {
  if (path.empty() || path[0] != '/') return false;
  if (path.find('\0') != std::string::npos || path.find('\\') != std::string::npos) {
    return false;
  }
  std::string::size_type start = 1;
  while (start <= path.size()) {
    std::string::size_type slash = path.find('/', start);
    if (slash == std::string::npos) slash = path.size();
    std::string segment = path.substr(start, slash - start);
    if (segment == "." || segment == "..") return false;
    start = slash + 1;
  }
  return true;
}

const char* ContentType(const std::string& path) {
  struct Mapping {
    const char* extension;
    const char* type;
  };
  static const Mapping kTypes[] = {
      {".html", "text/html; charset=utf-8"},
      {".css", "text/css; charset=utf-8"},
      {".js", "text/javascript; charset=utf-8"},
      {".json", "application/json"},
      {".svg", "image/svg+xml"},
      {".png", "image/png"},
      {".ico", "image/x-icon"},
      {".txt", "text/plain; charset=utf-8"},
  };
  for (const Mapping& mapping : kTypes) {
    std::string extension = mapping.extension;
    if (path.size() > extension.size() &&
        path.compare(path.size() - extension.size(), extension.size(), extension) == 0) {
      return mapping.type;
    }
  }
  return "application/octet-stream";
}

}  // namespace

bool StaticFiles::Open(const std::string& directory) {
  directory_.clear();
  std::string resolved = ResolvedPath(directory);
  if (resolved.empty() || !IsDirectory(resolved)) return false;
  directory_ = resolved;
  return true;
}

void StaticFiles::Serve(const httplib::Request& request,
                        httplib::Response* response) const {
  response->status = kNotFound;
  if (directory_.empty() || !IsPlainPath(request.path)) return;
  std::string wanted = directory_ + request.path;
  if (wanted.back() == '/') wanted += "index.html";
  std::string resolved = ResolvedPath(wanted);
  if (resolved.compare(0, directory_.size() + 1, directory_ + "/") != 0) return;

  struct stat info;
  if (stat(resolved.c_str(), &info) != 0 || !S_ISREG(info.st_mode)) return;
  std::ifstream file(resolved, std::ios::binary);
  if (!file) return;
  std::string content((std::istreambuf_iterator<char>(file)),
                      std::istreambuf_iterator<char>());
  if (file.bad()) return;
  response->status = 200;
  response->set_header("Cache-Control", "no-cache");
  response->set_header("X-Content-Type-Options", "nosniff");
  response->set_content(content, ContentType(resolved));
}

std::string StaticFiles::DefaultDirectory() {
  std::string beside = ExecutableDirectory() + "/web";
  return IsDirectory(beside) ? beside : ORVA_SOURCE_WEB_DIR;
}
