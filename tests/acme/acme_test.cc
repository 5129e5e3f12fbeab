// ACME end to end: lego through the real host against pebble on loopback,
// pebble validating http-01 through the host's own HTTP listener and dns-01
// through lego's httpreq provider and the fake DNS.

#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <functional>
#include <memory>
#include <string>

#include <gtest/gtest.h>

#include "api/certificate.h"
#include "tests/acme/acme_servers.h"
#include "tests/host/serve_process.h"
#include "tests/support/certificates.h"
#include "tests/support/method_calls.h"
#include "tests/support/store_state.h"

namespace {

constexpr char kServerCrt[] = "/usr/orva/etc/ssl/ssl.crt/server.crt";
constexpr char kServerKey[] = "/usr/orva/etc/ssl/ssl.key/server.key";
constexpr char kChallengeDir[] = "/usr/orva/etc/ssl/acme-webroot/.well-known/acme-challenge";

// The store without the ACME folder, whose status changes with every attempt.
StoreState CertificateStore(const TempDeviceRoot& root) {
  StoreState state = ReadStore(root);
  state.erase(state.lower_bound("acme/"), state.lower_bound("acme0"));  // '0' follows '/'
  return state;
}

// True when a new TLS handshake with 127.0.0.1:PORT presents the leaf
// certificate of the PEM file `path`.
bool Presents(int port, const std::string& path) {
  return RunForTest("{ openssl s_client -connect 127.0.0.1:" + std::to_string(port) +
                    " 2>/dev/null | openssl x509 | cmp -s - '" + path + "'; }");
}

class AcmeTest : public ServeTest {
 protected:
  void SetUp() override {
    ServeTest::SetUp();
    servers_ = std::make_unique<AcmeServers>(scratch_.Path("/pebble"));
    // The server and its lego inherit it.
    setenv("LEGO_CA_CERTIFICATES", servers_->TlsCertificateFile().c_str(), 1);
    scratch_.WriteFile("/usr/orva/etc/orva.conf", "runHTTPS=\"yes\"\n");
    // A local CA and its server pair, so HTTPS is up before the first order.
    ASSERT_EQ(ORVA::APIResponse::Outcome::kSuccess,
              CallMethod(handleCRTAction,
                         Params(scratch_, R"({"key_type":"ec","ca_key_type":"ec"})"))
                  .response.outcome());
    serve_ = std::make_unique<ServeProcess>(scratch_.root());
    ASSERT_GT(serve_->https_port(), 0) << serve_->Log();
    ASSERT_TRUE(servers_->Start(serve_->http_port())) << servers_->Logs();
  }
  void TearDown() override { unsetenv("LEGO_CA_CERTIFICATES"); }

  Json::Value Call(const std::string& method, httplib::Params params = {}) {
    params.emplace("api", "ORVA.Core.Certificate.ACME");
    params.emplace("method", method);
    httplib::Client client = serve_->AuthorizedClient();
    client.set_read_timeout(330);
    auto result = client.Post("/webapi", params);
    return result ? ParseJson(result->body) : Json::Value();
  }

  // The settings of an http-01 order of `domains` (a JSON array text) from
  // `directory` (pebble's when empty), with the settings `more`.
  httplib::Params Settings(const std::string& domains, httplib::Params more = {},
                           const std::string& directory = "") {
    more.insert({{"domains", domains}, {"email", "admin@example.test"}, {"agree_tos", "yes"},
                 {"directory", directory.empty() ? servers_->Directory() : directory}});
    return more;
  }

  // The settings of a dns-01 order through `adapter`, the credentials'
  // password `password`.
  httplib::Params DnsSettings(const std::string& domains, const DnsProviderAdapter& adapter,
                              const std::string& password) {
    return Settings(domains, {{"challenge", "dns-01"},
                              {"dns_provider", "httpreq"},
                              {"dns_credentials", R"({"HTTPREQ_ENDPOINT":")" + adapter.Endpoint() +
                                                      R"(","HTTPREQ_USERNAME":"device",)"
                                                      R"("HTTPREQ_PASSWORD":")" + password + "\"}"},
                              {"dns_resolvers", "[\"" + servers_->Resolver() + "\"]"},
                              // The fake DNS answers no SOA query, by which lego
                              // finds the zone's servers.
                              {"dns_propagation_check", "no"}});
  }

  // Issues and prints how long the order took.
  Json::Value TimedIssue(const char* what) {
    const auto started = std::chrono::steady_clock::now();
    Json::Value answer = Call("issue");
    const std::chrono::duration<double> took = std::chrono::steady_clock::now() - started;
    std::printf("%s issue against pebble: %.2f s\n", what, took.count());
    return answer;
  }

  std::unique_ptr<AcmeServers> servers_;
  std::unique_ptr<ServeProcess> serve_;
};

TEST_F(AcmeTest, HttpChallengeThroughTheHostInstallsACertificateThatIsPresentedAndVerifies) {
  ASSERT_TRUE(Call("set", Settings(R"(["nas.example.test"])"))["success"].asBool());
  const Json::Value answer = TimedIssue("http-01");
  ASSERT_TRUE(answer["success"].asBool()) << answer << serve_->Log();

  // The chain the HTTPS listener sends verifies against pebble's own root.
  const std::string root = scratch_.Path("/pebble/root.pem");
  scratch_.WriteFile("/pebble/root.pem", servers_->Root());
  EXPECT_TRUE(WaitFor([&] {
    return PresentedSubjects(serve_->https_port(),
                             "-CAfile '" + root + "' -verify_return_error"
                             " -verify_hostname nas.example.test")
               .rfind("CN = nas.example.test\nCN = Pebble Intermediate CA", 0) == 0;
  })) << PresentedSubjects(serve_->https_port());

  // Only the intermediate file names pebble's root.
  const std::string list = serve_->AuthorizedClient().Get(kListQuery)->body;
  EXPECT_NE(std::string::npos, list.find("Pebble Root CA")) << list;
}

TEST_F(AcmeTest, DnsChallengeGetsAWildcardAndTheCredentialsStayInLegosEnvironment) {
  // lego's stand-in logs its arguments, then runs the real lego.
  scratch_.WriteScript("/usr/orva/bin/lego", "printf '%s\\n' \"$@\" >>'" +
                                                 scratch_.Path("/lego-argv.log") +
                                                 "'\nexec /usr/bin/lego \"$@\"\n");
  DnsProviderAdapter adapter(*servers_);
  const std::string secret = "Marker-of-a-secret-4711";
  ASSERT_TRUE(Call("set", DnsSettings(R"(["*.nas.example.test","nas.example.test"])", adapter,
                                      secret))["success"].asBool());
  const Json::Value answer = TimedIssue("dns-01");
  ASSERT_TRUE(answer["success"].asBool()) << answer << serve_->Log();
  EXPECT_NE(std::string::npos, PemText(scratch_.Path(kServerCrt)).find("DNS:*.nas.example.test"));

  const std::string got = Call("get").toStyledString();
  EXPECT_NE(std::string::npos, got.find("HTTPREQ_PASSWORD")) << got;
  const std::string argv = ReadFile(scratch_.Path("/lego-argv.log"));
  EXPECT_NE(std::string::npos, argv.find("httpreq")) << argv;
  for (const std::string& seen : {answer.toStyledString(), got, serve_->Log(), argv}) {
    EXPECT_EQ(std::string::npos, seen.find(secret)) << seen;
  }
  // Files others may read hold no secret, and none of them is the client's
  // or the ACME settings'.
  const std::string acme = scratch_.Path("/usr/orva/etc/ssl/acme/");
  for (const auto& file : std::filesystem::recursive_directory_iterator(scratch_.root())) {
    if (file.is_regular_file() && (FileMode(file.path()) & 0004) != 0) {
      EXPECT_EQ(std::string::npos, ReadFile(file.path()).find(secret)) << file.path();
      EXPECT_NE(0u, file.path().string().rfind(acme, 0)) << file.path();
    }
  }
}

TEST_F(AcmeTest, RenewSignsTheLocalCertificateAnewAndOrdersOnlyWhenDue) {
  // A server certificate of the local CA with ten days left, for the key,
  // subject and names CRT create made.
  const std::string ssl = scratch_.Path("/usr/orva/etc/ssl");
  scratch_.WriteFile("/pebble/names.ext", "subjectAltName=DNS:new.local,DNS:alt.local\n");
  ASSERT_TRUE(RunForTest("{ openssl req -new -key '" + ssl + "/ssl.key/server.key' -subj "
                         "'/C=TW/ST=Taipei/L=Neihu/O=Storage Works/OU=Lab/CN=new.local' | openssl"
                         " x509 -req -days 10 -CA '" + ssl + "/ssl.crt/ca.crt' -CAkey '" + ssl +
                         "/ssl.key/ca.key' -extfile '" + scratch_.Path("/pebble/names.ext") +
                         "' -out '" + ssl + "/ssl.crt/server.crt'; }"));
  const std::string key = ReadFile(scratch_.Path(kServerKey));
  Json::Value renewed = Call("renew");
  ASSERT_TRUE(renewed["success"].asBool()) << renewed << serve_->Log();
  EXPECT_EQ(ParseJson(R"(["local"])"), renewed["data"]["renewed"]);
  EXPECT_EQ(key, ReadFile(scratch_.Path(kServerKey)));
  const std::string crt = scratch_.Path(kServerCrt);
  EXPECT_TRUE(RunForTest("openssl verify -CAfile '" + ssl + "/ssl.crt/ca.crt' '" + crt + "'"));
  EXPECT_TRUE(RunForTest("openssl x509 -checkend " + std::to_string(824 * 86400) + " -in '" + crt + "'"));
  EXPECT_NE(std::string::npos, PemText(crt).find("DNS:new.local, DNS:alt.local"));

  ASSERT_TRUE(Call("set", Settings(R"(["nas.example.test"])", {{"renew_days", "3650"}}))["success"].asBool());
  ASSERT_TRUE(Call("issue")["success"].asBool());
  const std::string first = ReadFile(crt);
  renewed = Call("renew");
  EXPECT_EQ(ParseJson(R"(["acme"])"), renewed["data"]["renewed"]);
  EXPECT_NE(first, ReadFile(crt));
  EXPECT_TRUE(WaitFor([&] { return Presents(serve_->https_port(), crt); }));

  ASSERT_TRUE(Call("set", Settings(R"(["nas.example.test"])"))["success"].asBool());
  const StoreState before = CertificateStore(scratch_);
  renewed = Call("renew");
  EXPECT_EQ(ParseJson("[]"), renewed["data"]["renewed"]) << renewed;
  EXPECT_EQ(before, CertificateStore(scratch_));
}

TEST_F(AcmeTest, AFailedOrderAnswersItsCodeAndLeavesTheStoreAndTheChallengeFolderAsTheyWere) {
  DnsProviderAdapter adapter(*servers_);
  ASSERT_TRUE(servers_->TellDns("/add-a", R"({"host":"refused.example.test.","addresses":["127.0.0.2"]})"));
  const struct {
    const char* name;
    std::function<httplib::Params()> settings;
    int set_code;    // 0: kept
    int issue_code;
  } kCases[] = {
      {"directory unreachable",
       [&] { return Settings(R"(["nas.example.test"])", {}, "https://127.0.0.1:1/dir"); },
       0, 5523},
      {"challenge refused: the name leads nowhere the host listens",
       [&] { return Settings(R"(["refused.example.test"])"); }, 0, 5523},
      {"a bad domain is refused; nothing is set up",
       [&] { return Settings(R"(["-bad.example.test"])"); }, 5503, 5522},
      {"credentials nested deeper than any reader goes are refused",
       [&] { return DnsSettings(R"(["a.example.test"])", adapter, "\",\"X\":" + std::string(1100, '[')); },
       5503, 5522},
      {"the authority goes down mid-order",
       [&] {
         adapter.OnPresent([&] { servers_->KillPebble(); });
         return DnsSettings(R"(["nas.example.test"])", adapter, "unused");
       },
       0, 5523},
      {"the client dies with a token left in the webroot",
       [&] {
         scratch_.WriteScript("/usr/orva/bin/lego", "touch '" + scratch_.Path(kChallengeDir) +
                                                        "/token'\necho 'killed mid-challenge'\nexit 1\n");
         return Settings(R"(["nas.example.test"])");
       },
       0, 5523},
  };
  for (const auto& row : kCases) {
    SCOPED_TRACE(row.name);
    ASSERT_TRUE(Call("delete")["success"].asBool());
    const StoreState before = CertificateStore(scratch_);
    const Json::Value set = Call("set", row.settings());
    EXPECT_EQ(row.set_code, set["error"]["code"].asInt()) << set;
    const Json::Value answer = Call("issue");
    EXPECT_EQ(row.issue_code, answer["error"]["code"].asInt()) << answer;
    EXPECT_EQ(before, CertificateStore(scratch_));
    EXPECT_EQ(0, CountFiles(scratch_.Path(kChallengeDir)));
    if (row.issue_code != 5523) continue;
    const Json::Value status = Call("get")["data"]["status"];
    EXPECT_EQ("failed", status["result"].asString());
    EXPECT_NE("", answer["data"]["error"].asString());
    EXPECT_EQ(status["error"], answer["data"]["error"]) << answer;
  }
}

}  // namespace
