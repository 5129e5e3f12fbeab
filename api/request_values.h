#ifndef ORVA_API_REQUEST_VALUES_H_
#define ORVA_API_REQUEST_VALUES_H_

#include "platform/webapi/api_request.h"
#include "toolkit/key_kind.h"

// The key asked for by the parameters `typeName` ("rsa", the default, or
// "ec") and `lengthName`, a whole number of bits: a JSON number is taken as
// it is, a text as the decimal number it starts with (2048 by default, 256
// for "ec"); a text that is no number gives 0, which key generation
// refuses. False (logged) for any other type; the size is left for key
// generation to refuse.
bool ReadKeyKind(ORVA::APIRequest* request, const char* typeName, const char* lengthName,
                 KeyKind* kind);

#endif  // ORVA_API_REQUEST_VALUES_H_
