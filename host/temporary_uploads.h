#ifndef ORVA_HOST_TEMPORARY_UPLOADS_H_
#define ORVA_HOST_TEMPORARY_UPLOADS_H_

#include <string>
#include <vector>

#include <json/json.h>

// Uploaded files of one call, saved to private temporary files (mode 0600)
// that the host names. All of them are removed when the object goes away.
class TemporaryUploads {
 public:
  TemporaryUploads() = default;
  ~TemporaryUploads();

  TemporaryUploads(const TemporaryUploads&) = delete;
  TemporaryUploads& operator=(const TemporaryUploads&) = delete;

  // Saves `content` to a new temporary file and sets params[name + "_tmp"]
  // to its path and params[name] to `clientFileName` (a text the client
  // chose: it never becomes part of a path). Returns false when the file
  // could not be written (nothing is left behind).
  bool Add(const std::string& name, const std::string& content,
           const std::string& clientFileName, Json::Value* params);

 private:
  std::vector<std::string> paths_;
};

#endif  // ORVA_HOST_TEMPORARY_UPLOADS_H_
