// End-to-end tests of "orva-webapi serve" over loopback: the real server,
// started for each test and stopped on every path, and a real client.

#include <signal.h>
#include <unistd.h>

#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "host/device_root_init.h"
#include "tests/host/serve_process.h"
#include "tests/support/certificates.h"
#include "tests/support/test_support.h"

namespace {

constexpr char kListQuery[] = "/webapi?api=ORVA.Core.Certificate&method=list&type=server_cert";

Json::Value HostError(int code) {
  Json::Value answer(Json::objectValue);
  answer["success"] = false;
  answer["error"]["code"] = code;
  return answer;
}

class ServeTest : public testing::Test {
 protected:
  void SetUp() override {
    std::string error;
    ASSERT_TRUE(InitDeviceRoot(scratch_.root(), &error)) << error;
  }

  void InstallServerCertificate(const std::string& commonName) {
    ASSERT_TRUE(MakeSelfSignedCa(scratch_.Path("/usr/orva/etc/ssl/ssl.key/server.key"),
                                 scratch_.Path("/usr/orva/etc/ssl/ssl.crt/server.crt"),
                                 "/CN=" + commonName));
  }

  TempDeviceRoot scratch_;
};

}  // namespace

TEST_F(ServeTest, ListAnswersTheSameOverGetUrlencodedPostAndMultipartPost) {
  InstallServerCertificate("nas.test");
  ServeProcess server(scratch_.root());
  ASSERT_TRUE(server.started()) << server.Log();
  httplib::Client client = server.AuthorizedClient();

  std::vector<std::pair<std::string, httplib::Result>> results;
  results.emplace_back("GET with a query", client.Get(kListQuery));
  results.emplace_back("POST urlencoded",
                       client.Post("/webapi",
                                   httplib::Params{{"api", "ORVA.Core.Certificate"},
                                                   {"method", "list"},
                                                   {"type", "server_cert"}}));
  results.emplace_back("POST multipart",
                       client.Post("/webapi",
                                   httplib::MultipartFormDataItems{
                                       {"api", "ORVA.Core.Certificate", "", ""},
                                       {"method", "list", "", ""},
                                       {"type", "server_cert", "", ""}}));
  for (auto& result : results) {
    SCOPED_TRACE(result.first);
    ASSERT_TRUE(result.second) << httplib::to_string(result.second.error());
    EXPECT_EQ(200, result.second->status);
    EXPECT_EQ(0u, result.second->get_header_value("Content-Type").rfind("application/json", 0));
    Json::Value answer = ParseJson(result.second->body);
    EXPECT_TRUE(answer["success"].asBool()) << result.second->body;
    EXPECT_EQ("nas.test",
              answer["data"]["certificates"][0]["subject"]["common_name"].asString());
    EXPECT_EQ(results[0].second->body, result.second->body);
  }
}

TEST_F(ServeTest, RequestsWithoutTheTokenGet401AndRunNothing) {
  ServeProcess server(scratch_.root());
  ASSERT_TRUE(server.started()) << server.Log();
  const std::string entered = scratch_.Path("/entered");
  const std::string release = scratch_.Path("/release");
  scratch_.WriteFile("/release", "");
  const std::string hold = "/webapi?api=ORVA.Test&method=hold&entered=" + entered +
                           "&release=" + release;
  struct Case {
    const char* what;
    httplib::Headers headers;
  } cases[] = {
      {"no token", {}},
      {"wrong token", {{"Authorization", "Bearer " + std::string(64, '0')}}},
      {"token and more", {{"Authorization", "Bearer " + server.Token() + "0"}}},
      {"other scheme", {{"Authorization", "Basic " + server.Token()}}},
      {"token without scheme", {{"Authorization", server.Token()}}},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.what);
    httplib::Client client("127.0.0.1", server.http_port());
    auto result = client.Get(hold.c_str(), c.headers);
    ASSERT_TRUE(result);
    EXPECT_EQ(401, result->status);
    EXPECT_EQ(HostError(401), ParseJson(result->body));
    auto posted = client.Post("/webapi", c.headers,
                              httplib::MultipartFormDataItems{{"api", "ORVA.Test", "", ""},
                                                              {"method", "upload", "", ""},
                                                              {"doc", "x", "a.pem", ""}});
    ASSERT_TRUE(posted);
    EXPECT_EQ(401, posted->status);
  }
  EXPECT_FALSE(FileExists(entered)) << "no handler ran";

  auto page = httplib::Client("127.0.0.1", server.http_port()).Get("/");
  ASSERT_TRUE(page);
  EXPECT_EQ(200, page->status) << "the page needs no token";
  auto authorized = server.AuthorizedClient().Get(hold.c_str());
  ASSERT_TRUE(authorized);
  EXPECT_TRUE(FileExists(entered)) << "the same request with the token runs";
}

TEST_F(ServeTest, HostRefusalsAnswerTheirStatusInTheErrorShape) {
  ServeProcess server(scratch_.root());
  ASSERT_TRUE(server.started()) << server.Log();
  struct Case {
    const char* target;
    int status;
  } cases[] = {
      {"/webapi?api=ORVA.Core.Certificate&method=delete", 404},
      {"/webapi?api=ORVA.Core.Certificate&method=list&version=2", 404},
      {"/webapi?api=ORVA.Core.Certificate.CRT&method=list", 404},
      {"/webapi?api=ORVA.Core.Certificate&method=list&version=one", 400},
      {"/webapi?api=ORVA.Core.Certificate", 400},
      {"/webapi?api=ORVA.Core.Certificate&method=import&cert_tmp=/etc/passwd&key_tmp=/etc/shadow",
       400},
      {"/webapi?api=ORVA.Test&method=silent", 500},
      {"/webapi?api=ORVA.Test&method=throws", 500},
      {"/nowhere/page.html", 404},
  };
  httplib::Client client = server.AuthorizedClient();
  for (const Case& c : cases) {
    SCOPED_TRACE(c.target);
    auto result = client.Get(c.target);
    ASSERT_TRUE(result);
    EXPECT_EQ(c.status, result->status);
    EXPECT_EQ(HostError(c.status), ParseJson(result->body)) << result->body;
  }
  auto form = client.Post("/webapi", httplib::Params{{"api", "ORVA.Core.Certificate"},
                                                     {"method", "import"},
                                                     {"cert_tmp", "/etc/passwd"},
                                                     {"key_tmp", "/etc/shadow"}});
  ASSERT_TRUE(form);
  EXPECT_EQ(400, form->status) << "a client-named file in a form";
}

TEST_F(ServeTest, BodiesOverFourMebibytesAreRefusedWith413) {
  InstallServerCertificate("nas.test");
  ServeProcess server(scratch_.root());
  ASSERT_TRUE(server.started()) << server.Log();
  const std::string head = "POST /webapi HTTP/1.1\r\nHost: x\r\nConnection: close\r\n"
                           "Authorization: Bearer " + server.Token() + "\r\n";
  const size_t limit = 4 * 1024 * 1024;
  // A multipart form for "list" padded with an unchecked field to `size`.
  auto list_form = [&](size_t size) {
    const std::string fields =
        "--b\r\nContent-Disposition: form-data; name=\"api\"\r\n\r\nORVA.Core.Certificate\r\n"
        "--b\r\nContent-Disposition: form-data; name=\"method\"\r\n\r\nlist\r\n"
        "--b\r\nContent-Disposition: form-data; name=\"type\"\r\n\r\nserver_cert\r\n"
        "--b\r\nContent-Disposition: form-data; name=\"pad\"\r\n\r\n";
    const std::string end = "\r\n--b--\r\n";
    std::string body = fields + std::string(size - fields.size() - end.size(), 'a') + end;
    return head + "Content-Type: multipart/form-data; boundary=b\r\nContent-Length: " +
           std::to_string(body.size()) + "\r\n\r\n" + body;
  };

  std::string at_limit = RawExchange(server.http_port(), list_form(limit));
  EXPECT_EQ(200, RawStatus(at_limit));
  EXPECT_NE(std::string::npos, at_limit.find("\"success\":true")) << "4 MiB exactly is served";

  std::string over = RawExchange(server.http_port(), list_form(limit + 1));
  EXPECT_EQ(413, RawStatus(over));
  EXPECT_EQ(HostError(413), ParseJson(over.substr(over.find("\r\n\r\n") + 4)));

  std::string waiting = RawExchange(
      server.http_port(),
      head + "Content-Length: 1000000000\r\nExpect: 100-continue\r\n\r\n");
  EXPECT_EQ(413, RawStatus(waiting)) << "refused before the body is sent: " << waiting;

  std::string chunked = RawExchange(
      server.http_port(),
      head + "Transfer-Encoding: chunked\r\nContent-Type: application/x-www-form-urlencoded"
             "\r\n\r\n5\r\napi=A\r\n0\r\n\r\n");
  EXPECT_EQ(411, RawStatus(chunked)) << "a body of unknown size: " << chunked;

  httplib::Client client = server.AuthorizedClient();
  auto long_form = client.Post("/webapi", "api=A&method=b&pad=" + std::string(8192, 'a'),
                               "application/x-www-form-urlencoded");
  ASSERT_TRUE(long_form);
  EXPECT_EQ(413, long_form->status) << "urlencoded forms stop at 8 KiB";
  EXPECT_EQ(HostError(413), ParseJson(long_form->body));

  auto after = client.Get(kListQuery);
  ASSERT_TRUE(after);
  EXPECT_EQ(200, after->status) << "the server serves on";
}

TEST_F(ServeTest, UploadReachesTheHandlerAsAPrivateFileThatIsGoneAfterTheCall) {
  ServeProcess server(scratch_.root());
  ASSERT_TRUE(server.started()) << server.Log();
  httplib::Client client = server.AuthorizedClient();
  const std::string content("-----BEGIN CERTIFICATE-----\n\0\x01\xfe\xff\r\n", 34);

  auto result = client.Post("/webapi", httplib::MultipartFormDataItems{
                                           {"api", "ORVA.Test", "", ""},
                                           {"method", "upload", "", ""},
                                           {"doc", content, "../../evil name.pem", "text/plain"}});
  ASSERT_TRUE(result);
  ASSERT_EQ(200, result->status) << result->body;
  Json::Value data = ParseJson(result->body)["data"];
  EXPECT_EQ(content, data["content"].asString());
  EXPECT_EQ(0600, data["mode"].asInt());
  EXPECT_EQ("../../evil name.pem", data["name"].asString()) << "the client's name, as text";
  const std::string path = data["path"].asString();
  EXPECT_EQ(server.UploadFolder() + "/", path.substr(0, server.UploadFolder().size() + 1));
  EXPECT_FALSE(FileExists(path));
  EXPECT_EQ(0, CountFiles(server.UploadFolder()));

  for (const char* method : {"throws", "silent"}) {
    SCOPED_TRACE(method);
    auto failed = client.Post("/webapi", httplib::MultipartFormDataItems{
                                             {"api", "ORVA.Test", "", ""},
                                             {"method", method, "", ""},
                                             {"doc", content, "a.pem", ""}});
    ASSERT_TRUE(failed);
    EXPECT_EQ(500, failed->status);
    EXPECT_EQ(0, CountFiles(server.UploadFolder())) << "removed whatever the handler did";
  }
  auto named = client.Post("/webapi", httplib::MultipartFormDataItems{
                                          {"api", "ORVA.Test", "", ""},
                                          {"method", "upload", "", ""},
                                          {"doc_tmp", content, "a.pem", ""}});
  ASSERT_TRUE(named);
  EXPECT_EQ(400, named->status) << "an upload may not take a host name";
}

TEST_F(ServeTest, DownloadArrivesByteForByteWithItsHeaders) {
  std::string content;
  for (int round = 0; round < 300; ++round) {
    for (int byte = 0; byte < 256; ++byte) content += static_cast<char>((byte + round) & 0xFF);
  }
  scratch_.WriteFile("/download.bin", content);
  ServeProcess server(scratch_.root());
  ASSERT_TRUE(server.started()) << server.Log();

  auto result = server.AuthorizedClient().Get("/webapi?api=ORVA.Test&method=download");
  ASSERT_TRUE(result);
  EXPECT_EQ(200, result->status);
  EXPECT_EQ("attachment; filename=\"archive.zip\"",
            result->get_header_value("content-disposition"));
  EXPECT_EQ("application/zip", result->get_header_value("Content-Type"));
  ASSERT_EQ(content.size(), result->body.size());
  EXPECT_TRUE(content == result->body);

  unlink(scratch_.Path("/download.bin").c_str());
  auto missing = server.AuthorizedClient().Get("/webapi?api=ORVA.Test&method=download");
  ASSERT_TRUE(missing);
  EXPECT_EQ(500, missing->status) << "a download without a body is no answer";
}

TEST_F(ServeTest, ServesThePageFolderAndNothingOutsideIt) {
  scratch_.WriteFile("/secret.txt", "SECRET");
  scratch_.WriteFile("/web/index.html", "<html>index</html>");
  scratch_.WriteFile("/web/app.js", "let page = 1;");
  scratch_.WriteFile("/web/sub/page.html", "<html>sub</html>");
  ASSERT_EQ(0, symlink(scratch_.Path("/secret.txt").c_str(), scratch_.Path("/web/leak").c_str()));
  ASSERT_EQ(0, symlink(scratch_.root().c_str(), scratch_.Path("/web/root").c_str()));
  ServeProcess server(scratch_.root(), {"--web", scratch_.Path("/web")});
  ASSERT_TRUE(server.started()) << server.Log();
  struct Case {
    const char* target;
    int status;
    const char* body;
    const char* type;
  } cases[] = {
      {"/", 200, "<html>index</html>", "text/html"},
      {"/index.html", 200, "<html>index</html>", "text/html"},
      {"/app.js", 200, "let page = 1;", "text/javascript"},
      {"/sub/page.html", 200, "<html>sub</html>", "text/html"},
      {"/sub/", 404, nullptr, nullptr},
      {"/leak", 404, nullptr, nullptr},
      {"/root/secret.txt", 404, nullptr, nullptr},
      {"/../secret.txt", 404, nullptr, nullptr},
      {"/%2e%2e/secret.txt", 404, nullptr, nullptr},
      {"/sub/../../secret.txt", 404, nullptr, nullptr},
      {"/sub/%2E%2E/%2E%2E/secret.txt", 404, nullptr, nullptr},
      {"/..%2fsecret.txt", 404, nullptr, nullptr},
      {"/index.html%00.js", 404, nullptr, nullptr},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.target);
    std::string response = RawExchange(
        server.http_port(),
        std::string("GET ") + c.target + " HTTP/1.1\r\nHost: x\r\nConnection: close\r\n\r\n");
    EXPECT_EQ(c.status, RawStatus(response)) << response;
    EXPECT_EQ(std::string::npos, response.find("SECRET"));
    if (c.body != nullptr) {
      EXPECT_NE(std::string::npos, response.find(std::string("\r\n\r\n") + c.body));
      EXPECT_NE(std::string::npos, response.find(std::string("Content-Type: ") + c.type));
    }
  }
}

TEST_F(ServeTest, StopsCleanlyOnSigintAndSigterm) {
  for (int signal_number : {SIGINT, SIGTERM}) {
    SCOPED_TRACE(signal_number);
    ServeProcess server(scratch_.root());
    ASSERT_TRUE(server.started()) << server.Log();
    const int port = server.http_port();
    EXPECT_EQ(0, server.Stop(signal_number));
    EXPECT_NE(std::string::npos, server.Output().find("orva-webapi: stopped"));
    EXPECT_EQ("", RawExchange(port, "GET / HTTP/1.1\r\nHost: x\r\n\r\n")) << "nothing listens";
  }
}

TEST_F(ServeTest, StartupNamesTheUrlsAndTheTokenFile) {
  ServeProcess server(scratch_.root());
  ASSERT_TRUE(server.started()) << server.Log();
  std::string output = server.Output();
  EXPECT_NE(std::string::npos,
            output.find("http:  http://127.0.0.1:" + std::to_string(server.http_port()) + "/"));
  EXPECT_NE(std::string::npos, output.find("https: off (runHTTPS is not \"yes\")"));
  EXPECT_NE(std::string::npos, output.find("token: " + TokenPath(scratch_.root())));
  EXPECT_EQ(std::string::npos, output.find(server.Token())) << "the token itself stays private";
}
