#ifndef ORVA_TOOLKIT_ACME_SETTINGS_H_
#define ORVA_TOOLKIT_ACME_SETTINGS_H_

#include <map>
#include <string>
#include <vector>

#include <json/json.h>

// What the device keeps for its ACME client, in the folder
// "/usr/orva/etc/ssl/acme" (0700): the settings (settings.json), the
// secrets apart from them (secrets.json), the last attempt (status.json),
// the client's own folder (lego/: account key and registration) and the
// client's output of the last run (lego.log). Every file is owner-only
// (0600) and replaced whole through StoreFileSet.

// The settings a user gives, checked (see api/acme_request.h) before they
// are kept. Nothing here is secret.
struct AcmeSettings {
  std::vector<std::string> domains;  // the first names the certificate
  std::string email;
  std::string directory;             // the authority's directory URL
  std::string challenge;             // "http-01" or "dns-01"
  std::string dns_provider;          // the client's provider code; "" for http-01
  std::vector<std::string> dns_resolvers;  // "HOST:PORT"; empty: the system's
  // Whether the client waits until the authoritative servers of the
  // record's zone answer it (the client finds them by SOA queries).
  bool dns_propagation_check = true;
  std::string key_type;              // "ec256", "ec384", "rsa2048" or "rsa4096"
  int renew_days = 30;
  std::string eab_kid;               // "" without external account binding
};

// The secrets: never answered, logged or put on a command line.
struct AcmeSecrets {
  std::map<std::string, std::string> dns_credentials;  // provider variable -> value
  std::string eab_hmac;
};

// The last order: when (seconds since the epoch), "success" or "failed",
// the authority's or the client's error text ("" on success), and the
// SHA-256 fingerprint of the certificate the last successful order
// installed (kept through later failures; "" before the first).
struct AcmeStatus {
  long long time = 0;
  std::string result;
  std::string error;
  std::string certificate;
};

// The real paths of the ACME folder, the client's folder and its output.
std::string AcmeFolder();
std::string LegoFolder();
std::string LegoOutputPath();

// Makes the ACME folder and the client's folder (0700) when missing and
// gives them mode 0700. False (logged) when it cannot.
bool MakeAcmeFolder();

// The settings as settings.json keeps them: an object of the members'
// names, lists as arrays, dns_propagation_check as "yes" or "no".
Json::Value AcmeSettingsJson(const AcmeSettings& settings);

// Replaces the settings and the secrets as one set. 0 on success; -1
// (logged) with both files as they were.
int SaveAcmeSettings(const AcmeSettings& settings, const AcmeSecrets& secrets);

// Reads the kept settings and secrets. 0 when they were read; 1 when none
// are kept; -1 (logged) when a file is there but does not read as
// settings. The outputs are untouched unless 0 is returned.
int LoadAcmeSettings(AcmeSettings* settings, AcmeSecrets* secrets);

// Replaces the status file. 0 or -1 (logged).
int SaveAcmeStatus(const AcmeStatus& status);
// The kept status; a default one (time 0) when there is none.
AcmeStatus LoadAcmeStatus();

// Forgets settings, secrets, status, the client's output and account: the
// whole ACME folder goes. 0 on success (also when there was none); -1
// (logged) when a file stays.
int ForgetAcme();

#endif  // ORVA_TOOLKIT_ACME_SETTINGS_H_
