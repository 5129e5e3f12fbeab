// The HTTPS listener of a real server: what a TLS handshake presents after
// an import over HTTP, after restart-asking answers, and when the store
// does not load.

#include <unistd.h>

#include <string>

#include <gtest/gtest.h>

#include "tests/host/serve_process.h"
#include "tests/support/certificates.h"

namespace {

constexpr char kServerKey[] = "/usr/orva/etc/ssl/ssl.key/server.key";
constexpr char kServerCrt[] = "/usr/orva/etc/ssl/ssl.crt/server.crt";

}  // namespace

TEST_F(ServeTest, HttpsPresentsTheStoreAsTheLastRestartAskingAnswerLeftIt) {
  scratch_.WriteFile("/usr/orva/etc/orva.conf", "runHTTPS=\"yes\"\n");
  auto install_self_signed = [&](const std::string& commonName) {
    unlink(scratch_.Path("/usr/orva/etc/ssl/ssl.intercrt/server-ca.crt").c_str());
    return MakeSelfSignedCa(scratch_.Path(kServerKey), scratch_.Path(kServerCrt),
                            "/CN=" + commonName);
  };
  ASSERT_TRUE(install_self_signed("factory.local"));
  const std::string work = scratch_.Path("/outside/");
  ASSERT_TRUE(MakeSelfSignedCa(work + "root.key", work + "root.crt", "/CN=Outside Root"));
  ASSERT_TRUE(MakeSignedCertificate(work + "root.key", work + "root.crt", work + "inter.key",
                                    work + "inter.crt", "/CN=Outside Intermediate"));
  ASSERT_TRUE(MakeSignedCertificate(work + "inter.key", work + "inter.crt", work + "srv.key",
                                    work + "srv.crt", "/CN=imported.example"));
  ServeProcess server(scratch_.root());
  ASSERT_TRUE(server.started()) << server.Log();
  const int port = server.https_port();
  ASSERT_GT(port, 0) << server.Output() << server.Log();
  EXPECT_EQ("CN = factory.local\n", PresentedSubjects(port));
  auto presents = [port](const std::string& subjects) {
    return WaitFor([&] { return PresentedSubjects(port) == subjects; });
  };
  auto restart = [&] {
    return server.AuthorizedClient().Get("/webapi?api=ORVA.Test&method=restart");
  };

  auto imported = server.AuthorizedClient().Post(
      "/webapi", ImportForm(ReadFile(work + "srv.crt"), ReadFile(work + "srv.key"),
                            ReadFile(work + "inter.crt")));
  ASSERT_TRUE(imported);
  ASSERT_TRUE(ParseJson(imported->body)["success"].asBool()) << imported->body;
  EXPECT_TRUE(presents("CN = imported.example\nCN = Outside Intermediate\n"))
      << PresentedSubjects(port);

  ASSERT_TRUE(install_self_signed("second.test"));
  EXPECT_EQ("CN = imported.example\nCN = Outside Intermediate\n", PresentedSubjects(port))
      << "nothing changes before a restart-asking answer";
  httplib::SSLClient over_https("127.0.0.1", port);
  over_https.enable_server_certificate_verification(false);
  over_https.set_bearer_token_auth(server.Token());
  auto answer = over_https.Get("/webapi?api=ORVA.Test&method=restart");
  ASSERT_TRUE(answer) << "the answer goes out before the listener reloads";
  EXPECT_EQ(200, answer->status);
  EXPECT_TRUE(presents("CN = second.test\n")) << PresentedSubjects(port);

  ASSERT_TRUE(MakeSelfSignedCa(work + "other.key", work + "other.crt", "/CN=other"));
  scratch_.WriteFile(kServerKey, ReadFile(work + "other.key"));
  ASSERT_TRUE(restart());
  EXPECT_TRUE(presents("")) << "down";
  EXPECT_NE(std::string::npos,
            server.Log().find("HTTPS listener is down: /usr/orva/etc/ssl/ssl.key/server.key "
                              "does not belong to /usr/orva/etc/ssl/ssl.crt/server.crt"));
  auto listed = server.AuthorizedClient().Get(kListQuery);
  ASSERT_TRUE(listed);
  EXPECT_EQ(200, listed->status) << "HTTP stays up";

  ASSERT_TRUE(install_self_signed("mended.test"));
  ASSERT_TRUE(restart());
  EXPECT_TRUE(presents("CN = mended.test\n")) << "up again on the same port";
}
