#ifndef ORVA_TOOLKIT_LEGO_TOOL_H_
#define ORVA_TOOLKIT_LEGO_TOOL_H_

#include <string>
#include <vector>

#include "toolkit/acme_settings.h"

// The ACME client: the device's lego tool ("/usr/orva/bin/lego"), run
// through the one command runner. Every value reaches it as one quoted
// word of a line written here; DNS credentials reach it only through its
// environment.

// The longest an order may take before the client is killed.
inline constexpr int kLegoOrderSeconds = 300;

// Asks the client about the DNS provider `provider` (letters, digits and
// "-" only; anything else is no provider). 0 when the client knows it, with
// the names of the variables it reads (credentials and further settings)
// in *variables; 1 when it does not; -1 (logged) when the client cannot be
// asked.
int LegoProviderVariables(const std::string& provider, std::vector<std::string>* variables);

// True when the client's folder holds an account registered with the
// settings' directory for their e-mail address.
bool LegoAccountRegistered(const AcmeSettings& settings);

// A certificate set an order brought, as PEM text.
struct IssuedSet {
  std::string certificate;  // the leaf alone
  std::string key;
  std::string chain;        // the issuer certificates, leaf-upwards
};

// Orders a certificate for `settings` now: registers the account first
// when it is not (with external account binding when the settings have
// it), solves the challenges (http-01 by files in the ACME webroot, dns-01
// through the provider with `secrets`' credentials), waits up to
// kLegoOrderSeconds and writes the client's output to LegoOutputPath()
// (0600). 0 with *issued filled; -1 with *error holding the last line the
// client wrote (the authority's error as the client reports it) or what
// else failed, logged. Whatever happened, the challenge folder is emptied
// and the client's copies of the certificate and key are removed; the
// certificate store is never touched.
int RunLegoOrder(const AcmeSettings& settings, const AcmeSecrets& secrets, IssuedSet* issued,
                 std::string* error);

#endif  // ORVA_TOOLKIT_LEGO_TOOL_H_
