#ifndef ORVA_API_LOCAL_SERVER_RENEWAL_H_
#define ORVA_API_LOCAL_SERVER_RENEWAL_H_

// A server certificate the local CA issued is renewed when it has this
// many days or fewer left.
inline constexpr int kLocalRenewDays = 30;

// Signs the installed server certificate anew with the store's local CA:
// the same key, subject and alternative names (DNS and IP entries; the
// e-mail address from the subject), CRT create's server extensions, 825
// days, installed whole over server.crt once proved to match the key. The
// caller has found the certificate issued by the local CA. Returns 5502
// when the new certificate is installed; 5501 (logged) otherwise, with the
// store's key and certificate as they were.
int ResignLocalServerCertificate();

#endif  // ORVA_API_LOCAL_SERVER_RENEWAL_H_
