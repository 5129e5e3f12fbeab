#ifndef ORVA_COMMON_STORE_PATHS_H_
#define ORVA_COMMON_STORE_PATHS_H_

// Fixed device paths of the certificate store and the tools. They are
// device paths: pass each through OrvaPath before touching the file. Log
// messages name them as they stand here.

inline constexpr char kOpensslTool[] = "/usr/orva/bin/openssl";
inline constexpr char k7zTool[] = "/usr/orva/bin/7z";
inline constexpr char kLegoTool[] = "/usr/orva/bin/lego";

inline constexpr char kServerCrtPath[] = "/usr/orva/etc/ssl/ssl.crt/server.crt";
inline constexpr char kServerKeyPath[] = "/usr/orva/etc/ssl/ssl.key/server.key";
inline constexpr char kInterCrtPath[] =
    "/usr/orva/etc/ssl/ssl.intercrt/server-ca.crt";
inline constexpr char kCaCrtPath[] = "/usr/orva/etc/ssl/ssl.crt/ca.crt";
inline constexpr char kCaKeyPath[] = "/usr/orva/etc/ssl/ssl.key/ca.key";
inline constexpr char kCaCsrPath[] = "/usr/orva/etc/ssl/ssl.csr/ca.csr";

inline constexpr char kCaCfgPath[] = "/usr/orva/etc/ssl/cfg.d/ca.cfg";
inline constexpr char kServerCfgPath[] = "/usr/orva/etc/ssl/cfg.d/server.cfg";
inline constexpr char kCaCrtCfgPath[] = "/usr/orva/etc/ssl/cfg.d/ca.crt.cfg";
inline constexpr char kServerCrtCfgPath[] =
    "/usr/orva/etc/ssl/cfg.d/server.crt.cfg";
inline constexpr char kSerialPath[] = "/usr/orva/etc/ssl/.mkcert.serial";
inline constexpr char kMacAddressPath[] = "/proc/sys/kernel/orva_mac_address1";

inline constexpr char kGenDir[] = "/usr/orva/etc/ssl/.gen";
inline constexpr char kGenKeyPath[] = "/usr/orva/etc/ssl/.gen/server.key";
inline constexpr char kGenCsrPath[] = "/usr/orva/etc/ssl/.gen/server.csr";
inline constexpr char kGenCrtPath[] = "/usr/orva/etc/ssl/.gen/server.crt";
inline constexpr char kArchivePath[] = "/usr/orva/etc/ssl/.gen/archive.zip";

// ACME: the settings, account and status (0700, files 0600), and the
// webroot whose ".well-known/acme-challenge/" the front server offers over
// HTTP; it holds a challenge token only while an order waits for it.
inline constexpr char kAcmeDir[] = "/usr/orva/etc/ssl/acme";
inline constexpr char kAcmeWebroot[] = "/usr/orva/etc/ssl/acme-webroot";
inline constexpr char kAcmeChallengeDir[] =
    "/usr/orva/etc/ssl/acme-webroot/.well-known/acme-challenge";

#endif  // ORVA_COMMON_STORE_PATHS_H_
