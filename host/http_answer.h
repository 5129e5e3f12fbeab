#ifndef ORVA_HOST_HTTP_ANSWER_H_
#define ORVA_HOST_HTTP_ANSWER_H_

#include <httplib.h>

#include "host/api_call.h"

// Writes `outcome` into `response`: the answer as one line of JSON with its
// HTTP status, or a download's bytes with the handler's headers and a
// content type (the handler's own, else one that fits the offered file
// name). Handler headers that the server itself sets (length, encoding,
// connection) or that hold line breaks are left out.
void WriteCallOutcome(const CallOutcome& outcome, httplib::Response* response);

// The answer of a host-level failure: HTTP `status` with the JSON
// {"success":false,"error":{"code":STATUS}}.
void WriteHostFailure(int status, httplib::Response* response);

#endif  // ORVA_HOST_HTTP_ANSWER_H_
