#include "host/http_answer.h"

#include <cctype>
#include <string>
#include <utility>

namespace {

constexpr char kJsonType[] = "application/json; charset=utf-8";

std::string Lowered(std::string text) {
  for (char& c : text) c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
  return text;
}

bool EndsWith(const std::string& text, const std::string& suffix) {
  return text.size() >= suffix.size() &&
         text.compare(text.size() - suffix.size(), suffix.size(), suffix) == 0;
}

std::string TypeOfOfferedFile(const std::string& name) {
  std::string lowered = Lowered(name);
  if (EndsWith(lowered, ".zip")) return "application/zip";
  if (EndsWith(lowered, ".pem") || EndsWith(lowered, ".crt") ||
      EndsWith(lowered, ".key") || EndsWith(lowered, ".csr")) {
    return "application/x-pem-file";
  }
  return "application/octet-stream";
}

bool IsServerHeader(const std::string& loweredName) {
  return loweredName == "content-length" || loweredName == "transfer-encoding" ||
         loweredName == "connection" || loweredName == "keep-alive";
}

bool HasLineBreak(const std::string& text) {
  return text.find_first_of("\r\n") != std::string::npos;
}

}  // namespace

void WriteHostFailure(int status, httplib::Response* response) {
  response->status = status;
  response->set_content(ToOneLineJson(HostFailure(status).answer), kJsonType);
}

void WriteCallOutcome(const CallOutcome& outcome, httplib::Response* response) {
  response->status = outcome.http_status;
  if (!outcome.is_download) {
    response->set_content(ToOneLineJson(outcome.answer), kJsonType);
    return;
  }
  std::string type = TypeOfOfferedFile(OfferedFileName(outcome.download));
  for (const auto& header : outcome.download.headers) {
    std::string name = Lowered(header.first);
    if (name.empty() || IsServerHeader(name) || HasLineBreak(header.first) ||
        HasLineBreak(header.second)) {
      continue;
    }
    if (name == "content-type") {
      type = header.second;
    } else {
      response->set_header(header.first, header.second);
    }
  }
  response->set_content(outcome.download.body, type);
}
