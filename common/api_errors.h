#ifndef ORVA_COMMON_API_ERRORS_H_
#define ORVA_COMMON_API_ERRORS_H_

// API error codes sent to the web client, with null data.
enum ApiError {
  kErrFailed = 5501,              // the operation failed
  kErrNone = 5502,                // a check passed; never sent
  kErrBadParameter = 5503,        // a parameter broke its rule
  kErrFileMissing = 5504,         // the requested certificate file is absent
  kErrCrtHeader = 5510,           // certificate file lacks "CERTIFICATE"
  kErrKeyHeader = 5511,           // key file lacks "PRIVATE KEY"
  kErrInterCrtHeader = 5512,      // intermediate file lacks "CERTIFICATE"
  kErrKeyMismatch = 5514,         // certificate and key do not belong together
  kErrStoreWrite = 5515,          // a store directory or copy failed
  kErrNotUtf8 = 5516,             // first line of an upload is not UTF-8
  kErrChain = 5517,               // the intermediate did not issue the certificate
  kErrDsaKey = 5518,              // DSA keys are refused
  kErrCsrHeader = 5519,           // request file lacks "CERTIFICATE REQUEST"
  // The second module's codes.
  kErrBundlePassword = 5520,      // the bundle's password is wrong or missing
  kErrBundleNoPair = 5521,        // the bundle holds no key, or no certificate of its key
  kErrAcmeNotSet = 5522,          // ACME is not set up
  kErrAcmeOrder = 5523,           // the ACME order failed; data {"error": TEXT}
};

#endif  // ORVA_COMMON_API_ERRORS_H_
