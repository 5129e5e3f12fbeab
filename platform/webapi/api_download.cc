#include "platform/webapi/api_download.h"

#include <fstream>
#include <iterator>

namespace ORVA {

namespace {
thread_local DownloadCollector* tCurrentCollector = nullptr;
}  // namespace

DownloadCollector::DownloadCollector() : previous_(tCurrentCollector) {
  tCurrentCollector = this;
}

DownloadCollector::~DownloadCollector() { tCurrentCollector = previous_; }

DownloadCollector* DownloadCollector::Current() { return tCurrentCollector; }

void APIDownload::SetHeader(const std::string& name, const std::string& value) {
  DownloadCollector* collector = DownloadCollector::Current();
  if (collector == nullptr) return;
  collector->mutable_result()->headers.emplace_back(name, value);
}

bool APIDownload::Output(const std::string& path) {
  DownloadCollector* collector = DownloadCollector::Current();
  if (collector == nullptr) return false;
  std::ifstream file(path, std::ios::binary);
  if (!file) return false;
  std::string body((std::istreambuf_iterator<char>(file)),
                   std::istreambuf_iterator<char>());
  if (file.bad()) return false;
  DownloadResult* result = collector->mutable_result();
  result->body = std::move(body);
  result->has_body = true;
  return true;
}

}  // namespace ORVA
