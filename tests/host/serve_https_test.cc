// End-to-end tests of the HTTPS listener: what a TLS handshake presents
// before and after a restart-asking call, and a store that does not load.

#include <atomic>
#include <chrono>
#include <string>
#include <thread>

#include <gtest/gtest.h>

#include "host/device_root_init.h"
#include "tests/host/serve_process.h"
#include "tests/host/tls_probe.h"
#include "tests/support/certificates.h"
#include "tests/support/test_support.h"

namespace {

constexpr char kSsl[] = "/usr/orva/etc/ssl";
constexpr char kServerKey[] = "/usr/orva/etc/ssl/ssl.key/server.key";
constexpr char kServerCrt[] = "/usr/orva/etc/ssl/ssl.crt/server.crt";
constexpr char kInterCrt[] = "/usr/orva/etc/ssl/ssl.intercrt/server-ca.crt";
constexpr char kListQuery[] = "/webapi?api=ORVA.Core.Certificate&method=list";

// Polls handshakes for up to 10 s until `done` holds for one; returns the
// last one seen.
template <typename Done>
PresentedCertificates ProbeUntil(int port, Done done) {
  auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(10);
  PresentedCertificates presented = ProbeTls(port);
  while (!done(presented) && std::chrono::steady_clock::now() < deadline) {
    std::this_thread::sleep_for(std::chrono::milliseconds(20));
    presented = ProbeTls(port);
  }
  return presented;
}

// Calls "list" over HTTP every few milliseconds until stopped, counting
// the calls that did not get an answer.
class HttpWatch {
 public:
  explicit HttpWatch(const ServeProcess& server)
      : thread_([this, &server] {
          while (!stop_) {
            auto result = server.AuthorizedClient().Get(kListQuery);
            (result && result->status == 200 ? answered_ : failed_)++;
            std::this_thread::sleep_for(std::chrono::milliseconds(5));
          }
        }) {}
  ~HttpWatch() { Finish(); }
  void Finish() {
    stop_ = true;
    if (thread_.joinable()) thread_.join();
  }
  int answered() const { return answered_; }
  int failed() const { return failed_; }

 private:
  std::atomic<bool> stop_{false};
  std::atomic<int> answered_{0};
  std::atomic<int> failed_{0};
  std::thread thread_;
};

class ServeHttpsTest : public testing::Test {
 protected:
  void SetUp() override {
    std::string error;
    ASSERT_TRUE(InitDeviceRoot(scratch_.root(), &error)) << error;
    scratch_.WriteFile("/usr/orva/etc/orva.conf", "runHTTPS=\"yes\"\nrunWebHTTPS=\"no\"\n");
  }

  // A server certificate for `commonName` issued by an intermediate CA,
  // which goes into the intermediate file.
  void InstallChainedCertificate(const std::string& commonName) {
    const std::string work = scratch_.Path("/work");
    ASSERT_TRUE(MakeSelfSignedCa(work + "/root.key", work + "/root.crt", "/CN=Test Root"));
    ASSERT_TRUE(MakeSignedCertificate(work + "/root.key", work + "/root.crt",
                                      work + "/inter.key", scratch_.Path(kInterCrt),
                                      "/CN=Test Intermediate"));
    ASSERT_TRUE(MakeSignedCertificate(work + "/inter.key", scratch_.Path(kInterCrt),
                                      scratch_.Path(kServerKey), scratch_.Path(kServerCrt),
                                      "/CN=" + commonName));
  }

  void InstallSelfSignedCertificate(const std::string& commonName) {
    ASSERT_TRUE(MakeSelfSignedCa(scratch_.Path(kServerKey), scratch_.Path(kServerCrt),
                                 "/CN=" + commonName));
  }

  httplib::Result CallRestart(const ServeProcess& server, int httpsPort) {
    httplib::SSLClient client("127.0.0.1", httpsPort);
    client.enable_server_certificate_verification(false);
    client.set_bearer_token_auth(server.Token());
    return client.Post("/webapi", httplib::Params{{"api", "ORVA.Test"}, {"method", "restart"}});
  }

  TempDeviceRoot scratch_;
};

}  // namespace

TEST_F(ServeHttpsTest, PresentsTheStoreCertificateAndTheNewOneAfterARestartCall) {
  InstallChainedCertificate("first.test");
  ServeProcess server(scratch_.root());
  ASSERT_TRUE(server.started()) << server.Log();
  const int port = server.https_port();
  ASSERT_GT(port, 0) << server.Output() << server.Log();

  PresentedCertificates first = ProbeTls(port);
  ASSERT_TRUE(first.connected);
  EXPECT_EQ("first.test", first.common_name);
  EXPECT_EQ(2, first.chain_length) << "the intermediate goes with it";
  EXPECT_EQ("Test Intermediate", first.chain_top_name);

  HttpWatch watch(server);
  unlink(scratch_.Path(kInterCrt).c_str());
  unlink(scratch_.Path(kServerKey).c_str());
  unlink(scratch_.Path(kServerCrt).c_str());
  InstallSelfSignedCertificate("second.test");
  EXPECT_EQ("first.test", ProbeTls(port).common_name) << "nothing changes before the call";

  auto restart = CallRestart(server, port);
  ASSERT_TRUE(restart);
  EXPECT_EQ(200, restart->status);
  EXPECT_TRUE(ParseJson(restart->body)["data"]["restart_httpd"].asBool()) << restart->body;

  PresentedCertificates second = ProbeUntil(
      port, [](const PresentedCertificates& seen) { return seen.common_name == "second.test"; });
  EXPECT_EQ("second.test", second.common_name);
  EXPECT_EQ(1, second.chain_length);
  std::this_thread::sleep_for(std::chrono::milliseconds(100));
  watch.Finish();
  EXPECT_GT(watch.answered(), 0);
  EXPECT_EQ(0, watch.failed()) << "the HTTP listener never went down";
}

TEST_F(ServeHttpsTest, StoreThatDoesNotLoadLeavesHttpsDownAndHttpUp) {
  const std::string work = scratch_.Path("/work");
  struct Case {
    const char* what;
    const char* logged;
    void (*breakStore)(const TempDeviceRoot&, const std::string&);
  } cases[] = {
      {"certificate is not PEM", "/usr/orva/etc/ssl/ssl.crt/server.crt does not load",
       [](const TempDeviceRoot& root, const std::string&) {
         root.WriteFile(kServerCrt, "not a certificate\n");
       }},
      {"no key", "/usr/orva/etc/ssl/ssl.key/server.key does not load",
       [](const TempDeviceRoot& root, const std::string&) {
         unlink(root.Path(kServerKey).c_str());
       }},
      {"key of another pair",
       "/usr/orva/etc/ssl/ssl.key/server.key does not belong to "
       "/usr/orva/etc/ssl/ssl.crt/server.crt",
       [](const TempDeviceRoot& root, const std::string& workFolder) {
         ASSERT_TRUE(MakeSelfSignedCa(workFolder + "/other.key", workFolder + "/other.crt",
                                      "/CN=other"));
         root.WriteFile(kServerKey, ReadFile(workFolder + "/other.key"), 0600);
       }},
      {"intermediate without a certificate",
       "/usr/orva/etc/ssl/ssl.intercrt/server-ca.crt holds no certificate that loads",
       [](const TempDeviceRoot& root, const std::string&) {
         root.WriteFile(kInterCrt, "-----BEGIN CERTIFICATE-----\nnope\n");
       }},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.what);
    unlink(scratch_.Path(kInterCrt).c_str());
    unlink(scratch_.Path(kServerKey).c_str());
    unlink(scratch_.Path(kServerCrt).c_str());
    InstallSelfSignedCertificate("good.test");
    c.breakStore(scratch_, work);
    const int port = FreeLoopbackPort();
    ServeProcess server(scratch_.root(),
                        {"--listen-https", "127.0.0.1:" + std::to_string(port)});
    ASSERT_TRUE(server.started()) << server.Log();
    EXPECT_EQ(0, server.https_port());
    EXPECT_NE(std::string::npos, server.Output().find("https: down (see the log)"));
    EXPECT_NE(std::string::npos, server.Log().find(std::string("HTTPS listener is down: ") +
                                                   c.logged))
        << server.Log();
    EXPECT_FALSE(ProbeTls(port).connected);
    auto listed = server.AuthorizedClient().Get(kListQuery);
    ASSERT_TRUE(listed);
    EXPECT_EQ(200, listed->status) << "HTTP is up";
  }
}

TEST_F(ServeHttpsTest, RestartCallTakesHttpsDownAndUpWithTheStore) {
  InstallSelfSignedCertificate("good.test");
  const int port = FreeLoopbackPort();
  ServeProcess server(scratch_.root(), {"--listen-https", "127.0.0.1:" + std::to_string(port)});
  ASSERT_TRUE(server.started()) << server.Log();
  ASSERT_EQ(port, server.https_port());
  HttpWatch watch(server);

  scratch_.WriteFile(kServerCrt, "broken\n");
  auto restart = CallRestart(server, port);
  ASSERT_TRUE(restart);
  EXPECT_EQ(200, restart->status);
  EXPECT_FALSE(ProbeUntil(port, [](const PresentedCertificates& seen) {
                 return !seen.connected;
               }).connected);
  EXPECT_NE(std::string::npos,
            server.Log().find("HTTPS listener is down: /usr/orva/etc/ssl/ssl.crt/server.crt"));

  unlink(scratch_.Path(kServerKey).c_str());
  unlink(scratch_.Path(kServerCrt).c_str());
  InstallSelfSignedCertificate("mended.test");
  auto over_http = server.AuthorizedClient().Post(
      "/webapi", httplib::Params{{"api", "ORVA.Test"}, {"method", "restart"}});
  ASSERT_TRUE(over_http);
  EXPECT_EQ(200, over_http->status);
  EXPECT_EQ("mended.test", ProbeUntil(port, [](const PresentedCertificates& seen) {
                             return seen.connected;
                           }).common_name)
      << "up again on the same address";
  watch.Finish();
  EXPECT_EQ(0, watch.failed());
}

TEST_F(ServeHttpsTest, HttpsStaysOffUnlessTheConfigurationAsks) {
  InstallSelfSignedCertificate("good.test");
  scratch_.WriteFile("/usr/orva/etc/orva.conf", "runHTTPS=\"no\"\n");
  const int port = FreeLoopbackPort();
  ServeProcess server(scratch_.root(), {"--listen-https", "127.0.0.1:" + std::to_string(port)});
  ASSERT_TRUE(server.started()) << server.Log();
  EXPECT_NE(std::string::npos, server.Output().find("https: off"));
  EXPECT_FALSE(ProbeTls(port).connected);
  EXPECT_EQ(std::string::npos, server.Log().find("HTTPS listener")) << "off is not a failure";
}
