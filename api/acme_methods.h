#ifndef ORVA_API_ACME_METHODS_H_
#define ORVA_API_ACME_METHODS_H_

#include "platform/webapi/api_request.h"
#include "platform/webapi/api_response.h"

// ORVA.Core.Certificate.ACME: a certificate from an ACME authority, kept
// fresh. Each answers through `response` on every path; the host owns both
// objects and has checked the parameters against the method's rule set.

// Checks every parameter (ReadAcmeRequest) and keeps the settings and
// secrets (acme/, 0600). Success with null data; 5503 for a refused value
// or 5501 (logged) with nothing written.
void SetAcme(ORVA::APIRequest* request, ORVA::APIResponse* response);

// Success with {"settings", "account", "status", "certificate",
// "next_renewal"}: the settings with the credentials' names only (null when
// none are kept), the account {"email", "registered"}, the last attempt
// {"time" (ISO 8601, null before the first), "result", "error"}, the
// installed certificate {"issuer" (common name), "valid_till" (ISO 8601),
// "days_left"} when the last successful order installed it (null
// otherwise), and the date from which renew orders again (null when no
// ACME certificate is installed). Never fails.
void GetAcme(ORVA::APIRequest* request, ORVA::APIResponse* response);

// Forgets the settings, secrets, status and account; the installed
// certificate stays. Success with null data, or 5501 (logged).
void DeleteAcme(ORVA::APIRequest* request, ORVA::APIResponse* response);

// Orders a certificate now and installs it as the import does (proof,
// staged install, activation). Success with {"renewed": ["acme"],
// "restart_httpd": bool}; 5522 when ACME is not set up; 5523 with
// {"error": TEXT} when the order failed; the import's codes when the
// issued set is refused. The store is unchanged on every failure; the
// status records every attempt.
void IssueAcme(ORVA::APIRequest* request, ORVA::APIResponse* response);

// Renews what is due. The ACME certificate: when ACME is set up and either
// no order has installed a certificate yet, or the installed certificate
// is the one the last order installed and has renew_days or fewer days
// left (a certificate installed since by other means is left alone). A
// server certificate the local CA issued with 30 days or fewer left:
// signed anew by the same CA for the same key and names, for 825 days.
// Success with {"renewed": [...] ("acme", "local"), "restart_httpd":
// bool}, activated as an import when something changed; otherwise the
// first failure's code (5523 with {"error": TEXT}, 5501 also for kept
// settings that do not read), after activating what was renewed.
void RenewDue(ORVA::APIRequest* request, ORVA::APIResponse* response);

#endif  // ORVA_API_ACME_METHODS_H_
