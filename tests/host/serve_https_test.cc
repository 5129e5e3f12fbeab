// HTTPS through nginx: what a TLS handshake presents after an import over
// HTTP and after restart-asking answers, while clients keep calling over
// HTTP and HTTPS, and when the store's pair does not load.

#include <unistd.h>

#include <atomic>
#include <string>
#include <thread>

#include <gtest/gtest.h>

#include "tests/host/serve_process.h"
#include "tests/support/certificates.h"

namespace {

constexpr char kServerKey[] = "/usr/orva/etc/ssl/ssl.key/server.key";
constexpr char kServerCrt[] = "/usr/orva/etc/ssl/ssl.crt/server.crt";

}  // namespace

TEST_F(ServeTest, HttpsTakesEachStorePairThatLoadsGracefullyAndKeepsTheLastOneOtherwise) {
  scratch_.WriteFile("/usr/orva/etc/orva.conf", "runHTTPS=\"yes\"\n");
  auto install_self_signed = [&](const std::string& commonName, int bits) {
    unlink(scratch_.Path("/usr/orva/etc/ssl/ssl.intercrt/server-ca.crt").c_str());
    return MakeSelfSignedCa(scratch_.Path(kServerKey), scratch_.Path(kServerCrt),
                            "/CN=" + commonName, bits);
  };
  ASSERT_TRUE(install_self_signed("factory.local", 2048));
  const std::string work = scratch_.Path("/outside/");
  ASSERT_TRUE(MakeChain(work, "/CN=imported.example", 2048));
  ServeProcess server(scratch_.root());
  ASSERT_TRUE(server.started()) << server.Log();
  const int port = server.https_port();
  ASSERT_GT(port, 0) << server.Output() << server.Log();
  EXPECT_EQ("CN = factory.local\n", PresentedSubjects(port, "-tls1_2"));
  EXPECT_EQ("", PresentedSubjects(port, "-tls1_2 -cipher AES128-GCM-SHA256"))
      << "TLS 1.2 only with forward secrecy";
  EXPECT_EQ("", PresentedSubjects(port, "-tls1_1"));
  auto presents = [port](const std::string& subjects) {
    return WaitFor([&] { return PresentedSubjects(port) == subjects; });
  };
  auto client = [&](bool https) {
    httplib::Client client(https ? "https://127.0.0.1:" + std::to_string(port)
                                 : "http://127.0.0.1:" + std::to_string(server.http_port()));
    client.enable_server_certificate_verification(false);
    client.set_bearer_token_auth(server.Token());
    return client;
  };
  // Watchers call over HTTP and HTTPS, each call on a new connection.
  std::atomic<bool> watching{true};
  std::atomic<int> answered{0}, failed{0};
  auto watch = [&](bool https) {
    while (watching) {
      auto result = client(https).Get(kListQuery);
      ++(result && result->status == 200 ? answered : failed);
    }
  };
  std::thread watchers[] = {std::thread(watch, false), std::thread(watch, true)};
  auto restart = [&](bool https) {
    auto answer = client(https).Get("/webapi?api=ORVA.Test&method=restart");
    return answer ? answer->get_header_value("X-Web-Certificate") : "no answer";
  };

  auto imported = server.AuthorizedClient().Post(
      "/webapi", ImportForm(ReadFile(work + "server.crt"), ReadFile(work + "server.key"),
                            ReadFile(work + "inter.crt")));
  ASSERT_TRUE(imported);
  EXPECT_EQ("new", imported->get_header_value("X-Web-Certificate")) << imported->body;
  EXPECT_TRUE(presents("CN = imported.example\nCN = Intermediate\n")) << PresentedSubjects(port);

  ASSERT_TRUE(install_self_signed("second.test", 2048));
  EXPECT_EQ("CN = imported.example\nCN = Intermediate\n", PresentedSubjects(port))
      << "nothing changes before a restart-asking answer";
  EXPECT_EQ("new", restart(true));
  EXPECT_TRUE(presents("CN = second.test\n")) << PresentedSubjects(port);

  ASSERT_TRUE(install_self_signed("too-small.test", 1024));
  EXPECT_EQ("previous", restart(false)) << "nginx refuses keys under 2048 bits";
  EXPECT_EQ("CN = second.test\n", PresentedSubjects(port));
  EXPECT_NE(std::string::npos,
            server.Log().find("HTTPS keeps the previous certificate: nginx does not load the "
                              "store's server certificate and key"));
  watching = false;
  for (std::thread& watcher : watchers) watcher.join();
  EXPECT_EQ(0, failed) << "of " << answered << " calls while nginx reloaded";
  EXPECT_GT(answered, 10);
}
