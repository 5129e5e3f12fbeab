#include "host/api_call.h"

#include <exception>
#include <memory>
#include <sstream>

#include "platform/olib/olib_unicode.h"
#include "platform/webapi/api_request.h"
#include "platform/webapi/api_response.h"

namespace {

constexpr char kReplacementCharacter[] = "\xEF\xBF\xBD";  // U+FFFD

// The length of the well-formed UTF-8 sequence that starts at text[at], or
// 0 when none does. No proper prefix of a sequence is well-formed, so the
// shortest well-formed prefix is exactly one sequence.
size_t Utf8SequenceLength(const std::string& text, size_t at) {
  char sequence[5] = {};
  for (size_t length = 1; length <= 4 && at + length <= text.size(); ++length) {
    sequence[length - 1] = text[at + length - 1];
    if (OLIBCUnicodeIsUTF8(sequence)) return length;
  }
  return 0;
}

}  // namespace

bool IsHostOnlyParameter(const std::string& name) {
  static const std::string kSuffix = "_tmp";
  return name.size() >= kSuffix.size() &&
         name.compare(name.size() - kSuffix.size(), kSuffix.size(), kSuffix) == 0;
}

CallOutcome HostFailure(int status) {
  CallOutcome outcome;
  outcome.http_status = status;
  outcome.answer = ORVA::HostErrorJson(status);
  return outcome;
}

const ORVA::APIEntry* FindApiRow(const ORVA::APITable& table,
                                 const std::string& api,
                                 const std::string& method, int version) {
  for (int i = 0; table.rows != nullptr && i < table.count; ++i) {
    const ORVA::APIEntry& row = table.rows[i];
    if (api == row.api && method == row.method && version == row.version) {
      return &row;
    }
  }
  return nullptr;
}

const ORVA::APITable* FindServingTable(const std::vector<ORVA::APITable>& tables,
                                       const std::string& api,
                                       const std::string& method, int version) {
  for (const ORVA::APITable& table : tables) {
    if (FindApiRow(table, api, method, version) != nullptr) return &table;
  }
  return nullptr;
}

CallOutcome CallApi(const ORVA::APITable& table, const std::string& api,
                    const std::string& method, int version,
                    const Json::Value& params) {
  const ORVA::APIEntry* row = FindApiRow(table, api, method, version);
  if (row == nullptr) return HostFailure(404);

  ORVA::APIRequest request(api, method, version, params);
  ORVA::APIResponse response;
  ORVA::DownloadCollector collector;
  try {
    row->handler(&request, &response);
  } catch (const std::exception&) {
    return HostFailure(500);
  } catch (...) {
    return HostFailure(500);
  }

  CallOutcome outcome;
  outcome.httpd_restart = response.httpd_restart();
  if (!response.output_enabled()) {
    if (!collector.result().has_body) return HostFailure(500);
    outcome.is_download = true;
    outcome.success = true;
    outcome.download = collector.result();
    return outcome;
  }
  if (response.outcome() == ORVA::APIResponse::Outcome::kNone) {
    return HostFailure(500);
  }
  outcome.success = response.outcome() == ORVA::APIResponse::Outcome::kSuccess;
  outcome.answer = response.ToJson();
  return outcome;
}

std::string ToOneLineJson(const Json::Value& value) {
  Json::StreamWriterBuilder builder;
  builder["indentation"] = "";
  builder["emitUTF8"] = true;
  // The writer copies the bytes of strings as they stand, and certificate
  // names are read byte for byte: what is not UTF-8 is replaced. Bytes from
  // 0x80 up occur only inside strings, so the JSON stays whole.
  std::string json = Json::writeString(builder, value);
  if (OLIBCUnicodeIsUTF8(json.c_str())) return json;
  std::string valid;
  valid.reserve(json.size());
  for (size_t at = 0; at < json.size();) {
    size_t length = Utf8SequenceLength(json, at);
    if (length == 0) {
      valid += kReplacementCharacter;
      ++at;
    } else {
      valid.append(json, at, length);
      at += length;
    }
  }
  return valid;
}

std::string OfferedFileName(const ORVA::DownloadResult& download) {
  for (const auto& header : download.headers) {
    std::string name = header.first;
    for (char& c : name) c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
    if (name != "content-disposition") continue;
    std::string::size_type start = header.second.find("filename=\"");
    if (start == std::string::npos) continue;
    start += 10;
    std::string::size_type end = header.second.find('"', start);
    if (end == std::string::npos) continue;
    std::string offered = header.second.substr(start, end - start);
    offered = offered.substr(offered.rfind('/') == std::string::npos
                                 ? 0
                                 : offered.rfind('/') + 1);
    if (offered == "." || offered == "..") return "";
    return offered;
  }
  return "";
}
