#include "tests/acme/acme_servers.h"

#include <arpa/inet.h>
#include <signal.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <fstream>

#include <json/json.h>

#include "tests/host/serve_process.h"
#include "tests/support/certificates.h"
#include "tests/support/test_support.h"

namespace {

int FreePort() {
  const int fd = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
  sockaddr_in address{};
  address.sin_family = AF_INET;
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  socklen_t size = sizeof(address);
  int port = 0;
  if (bind(fd, reinterpret_cast<sockaddr*>(&address), sizeof(address)) == 0 &&
      getsockname(fd, reinterpret_cast<sockaddr*>(&address), &size) == 0) {
    port = ntohs(address.sin_port);
  }
  close(fd);
  return port;
}

void Kill(pid_t* pid) {
  if (*pid <= 0) return;
  kill(*pid, SIGKILL);
  waitpid(*pid, nullptr, 0);
  *pid = -1;
}

}  // namespace

AcmeServers::AcmeServers(const std::string& folder)
    : folder_(folder),
      tls_certificate_(folder + "/pebble.crt"),
      acme_port_(FreePort()),
      management_port_(FreePort()),
      dns_port_(FreePort()),
      dns_management_port_(FreePort()) {
  MakeDirs(folder_);
  RunForTest("openssl req -x509 -newkey ec -pkeyopt ec_paramgen_curve:P-256 -nodes -days 2"
             " -subj /CN=pebble -addext subjectAltName=IP:127.0.0.1,DNS:localhost -keyout '" +
             folder_ + "/pebble.key' -out '" + tls_certificate_ + "'");
}

AcmeServers::~AcmeServers() {
  Kill(&pebble_);
  Kill(&dns_);
}

bool AcmeServers::Start(int httpPort) {
  const std::string local = "127.0.0.1:";
  const std::string dns = local + std::to_string(dns_port_);
  const std::string dns_log = folder_ + "/challtestsrv.log";
  dns_ = StartProcess({"/usr/bin/pebble-challtestsrv", "-management",
                       local + std::to_string(dns_management_port_), "-dns01", dns,
                       "-defaultIPv4", "127.0.0.1", "-defaultIPv6", "", "-http01", "",
                       "-https01", "", "-tlsalpn01", ""}, dns_log, dns_log);
  Json::Value config;
  config["pebble"]["listenAddress"] = local + std::to_string(acme_port_);
  config["pebble"]["managementListenAddress"] = local + std::to_string(management_port_);
  config["pebble"]["certificate"] = tls_certificate_;
  config["pebble"]["privateKey"] = folder_ + "/pebble.key";
  config["pebble"]["httpPort"] = httpPort;
  config["pebble"]["tlsPort"] = FreePort();
  config["pebble"]["ocspResponderURL"] = "";
  config["pebble"]["externalAccountBindingRequired"] = false;
  std::ofstream(folder_ + "/pebble.json") << config;
  const std::string log = folder_ + "/pebble.log";
  pebble_ = StartProcess({"/usr/bin/env", "PEBBLE_VA_NOSLEEP=1", "/usr/bin/pebble", "-config",
                          folder_ + "/pebble.json", "-dnsserver", dns},
                         log, log);
  // pebble makes its CA keys first: slow on a loaded machine.
  return WaitFor([this] {
    return !Fetch(acme_port_, "/dir").empty() && !Root().empty() &&
           TellDns("/clear-txt", R"({"host":"ready.test."})");
  }, 60);
}

std::string AcmeServers::Logs() const {
  return ReadFile(folder_ + "/pebble.log") + ReadFile(folder_ + "/challtestsrv.log");
}

void AcmeServers::KillPebble() { Kill(&pebble_); }

std::string AcmeServers::Directory() const {
  return "https://127.0.0.1:" + std::to_string(acme_port_) + "/dir";
}

std::string AcmeServers::Resolver() const { return "127.0.0.1:" + std::to_string(dns_port_); }

std::string AcmeServers::Fetch(int port, const std::string& path) const {
  // By name: the library's check of an IP address name reads memory it
  // never set (valgrind reports it).
  httplib::SSLClient client("localhost", port);
  client.set_address_family(AF_INET);
  client.set_ca_cert_path(tls_certificate_.c_str());
  auto result = client.Get(path.c_str());
  return result && result->status == 200 ? result->body : "";
}

bool AcmeServers::TellDns(const std::string& path, const std::string& body) const {
  httplib::Client client("127.0.0.1", dns_management_port_);
  auto result = client.Post(path.c_str(), body, "application/json");
  return result && result->status == 200;
}

DnsProviderAdapter::DnsProviderAdapter(const AcmeServers& servers) {
  auto forward = [this, &servers](const std::string& dnsPath, bool present) {
    return [this, &servers, dnsPath, present](const httplib::Request& request,
                                              httplib::Response& response) {
      const Json::Value asked = ParseJson(request.body);
      if (present && on_present_) on_present_();
      Json::Value record;
      record["host"] = asked["fqdn"];
      if (present) record["value"] = asked["value"];
      response.status = servers.TellDns(dnsPath, record.toStyledString()) ? 200 : 500;
    };
  };
  server_.Post("/present", forward("/set-txt", true));
  server_.Post("/cleanup", forward("/clear-txt", false));
  port_ = server_.bind_to_any_port("127.0.0.1");
  thread_ = std::thread([this] { server_.listen_after_bind(); });
  WaitFor([this] { return server_.is_running(); });
}

DnsProviderAdapter::~DnsProviderAdapter() {
  server_.stop();
  thread_.join();
}

std::string DnsProviderAdapter::Endpoint() const {
  return "http://127.0.0.1:" + std::to_string(port_);
}
