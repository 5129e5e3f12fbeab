#ifndef ORVA_API_SUBJECT_READER_H_
#define ORVA_API_SUBJECT_READER_H_

#include <string>

#include <json/json.h>

#include "platform/webapi/api_request.h"
#include "toolkit/csr_argument.h"

// Fills all seven members of `record` from the request's parameters: the
// "ca_" names when `ca` is true, the plain names otherwise. An absent
// parameter gives its default ("TW", "Taipei", "Taipel", "Organization",
// "Department", a placeholder domain and e-mail address); a present one is
// taken as text unchanged, empty included. Returns 0, or -1 (logged, nothing
// read) when `record` is null.
int fillCSRInfo(ORVA::APIRequest* request, CSR_ARGUMENT* record, bool ca);

// Sets the members of `record` whose names (X509_NAME2Json's keys:
// "common_name", "country", ...) `subject` holds; the others are left as
// they are, and so is all of `record` when `subject` is not an object.
void FillFromSubjectJson(const Json::Value& subject, CSR_ARGUMENT* record);

#endif  // ORVA_API_SUBJECT_READER_H_
