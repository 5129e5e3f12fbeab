#ifndef ORVA_TOOLKIT_ACME_VALUES_H_
#define ORVA_TOOLKIT_ACME_VALUES_H_

#include <string>

#include <json/json.h>

// The shapes the ACME settings accept, each checked alone. They decide
// nothing about meaning (whether a domain exists); they keep every value
// that reaches the ACME client's command line or environment plain.

// A host name: labels of letters, digits and hyphens (no hyphen at either
// end, 1 to 63 bytes), joined by dots, at least two labels, at most 253
// bytes; with `wildcard`, a leading "*." is allowed as well.
bool IsAcmeDomain(const std::string& name, bool wildcard);

// An e-mail address: a local part of letters, digits and ".", "_", "%",
// "+", "-", then "@" and a host name as above; at most 254 bytes.
bool IsAcmeEmail(const std::string& address);

// An "https://" URL of printable ASCII without spaces, quotes, "@" or a
// backslash, with a host, at most 2048 bytes.
bool IsHttpsUrl(const std::string& url);

// The host part of an URL IsHttpsUrl accepts ("acme.example:14000" of
// "https://acme.example:14000/dir").
std::string UrlHost(const std::string& url);

// A resolver "HOST:PORT": a host name, an IPv4 address or an IPv6 address
// in brackets, and a port from 1 to 65535.
bool IsResolver(const std::string& resolver);

// An environment variable name as DNS providers name their settings:
// an upper-case letter, then upper-case letters, digits and "_".
bool IsVariableName(const std::string& name);

// A value that can travel in an environment entry or as one command-line
// word: 1 to 4096 bytes, no control character (NUL included).
bool IsPlainValue(const std::string& value);

// Reads `text` as a JSON object into *object. False for anything else,
// nesting deeper than a settings file ever needs included (the reader would
// throw there).
bool ParseJsonObject(const std::string& text, Json::Value* object);

#endif  // ORVA_TOOLKIT_ACME_VALUES_H_
