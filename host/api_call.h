#ifndef ORVA_HOST_API_CALL_H_
#define ORVA_HOST_API_CALL_H_

#include <string>
#include <vector>

#include <json/json.h>

#include "platform/webapi/api_download.h"
#include "platform/webapi/api_table.h"

// How the host answers one call. HTTP status 200 for every answer the
// module gives; host-level failures use their HTTP status as the code.
struct CallOutcome {
  int http_status = 200;
  bool success = false;
  Json::Value answer;            // the JSON answer, unless this is a download
  bool is_download = false;
  ORVA::DownloadResult download;
  bool httpd_restart = false;    // the handler asked for a web server restart
};

// True for a parameter name that only the host may set ("..._tmp"): these
// name files on the device.
bool IsHostOnlyParameter(const std::string& name);

// The row of `table` that serves api, version and method, or null when none
// does.
const ORVA::APIEntry* FindApiRow(const ORVA::APITable& table,
                                 const std::string& api,
                                 const std::string& method, int version);

// The first of `tables` with a row that serves api, version and method, or
// null when none has one. The tables are the caller's.
const ORVA::APITable* FindServingTable(const std::vector<ORVA::APITable>& tables,
                                       const std::string& api,
                                       const std::string& method, int version);

// Calls the row of `table` matching api, version and method with `params`
// (a JSON object of text values). Unknown rows answer 404; a handler that
// throws or ends without any answer answers 500.
CallOutcome CallApi(const ORVA::APITable& table, const std::string& api,
                    const std::string& method, int version,
                    const Json::Value& params);

// A host-level failure with `status` as HTTP status and code.
CallOutcome HostFailure(int status);

// `value` as JSON text on one line, in UTF-8: every byte of a string that
// is not part of a well-formed UTF-8 sequence becomes U+FFFD.
std::string ToOneLineJson(const Json::Value& value);

// The file name offered by a content-disposition header value, reduced to a
// plain base name; "" when none.
std::string OfferedFileName(const ORVA::DownloadResult& download);

#endif  // ORVA_HOST_API_CALL_H_
