#ifndef ORVA_API_ACME_REQUEST_H_
#define ORVA_API_ACME_REQUEST_H_

#include "platform/webapi/api_request.h"
#include "toolkit/acme_settings.h"

// The ACME "set" parameters, read and checked before anything is written:
// domains (JSON array, 1 to 100 host names; "*." first only with dns-01),
// email, agree_tos ("yes"), directory (https URL; default Let's Encrypt's
// production directory), challenge ("http-01" default, "dns-01"),
// dns_provider (a provider the client knows, not one that runs a local
// program: "exec", "manual"), dns_credentials (a JSON object, or a text
// holding one, of variables the provider reads to plain values),
// dns_resolvers (JSON array of "HOST:PORT"), dns_propagation_check ("yes",
// the default, or "no": the client does not wait for the zone's
// authoritative servers to answer the record), key_type ("ec256" default,
// "ec384", "rsa2048", "rsa4096"), renew_days (1 to 3650, default 30),
// eab_kid and eab_hmac (both or neither). The dns_ values are for dns-01;
// with http-01 they must be absent or empty. An empty text counts as
// absent.
//
// Returns 5502 with *settings and *secrets filled; 5503 (logged, naming the
// field that broke its rule and never a secret's value) with both
// untouched; 5501 (logged) when the client cannot be asked about the
// provider.
int ReadAcmeRequest(ORVA::APIRequest* request, AcmeSettings* settings, AcmeSecrets* secrets);

#endif  // ORVA_API_ACME_REQUEST_H_
