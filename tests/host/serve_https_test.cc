// HTTPS through nginx while the door is under attack: what a TLS handshake
// presents after an import and after restart-asking answers, while token
// holders keep calling over HTTP and HTTPS and sixteen hostile clients
// hold connections open.

#include <unistd.h>
#include <valgrind/valgrind.h>

#include <atomic>
#include <chrono>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

#include "tests/host/serve_process.h"
#include "tests/support/certificates.h"

namespace {

constexpr char kServerKey[] = "/usr/orva/etc/ssl/ssl.key/server.key";
constexpr char kServerCrt[] = "/usr/orva/etc/ssl/ssl.crt/server.crt";
#ifdef __SANITIZE_ADDRESS__
constexpr long kMemoryBoundKib = 48 * 1024;  // the host carries the sanitizer's shadow memory
#else
constexpr long kMemoryBoundKib = 24 * 1024;
#endif

}  // namespace

TEST_F(ServeTest, HttpsTakesEachStorePairThatLoadsWhileHostileClientsHoldTheDoor) {
  using Clock = std::chrono::steady_clock;
  scratch_.WriteFile("/usr/orva/etc/orva.conf", "runHTTPS=\"yes\"\n");
  auto install_self_signed = [&](const std::string& commonName, int bits) {
    unlink(scratch_.Path("/usr/orva/etc/ssl/ssl.intercrt/server-ca.crt").c_str());
    return MakeSelfSignedCa(scratch_.Path(kServerKey), scratch_.Path(kServerCrt),
                            "/CN=" + commonName, bits);
  };
  ASSERT_TRUE(install_self_signed("factory.local", 2048));
  const std::string work = scratch_.Path("/outside/");
  ASSERT_TRUE(MakeSelfSignedCa(work + "root.key", work + "root.crt", "/CN=Root"));
  ASSERT_TRUE(MakeSignedCertificate(work + "root.key", work + "root.crt", work + "inter.key",
                                    work + "inter.crt", "/CN=Intermediate"));
  ASSERT_TRUE(MakeSignedCertificate(work + "inter.key", work + "inter.crt", work + "server.key",
                                    work + "server.crt", "/CN=imported.example"));
  ServeProcess server(scratch_.root());
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
  // Token holders list over HTTP and HTTPS, each call on a new connection.
  std::atomic<bool> watching{true};
  std::atomic<int> answered{0}, failed{0};
  std::atomic<long> slowest_ms{0};
  auto watch = [&](bool https) {
    httplib::Client watcher = client(https);
    while (watching) {
      const auto asked = Clock::now();
      auto result = watcher.Get(kListQuery);
      ++(result && result->status == 200 ? answered : failed);
      const long ms = std::chrono::duration_cast<std::chrono::milliseconds>(
          Clock::now() - asked).count();
      if (ms > slowest_ms) slowest_ms = ms;
    }
  };
  std::thread watchers[] = {std::thread(watch, false), std::thread(watch, true)};

  // Four of each; the answer's status, 0 when nginx closes without one.
  std::string flood = "POST /webapi HTTP/1.1\r\nHost: d\r\n";
  for (int i = 0; i < 1000; ++i) flood += "X-Flood: " + std::string(8192, 'f') + "\r\n";
  const struct {
    const char* what;
    int port;
    std::string sent;
    int status;
  } kinds[] = {
      {"one header line, then nothing", server.http_port(), "GET / HTTP/1.1\r\nHost: d\r\n", 0},
      {"8 MB of 8 KB header lines", server.http_port(), flood, 400},
      {"no TLS handshake", port, "", 0},
      {"a 1 MiB body without a length", server.http_port(),
       "POST / HTTP/1.1\r\nHost: d\r\n\r\n" + std::string(1 << 20, 'b'), 405},
  };
  const auto attacked = Clock::now();
  std::vector<std::unique_ptr<RawConnection>> hostile;
  for (const auto& kind : kinds) {
    for (int i = 0; i < 4; ++i) {
      hostile.push_back(std::make_unique<RawConnection>(kind.port, kind.sent));
    }
  }
  const long memory_kib = server.MemoryKib();
  EXPECT_LT(memory_kib, kMemoryBoundKib) << "nginx and the host";

  auto restart = [&](bool https) {
    auto answer = client(https).Get("/webapi?api=ORVA.Test&method=restart");
    return answer ? answer->get_header_value("X-Web-Certificate") : "no answer";
  };
  auto imported = client(false).Post(
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

  for (size_t i = 0; i < hostile.size(); ++i) {
    SCOPED_TRACE(kinds[i / 4].what);
    EXPECT_EQ(kinds[i / 4].status, RawStatus(hostile[i]->Reply(15000)));
  }
  EXPECT_LT(Clock::now() - attacked, std::chrono::seconds(14)) << "silent ones cut after 10 s";
  watching = false;
  for (std::thread& watcher : watchers) watcher.join();
  EXPECT_EQ(0, failed) << "of " << answered << " calls while nginx reloaded";
  EXPECT_GT(answered, 10);
  // Under valgrind this process runs one thread at a time, slowly: the token
  // holders wait for the hostile clients' writes.
  EXPECT_LT(slowest_ms, RUNNING_ON_VALGRIND ? 10000 : 1000);
  std::printf("16 hostile clients: %ld KiB (nginx and the host); %d calls, slowest %ld ms\n",
              memory_kib, answered.load(), slowest_ms.load());
}
