// End-to-end tests of the HTTPS listener: what a TLS handshake presents
// before and after restart-asking calls, and a store that does not load.
// The certificate life test shows the chain that goes with a certificate.

#include <unistd.h>

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

constexpr char kServerKey[] = "/usr/orva/etc/ssl/ssl.key/server.key";
constexpr char kServerCrt[] = "/usr/orva/etc/ssl/ssl.crt/server.crt";
constexpr char kInterCrt[] = "/usr/orva/etc/ssl/ssl.intercrt/server-ca.crt";
constexpr char kListQuery[] = "/webapi?api=ORVA.Core.Certificate&method=list";
const httplib::Params kRestart = {{"api", "ORVA.Test"}, {"method", "restart"}};

// Calls "list" over HTTP every few milliseconds until Finish(), counting
// the calls that got an answer and those that did not.
struct HttpWatch {
  explicit HttpWatch(const ServeProcess& server)
      : thread([this, &server] {
          while (!stop) {
            auto result = server.AuthorizedClient().Get(kListQuery);
            (result && result->status == 200 ? answered : failed)++;
            std::this_thread::sleep_for(std::chrono::milliseconds(5));
          }
        }) {}
  ~HttpWatch() { Finish(); }
  void Finish() {
    stop = true;
    if (thread.joinable()) thread.join();
  }

  std::atomic<bool> stop{false};
  std::atomic<int> answered{0};
  std::atomic<int> failed{0};
  std::thread thread;  // last: starts once the counters exist
};

class ServeHttpsTest : public testing::Test {
 protected:
  void SetUp() override {
    std::string error;
    ASSERT_TRUE(InitDeviceRoot(scratch_.root(), &error)) << error;
    scratch_.WriteFile("/usr/orva/etc/orva.conf", "runHTTPS=\"yes\"\nrunWebHTTPS=\"no\"\n");
  }

  // Replaces the store's set with a self-signed certificate and no
  // intermediate.
  void InstallSelfSignedCertificate(const std::string& commonName) {
    for (const char* file : {kInterCrt, kServerKey, kServerCrt}) {
      unlink(scratch_.Path(file).c_str());
    }
    ASSERT_TRUE(MakeSelfSignedCa(scratch_.Path(kServerKey), scratch_.Path(kServerCrt),
                                 "/CN=" + commonName));
  }

  TempDeviceRoot scratch_;
};

}  // namespace

TEST_F(ServeHttpsTest, PresentsTheStoreCertificateAndReloadsItOnRestartCalls) {
  InstallSelfSignedCertificate("first.test");
  const int port = FreeLoopbackPort();
  ServeProcess server(scratch_.root(), {"--listen-https", "127.0.0.1:" + std::to_string(port)});
  ASSERT_TRUE(server.started()) << server.Log();
  ASSERT_EQ(port, server.https_port()) << server.Output() << server.Log();
  EXPECT_EQ("first.test", ProbeTls(port).common_name);

  HttpWatch watch(server);
  InstallSelfSignedCertificate("second.test");
  EXPECT_EQ("first.test", ProbeTls(port).common_name) << "nothing changes before the call";
  httplib::SSLClient over_https("127.0.0.1", port);
  over_https.enable_server_certificate_verification(false);
  over_https.set_bearer_token_auth(server.Token());
  auto restart = over_https.Post("/webapi", kRestart);
  ASSERT_TRUE(restart) << "the answer goes out before the listener restarts";
  EXPECT_EQ(200, restart->status);
  EXPECT_TRUE(ParseJson(restart->body)["data"]["restart_httpd"].asBool()) << restart->body;
  PresentedCertificates second = ProbeTlsUntil(
      port, [](const PresentedCertificates& seen) { return seen.common_name == "second.test"; });
  EXPECT_EQ("second.test", second.common_name);

  scratch_.WriteFile(kServerCrt, "broken\n");
  ASSERT_TRUE(server.AuthorizedClient().Post("/webapi", kRestart));
  EXPECT_FALSE(ProbeTlsUntil(port, [](const PresentedCertificates& seen) {
                 return !seen.connected;
               }).connected);
  EXPECT_NE(std::string::npos,
            server.Log().find("HTTPS listener is down: /usr/orva/etc/ssl/ssl.crt/server.crt"));

  InstallSelfSignedCertificate("mended.test");
  ASSERT_TRUE(server.AuthorizedClient().Post("/webapi", kRestart));
  EXPECT_EQ("mended.test", ProbeTlsUntil(port, [](const PresentedCertificates& seen) {
                             return seen.connected;
                           }).common_name)
      << "up again on the same address";
  watch.Finish();
  EXPECT_GT(watch.answered, 0);
  EXPECT_EQ(0, watch.failed) << "the HTTP listener never went down";
}

TEST_F(ServeHttpsTest, ReloadReadsTheStoreOnlyAfterTheChangesQueuedBeforeIt) {
  InstallSelfSignedCertificate("first.test");
  const int port = FreeLoopbackPort();
  ServeProcess server(scratch_.root(), {"--listen-https", "127.0.0.1:" + std::to_string(port)});
  ASSERT_TRUE(server.started()) << server.Log();
  auto hold = [&](const std::string& name, const std::string& extra) {
    return std::thread([&server, this, name, extra] {
      server.AuthorizedClient().Get(("/webapi?api=ORVA.Test&method=hold&entered=" +
                                     scratch_.Path("/" + name + ".in") + "&release=" +
                                     scratch_.Path("/" + name + ".go") + extra)
                                        .c_str());
    });
  };
  auto wait_for = [&](const std::string& name) {
    auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(10);
    while (!FileExists(scratch_.Path(name)) && std::chrono::steady_clock::now() < deadline) {
      std::this_thread::sleep_for(std::chrono::milliseconds(5));
    }
    return FileExists(scratch_.Path(name));
  };

  std::thread asking = hold("asking", "&restart=yes");
  ASSERT_TRUE(wait_for("/asking.in"));
  std::thread changing = hold("changing", "");
  std::this_thread::sleep_for(std::chrono::seconds(1));  // queued behind "asking"
  scratch_.WriteFile(kServerCrt, "half written\n");
  scratch_.WriteFile("/asking.go", "");
  ASSERT_TRUE(wait_for("/changing.in"));
  InstallSelfSignedCertificate("second.test");
  scratch_.WriteFile("/changing.go", "");
  asking.join();
  changing.join();

  EXPECT_EQ("second.test", ProbeTlsUntil(port, [](const PresentedCertificates& seen) {
                             return seen.common_name == "second.test";
                           }).common_name);
  EXPECT_EQ(std::string::npos, server.Log().find("HTTPS listener is down"))
      << "the reload never saw the store in the middle of a change";
}

TEST_F(ServeHttpsTest, StoreThatDoesNotLoadLeavesHttpsDownAndHttpUp) {
  const std::string work = scratch_.Path("/work");
  ASSERT_TRUE(MakeSelfSignedCa(work + "/other.key", work + "/other.crt", "/CN=other"));
  const struct {
    const char* file;
    std::string content;
    const char* logged;
  } cases[] = {
      {kServerCrt, "not a certificate\n", "/usr/orva/etc/ssl/ssl.crt/server.crt does not load"},
      {kServerKey, "", "/usr/orva/etc/ssl/ssl.key/server.key does not load"},
      {kServerKey, ReadFile(work + "/other.key"),
       "/usr/orva/etc/ssl/ssl.key/server.key does not belong to "
       "/usr/orva/etc/ssl/ssl.crt/server.crt"},
      {kInterCrt, "-----BEGIN CERTIFICATE-----\nnope\n",
       "/usr/orva/etc/ssl/ssl.intercrt/server-ca.crt holds no certificate that loads"},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.logged);
    InstallSelfSignedCertificate("good.test");
    scratch_.WriteFile(c.file, c.content, 0600);
    const int port = FreeLoopbackPort();
    ServeProcess server(scratch_.root(),
                        {"--listen-https", "127.0.0.1:" + std::to_string(port)});
    ASSERT_TRUE(server.started()) << server.Log();
    EXPECT_EQ(0, server.https_port());
    EXPECT_NE(std::string::npos, server.Output().find("https: down (see the log)"));
    EXPECT_NE(std::string::npos,
              server.Log().find(std::string("HTTPS listener is down: ") + c.logged))
        << server.Log();
    EXPECT_FALSE(ProbeTls(port).connected);
    auto listed = server.AuthorizedClient().Get(kListQuery);
    ASSERT_TRUE(listed);
    EXPECT_EQ(200, listed->status) << "HTTP is up";
  }
}
