#ifndef ORVA_API_REQUEST_VALUES_H_
#define ORVA_API_REQUEST_VALUES_H_

#include "platform/webapi/api_request.h"

// A key length parameter as a whole number of bits: a JSON number is taken
// as it is, a text as the decimal number it starts with ("2048" by
// default). A text that is no number gives 0, which key generation refuses.
int ReadKeyLength(ORVA::APIRequest* request, const char* name);

#endif  // ORVA_API_REQUEST_VALUES_H_
