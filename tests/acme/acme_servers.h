#ifndef ORVA_TESTS_ACME_ACME_SERVERS_H_
#define ORVA_TESTS_ACME_ACME_SERVERS_H_

#include <sys/types.h>

#include <httplib.h>

#include <functional>
#include <memory>
#include <string>
#include <thread>

// A real ACME authority on loopback for one test: pebble, with
// pebble-challtestsrv as its DNS (every name answers 127.0.0.1 unless told
// otherwise; its own challenge listeners are off). Both are killed with the
// object, whatever the test did.
class AcmeServers {
 public:
  // Picks free loopback ports and makes the folder `folder` with pebble's
  // TLS certificate in it; nothing runs yet.
  explicit AcmeServers(const std::string& folder);
  ~AcmeServers();

  AcmeServers(const AcmeServers&) = delete;
  AcmeServers& operator=(const AcmeServers&) = delete;

  // Starts the fake DNS and pebble, which validates http-01 challenges on
  // `httpPort` of the names' addresses, and waits up to 60 s until both
  // answer. True when they do.
  bool Start(int httpPort);
  // What both have written so far.
  std::string Logs() const;
  // Kills pebble (SIGKILL) and waits for it.
  void KillPebble();

  // What lego needs: the certificate pebble presents (the file to name in
  // LEGO_CA_CERTIFICATES), the directory URL and the DNS as "HOST:PORT".
  const std::string& TlsCertificateFile() const { return tls_certificate_; }
  std::string Directory() const;
  std::string Resolver() const;

  // pebble's root certificate as PEM, from its management port; "" when it
  // cannot be fetched.
  std::string Root() const { return Fetch(management_port_, "/roots/0"); }
  // POSTs the JSON `body` to the fake DNS's management `path` ("/set-txt",
  // "/add-a"...). True when it answered 200.
  bool TellDns(const std::string& path, const std::string& body) const;

 private:
  // The body of `path` on pebble's HTTPS `port`; "" unless it answered 200.
  std::string Fetch(int port, const std::string& path) const;

  std::string folder_;
  std::string tls_certificate_;
  int acme_port_, management_port_, dns_port_, dns_management_port_;
  pid_t pebble_ = -1, dns_ = -1;
};

// The other end of lego's "httpreq" DNS provider: each {"fqdn","value"}
// posted to /present becomes a TXT record of the fake DNS, and /cleanup
// clears it. Serves on a free loopback port in a thread of its own until
// the object goes.
class DnsProviderAdapter {
 public:
  explicit DnsProviderAdapter(const AcmeServers& servers);
  ~DnsProviderAdapter();

  // The URL to give lego as HTTPREQ_ENDPOINT.
  std::string Endpoint() const;
  // Runs before a record is set; a test may kill the authority there.
  void OnPresent(std::function<void()> action) { on_present_ = std::move(action); }

 private:
  httplib::Server server_;
  int port_ = 0;
  std::thread thread_;
  std::function<void()> on_present_;
};

#endif  // ORVA_TESTS_ACME_ACME_SERVERS_H_
