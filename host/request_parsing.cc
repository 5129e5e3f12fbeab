#include "host/request_parsing.h"

#include <set>
#include <utility>
#include <vector>

#include "host/api_call.h"

namespace {

constexpr int kBadRequest = 400;
constexpr int kServerError = 500;

bool IsReservedName(const std::string& name) {
  return name == "api" || name == "method" || name == "version";
}

bool IsUpload(const httplib::MultipartFormData& part) {
  return !part.filename.empty();
}

bool IsEmptyFileInput(const httplib::MultipartFormData& part) {
  return part.filename.empty() && !part.content_type.empty() &&
         part.content.empty();
}

// A whole number of up to nine decimal digits.
bool ParseVersion(const std::string& text, int* version) {
  if (text.empty() || text.size() > 9) return false;
  int value = 0;
  for (char c : text) {
    if (c < '0' || c > '9') return false;
    value = value * 10 + (c - '0');
  }
  *version = value;
  return true;
}

}  // namespace

int ParseWebapiRequest(const httplib::Request& request,
                       TemporaryUploads* uploads, WebapiCall* call) {
  std::vector<std::pair<std::string, std::string>> fields(request.params.begin(),
                                                          request.params.end());
  std::vector<const httplib::MultipartFormData*> files;
  for (const auto& entry : request.files) {
    const httplib::MultipartFormData& part = entry.second;
    if (IsUpload(part)) {
      files.push_back(&part);
    } else if (!IsEmptyFileInput(part)) {
      fields.emplace_back(part.name, part.content);
    }
  }

  std::set<std::string> names;
  bool has_api = false, has_method = false;
  for (const auto& field : fields) {
    const std::string& name = field.first;
    if (name.empty() || IsHostOnlyParameter(name) ||
        !names.insert(name).second) {
      return kBadRequest;
    }
    if (name == "api") {
      call->api = field.second;
      has_api = true;
    } else if (name == "method") {
      call->method = field.second;
      has_method = true;
    } else if (name == "version") {
      if (!ParseVersion(field.second, &call->version)) return kBadRequest;
    } else {
      call->params[name] = field.second;
    }
  }
  if (!has_api || !has_method) return kBadRequest;
  for (const httplib::MultipartFormData* file : files) {
    if (file->name.empty() || IsHostOnlyParameter(file->name) ||
        IsReservedName(file->name) || !names.insert(file->name).second) {
      return kBadRequest;
    }
  }

  for (const httplib::MultipartFormData* file : files) {
    if (!uploads->Add(file->name, file->content, file->filename, &call->params)) {
      return kServerError;
    }
  }
  return 0;
}
