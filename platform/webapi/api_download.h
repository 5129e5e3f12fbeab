#ifndef ORVA_PLATFORM_WEBAPI_API_DOWNLOAD_H_
#define ORVA_PLATFORM_WEBAPI_API_DOWNLOAD_H_

#include <string>
#include <utility>
#include <vector>

namespace ORVA {

// What a handler hands out as a file download: headers and the body bytes.
struct DownloadResult {
  std::vector<std::pair<std::string, std::string>> headers;
  std::string body;
  bool has_body = false;
};

// Collects the download of the request being served on this thread. The
// host creates one around each handler call; APIDownload objects made by the
// handler write into it. Nesting is not supported.
class DownloadCollector {
 public:
  DownloadCollector();
  ~DownloadCollector();

  DownloadCollector(const DownloadCollector&) = delete;
  DownloadCollector& operator=(const DownloadCollector&) = delete;

  const DownloadResult& result() const { return result_; }

  // The collector of the calling thread, or null outside a handler call.
  static DownloadCollector* Current();
  DownloadResult* mutable_result() { return &result_; }

 private:
  DownloadResult result_;
  DownloadCollector* previous_;
};

// A download writer local to one request.
class APIDownload {
 public:
  APIDownload() = default;
  ~APIDownload() = default;

  // The header goes out with the download.
  void SetHeader(const std::string& name, const std::string& value);

  // Reads the whole file at `path` now and makes it the download's body.
  // Returns false (and sends nothing) when the file cannot be read or no
  // request is being served on this thread.
  bool Output(const std::string& path);
};

}  // namespace ORVA

#endif  // ORVA_PLATFORM_WEBAPI_API_DOWNLOAD_H_
