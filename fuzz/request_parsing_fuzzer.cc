// Fuzz target: a /webapi request read by the HTTP server's own code (request
// line and query string, urlencoded or multipart body) and turned into a
// call by ParseWebapiRequest, uploads saved in a private upload folder.
//
// Input: one byte of options, a line (up to the first '\n', which is
// dropped) that is the query string, then:
//   options & 3 == 0  GET /webapi?QUERY; the rest is ignored
//   options & 3 == 1  POST /webapi?QUERY with the rest as an urlencoded form
//   options & 3 == 2  POST /webapi?QUERY with a multipart form: a second line
//                     is its boundary, the rest the body
//   options & 3 == 3  as 2, but the second line is the whole Content-Type
// options >> 2, when not 0, is the most bytes one read gets, as when a
// client's request arrives in small pieces; 0 gives all it asks for. (The
// installed HTTP library refuses a multipart body whose reads are shorter
// than its boundary line, so such inputs end before ParseWebapiRequest.)
//
// Beyond crashes it checks the call against the rules it must follow,
// worked out independently from the fields and parts the server read: the
// result; the api, method, version and parameters of an accepted call; for
// each upload N, "N_tmp" names a private file of the upload folder holding
// exactly the part's content and "N" the client's file name; no parameter
// the client sent ends in "_tmp"; a refused call saves no file; and no file
// is left once the call's uploads go away.

#include <dirent.h>
#include <httplib.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <fstream>
#include <iterator>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include <json/json.h>

#include "fuzz/fuzz_scratch.h"
#include "host/http_server.h"
#include "host/request_parsing.h"
#include "host/temporary_uploads.h"

namespace {

constexpr int kBadRequest = 400;

// The raw request handed to the server in reads of at most `most` bytes
// (0: no limit); what the server writes back is dropped.
class RequestStream : public httplib::Stream {
 public:
  RequestStream(const std::string& request, size_t most)
      : request_(request), most_(most) {}

  bool is_readable() const override { return true; }
  bool is_writable() const override { return true; }
  ssize_t read(char* ptr, size_t size) override {
    size_t count = std::min(size, request_.size() - position_);
    if (most_ != 0) count = std::min(count, most_);
    request_.copy(ptr, count, position_);
    position_ += count;
    return static_cast<ssize_t>(count);
  }
  ssize_t write(const char*, size_t size) override {
    return static_cast<ssize_t>(size);
  }
  void get_remote_ip_and_port(std::string& ip, int& port) const override {
    ip = "127.0.0.1";
    port = 40000;
  }
  void get_local_ip_and_port(std::string& ip, int& port) const override {
    ip = "127.0.0.1";
    port = 8080;
  }
  socket_t socket() const override { return 0; }

 private:
  const std::string& request_;
  const size_t most_;
  size_t position_ = 0;
};

// The server with its request handling open to the harness.
class RequestReader : public httplib::Server {
 public:
  template <typename Handler>
  explicit RequestReader(Handler handler) {
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

const std::string& UploadFolder() {
  static const std::string folder = [] {
    std::string path = FuzzScratch::Get().Path("/uploads");
    if (mkdir(path.c_str(), 0700) != 0) std::abort();
    setenv("TMPDIR", path.c_str(), 1);
    return path;
  }();
  return folder;
}

size_t CountFiles(const std::string& folder) {
  DIR* directory = opendir(folder.c_str());
  if (directory == nullptr) std::abort();
  size_t count = 0;
  while (struct dirent* entry = readdir(directory)) {
    const std::string name = entry->d_name;
    if (name != "." && name != "..") ++count;
  }
  closedir(directory);
  return count;
}

bool EndsWithTmp(const std::string& name) {
  return name.size() >= 4 && name.compare(name.size() - 4, 4, "_tmp") == 0;
}

bool IsWholeNumber(const std::string& text) {
  return !text.empty() && text.size() <= 9 &&
         text.find_first_not_of("0123456789") == std::string::npos;
}

// The request as ParseWebapiRequest must see it: named texts (query string,
// urlencoded form, multipart parts without a file name that are not empty
// file inputs) and uploads (parts with a file name).
struct Sent {
  std::vector<std::pair<std::string, std::string>> fields;
  std::vector<const httplib::MultipartFormData*> uploads;
};

Sent WhatWasSent(const httplib::Request& request) {
  Sent sent;
  for (const auto& param : request.params) sent.fields.push_back(param);
  for (const auto& entry : request.files) {
    const httplib::MultipartFormData& part = entry.second;
    if (!part.filename.empty()) {
      sent.uploads.push_back(&part);
    } else if (part.content_type.empty() || !part.content.empty()) {
      sent.fields.emplace_back(part.name, part.content);
    }
  }
  return sent;
}

int ExpectedResult(const Sent& sent) {
  std::set<std::string> names;
  for (const auto& field : sent.fields) {
    if (field.first.empty() || EndsWithTmp(field.first) ||
        !names.insert(field.first).second) {
      return kBadRequest;
    }
    if (field.first == "version" && !IsWholeNumber(field.second)) return kBadRequest;
  }
  if (names.count("api") == 0 || names.count("method") == 0) return kBadRequest;
  for (const httplib::MultipartFormData* upload : sent.uploads) {
    const std::string& name = upload->name;
    if (name.empty() || EndsWithTmp(name) || name == "api" || name == "method" ||
        name == "version" || !names.insert(name).second) {
      return kBadRequest;
    }
  }
  return 0;
}

bool ReadWholeFile(const std::string& path, std::string* content) {
  std::ifstream stream(path, std::ios::binary);
  if (!stream) return false;
  content->assign(std::istreambuf_iterator<char>(stream), std::istreambuf_iterator<char>());
  return !stream.bad();
}

// A private regular file directly inside the upload folder holding exactly
// `content`.
bool IsSavedUpload(const Json::Value& path_value, const std::string& content) {
  if (!path_value.isString()) return false;
  const std::string path = path_value.asString();
  const std::string prefix = UploadFolder() + "/";
  if (path.compare(0, prefix.size(), prefix) != 0 ||
      path.find('/', prefix.size()) != std::string::npos) {
    return false;
  }
  struct stat status;
  if (lstat(path.c_str(), &status) != 0 || !S_ISREG(status.st_mode) ||
      (status.st_mode & 07777) != 0600 || status.st_uid != geteuid()) {
    return false;
  }
  std::string saved;
  return ReadWholeFile(path, &saved) && saved == content;
}

// The call an accepted request must give.
bool IsExpectedCall(const Sent& sent, const WebapiCall& call) {
  Json::Value params(Json::objectValue);
  std::string api, method;
  int version = 1;
  for (const auto& field : sent.fields) {
    if (field.first == "api") {
      api = field.second;
    } else if (field.first == "method") {
      method = field.second;
    } else if (field.first == "version") {
      version = std::atoi(field.second.c_str());
    } else {
      params[field.first] = field.second;
    }
  }
  for (const httplib::MultipartFormData* upload : sent.uploads) {
    if (!IsSavedUpload(call.params[upload->name + "_tmp"], upload->content)) {
      return false;
    }
    params[upload->name] = upload->filename;
    params[upload->name + "_tmp"] = call.params[upload->name + "_tmp"];
  }
  return call.api == api && call.method == method && call.version == version &&
         call.params == params;
}

void CheckCall(const httplib::Request& request) {
  const std::string& folder = UploadFolder();
  if (CountFiles(folder) != 0) std::abort();
  const Sent sent = WhatWasSent(request);
  {
    TemporaryUploads uploads;
    WebapiCall call;
    int result = -1;
    try {
      result = ParseWebapiRequest(request, &uploads, &call);
    } catch (...) {
      std::abort();  // The server would answer 500 and hide the fault.
    }
    if (result != ExpectedResult(sent)) std::abort();
    const size_t saved = CountFiles(folder);
    if (result == 0 && (saved != sent.uploads.size() || !IsExpectedCall(sent, call))) {
      std::abort();
    }
    if (result != 0 && saved != 0) std::abort();
  }
  if (CountFiles(folder) != 0) std::abort();
}

std::string TakeLine(const std::string& input, std::string::size_type* position) {
  std::string::size_type newline = input.find('\n', *position);
  if (newline == std::string::npos) newline = input.size();
  std::string line = input.substr(*position, newline - *position);
  *position = std::min(newline + 1, input.size());
  return line;
}

std::string RawRequest(uint8_t options, const std::string& input) {
  std::string::size_type position = 0;
  const std::string query = TakeLine(input, &position);
  const std::string target = "/webapi?" + query;
  const int kind = options & 3;
  if (kind == 0) return "GET " + target + " HTTP/1.1\r\nHost: fuzz\r\n\r\n";
  std::string content_type = "application/x-www-form-urlencoded";
  if (kind == 2) content_type = "multipart/form-data; boundary=" + TakeLine(input, &position);
  if (kind == 3) content_type = TakeLine(input, &position);
  const std::string body = input.substr(position);
  return "POST " + target + " HTTP/1.1\r\nHost: fuzz\r\nContent-Type: " + content_type +
         "\r\nContent-Length: " + std::to_string(body.size()) + "\r\n\r\n" + body;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  if (size == 0) return 0;
  UploadFolder();
  static RequestReader server([](const httplib::Request& request, httplib::Response&) {
    CheckCall(request);
  });
  const std::string input(reinterpret_cast<const char*>(data + 1), size - 1);
  server.Read(RawRequest(data[0], input), data[0] >> 2);
  return 0;
}
