#ifndef ORVA_HOST_REQUEST_PARSING_H_
#define ORVA_HOST_REQUEST_PARSING_H_

#include <httplib.h>
#include <json/json.h>

#include <string>

#include "host/temporary_uploads.h"

// One /webapi request as the host calls it.
struct WebapiCall {
  std::string api;
  std::string method;
  int version = 1;
  Json::Value params{Json::objectValue};  // the method's parameters, as texts
};

// Turns `request` into *call. "api", "method" and "version" (default 1) and
// the method's parameters come from the query string together with an
// urlencoded form, or with the fields of a multipart form. A multipart part
// that carries a file name is an upload: it is saved through *uploads,
// which names its private file in "N_tmp" and puts the client's file name
// in "N". A part without a file name, with a content type and no content,
// is a file input left empty and is skipped.
//
// Returns 0, or the HTTP status of a host-level failure: 400 when "api" or
// "method" is missing, "version" is not a whole number, a name is empty,
// reserved for the host ("..._tmp") or given twice, or an upload is named
// "api", "method" or "version"; 500 when an upload cannot be saved. The
// names are all checked before the first upload is saved; after a 500,
// *uploads may hold the files saved before the failing one.
int ParseWebapiRequest(const httplib::Request& request,
                       TemporaryUploads* uploads, WebapiCall* call);

#endif  // ORVA_HOST_REQUEST_PARSING_H_
