// Fuzz target: a raw /webapi request read by the HTTP server's own code and
// turned into a call by ParseWebapiRequest, uploads saved in a private folder.
//
// Input: one byte of options, then the query string up to the first '\n'.
// options & 3: 0 GET; 1 POST with the rest as an urlencoded form; 2 POST
// with a multipart form whose boundary is the next line; 3 as 2, the next
// line being the whole Content-Type. options >> 2, when not 0, is the most
// bytes one read gets, as when a request arrives in small pieces.
//
// Beyond crashes it checks what the host promises whatever the client
// sends: every "N_tmp" of an accepted call is the host's private copy
// (0600, directly in the upload folder) of exactly the content of upload
// N, so no "_tmp" text of the client gets through; a refused call (400)
// saves nothing; and nothing is left once the call is over.

#include <httplib.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>

#include "host/http_server.h"
#include "host/request_parsing.h"
#include "host/temporary_uploads.h"

namespace {

// The raw request, handed out in reads of at most `most` bytes (0: no
// limit); what the server writes back is dropped.
class RequestStream : public httplib::Stream {
 public:
  RequestStream(const std::string& request, size_t most) : request_(request), most_(most) {}

  bool is_readable() const override { return true; }
  bool is_writable() const override { return true; }
  ssize_t read(char* ptr, size_t size) override {
    const size_t count = request_.copy(ptr, most_ != 0 ? std::min(size, most_) : size, position_);
    position_ += count;
    return static_cast<ssize_t>(count);
  }
  ssize_t write(const char*, size_t size) override { return static_cast<ssize_t>(size); }
  void get_remote_ip_and_port(std::string& ip, int& port) const override { ip = "::1", port = 1; }
  void get_local_ip_and_port(std::string& ip, int& port) const override { ip = "::1", port = 2; }
  socket_t socket() const override { return 0; }

 private:
  const std::string& request_;
  const size_t most_;
  size_t position_ = 0;
};

// The server with its request handling open to the harness.
class RequestReader : public httplib::Server {
 public:
  explicit RequestReader(const Handler& handler) {
    set_payload_max_length(WebapiService::kMaxBodyBytes);
    Get("/webapi", handler);
    Post("/webapi", handler);
  }

  void Read(const std::string& request, size_t most) {
    RequestStream stream(request, most);
    bool closed = false;
    process_request(stream, true, closed, nullptr);
  }
};

// The uploads are saved where TMPDIR points: a private folder of this
// process, empty after every call (CheckCall proves it) and removed at exit.
const std::string& UploadFolder() {
  static const struct Folder {
    Folder() : path((std::filesystem::temp_directory_path() / "orva-fuzz-XXXXXX").string()) {
      if (mkdtemp(&path[0]) == nullptr) std::abort();
      setenv("TMPDIR", path.c_str(), 1);
    }
    ~Folder() { rmdir(path.c_str()); }
    std::string path;
  } folder;
  return folder.path;
}

size_t SavedFiles() {
  const std::filesystem::directory_iterator files(UploadFolder());
  return static_cast<size_t>(std::distance(begin(files), end(files)));
}

bool IsPrivateCopy(const std::string& path, const std::string& content) {
  struct stat status;
  std::ifstream stream(path, std::ios::binary);
  return std::filesystem::path(path).parent_path() == UploadFolder() &&
         lstat(path.c_str(), &status) == 0 && S_ISREG(status.st_mode) &&
         (status.st_mode & 07777) == 0600 && status.st_uid == geteuid() &&
         std::string(std::istreambuf_iterator<char>(stream), {}) == content;
}

void CheckCall(const httplib::Request& request, httplib::Response&) {
  if (SavedFiles() != 0) std::abort();
  {
    TemporaryUploads uploads;
    WebapiCall call;
    int result = -1;
    try {
      result = ParseWebapiRequest(request, &uploads, &call);
    } catch (...) {
      std::abort();  // The server would answer 500 and hide the fault.
    }
    if (result == 400 && SavedFiles() != 0) std::abort();
    size_t copies = 0;
    for (const std::string& name : call.params.getMemberNames()) {
      const size_t suffix = name.size() - std::min<size_t>(name.size(), 4);
      if (result != 0 || name.compare(suffix, 4, "_tmp") != 0) continue;
      const auto part = request.files.find(name.substr(0, suffix));
      if (part == request.files.end() || part->second.filename.empty() ||
          !IsPrivateCopy(call.params[name].asString(), part->second.content)) {
        std::abort();
      }
      ++copies;
    }
    if (result == 0 && SavedFiles() != copies) std::abort();
  }
  if (SavedFiles() != 0) std::abort();
}

std::string TakeLine(const std::string& input, std::string::size_type* position) {
  const std::string::size_type end = std::min(input.find('\n', *position), input.size());
  const std::string line = input.substr(*position, end - *position);
  *position = std::min(end + 1, input.size());
  return line;
}

std::string RawRequest(uint8_t options, const std::string& input) {
  std::string::size_type position = 0;
  const std::string target = "/webapi?" + TakeLine(input, &position);
  if ((options & 3) == 0) return "GET " + target + " HTTP/1.1\r\nHost: fuzz\r\n\r\n";
  std::string type = "application/x-www-form-urlencoded";
  if ((options & 3) == 2) type = "multipart/form-data; boundary=" + TakeLine(input, &position);
  if ((options & 3) == 3) type = TakeLine(input, &position);
  const std::string body = input.substr(position);
  return "POST " + target + " HTTP/1.1\r\nHost: fuzz\r\nContent-Type: " + type +
         "\r\nContent-Length: " + std::to_string(body.size()) + "\r\n\r\n" + body;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  if (size == 0) return 0;
  UploadFolder();
  static RequestReader server(CheckCall);
  server.Read(RawRequest(data[0], std::string(reinterpret_cast<const char*>(data + 1), size - 1)),
              data[0] >> 2);
  return 0;
}
