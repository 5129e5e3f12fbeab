#ifndef ORVA_API_CSR_ARGUMENT_H_
#define ORVA_API_CSR_ARGUMENT_H_

#include <string>

#include "platform/webapi/api_request.h"

// The subject of a certificate request. The record enforces nothing; request
// generation decides what it accepts.
typedef struct _tag_CSR_ARGUMENT {
  std::string country;
  std::string state;
  std::string city;
  std::string organization;
  std::string department;
  std::string common_name;
  std::string email;
} CSR_ARGUMENT;

// Fills all seven members of `record` from the request's parameters: the
// "ca_" names when `ca` is true, the plain names otherwise. An absent
// parameter gives its default ("TW", "Taipei", "Taipel", "Organization",
// "Department", a placeholder domain and e-mail address); a present one is
// taken as text unchanged, empty included. Returns 0, or -1 (logged, nothing
// read) when `record` is null.
int fillCSRInfo(ORVA::APIRequest* request, CSR_ARGUMENT* record, bool ca);

#endif  // ORVA_API_CSR_ARGUMENT_H_
