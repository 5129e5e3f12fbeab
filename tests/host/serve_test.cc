// End-to-end tests of "orva-webapi serve" over loopback: the real server,
// started for each test and stopped on every path, and a real client.

#include <signal.h>
#include <unistd.h>

#include <string>

#include <gtest/gtest.h>

#include "host/device_root_init.h"
#include "tests/host/serve_process.h"
#include "tests/support/certificates.h"
#include "tests/support/test_support.h"

namespace {

constexpr char kListQuery[] = "/webapi?api=ORVA.Core.Certificate&method=list&type=server_cert";

class ServeTest : public testing::Test {
 protected:
  void SetUp() override {
    std::string error;
    ASSERT_TRUE(InitDeviceRoot(scratch_.root(), &error)) << error;
  }

  TempDeviceRoot scratch_;
};

}  // namespace

TEST_F(ServeTest, ListAnswersTheSameOverGetUrlencodedPostAndMultipartPost) {
  ASSERT_TRUE(MakeSelfSignedCa(scratch_.Path("/usr/orva/etc/ssl/ssl.key/server.key"),
                               scratch_.Path("/usr/orva/etc/ssl/ssl.crt/server.crt"),
                               "/CN=nas.test"));
  ServeProcess server(scratch_.root());
  ASSERT_TRUE(server.started()) << server.Log();
  httplib::Client client = server.AuthorizedClient();
  httplib::Result results[] = {
      client.Get(kListQuery),
      client.Post("/webapi", httplib::Params{{"api", "ORVA.Core.Certificate"},
                                             {"method", "list"},
                                             {"type", "server_cert"}}),
      client.Post("/webapi", httplib::MultipartFormDataItems{
                                 {"api", "ORVA.Core.Certificate", "", ""},
                                 {"method", "list", "", ""},
                                 {"type", "server_cert", "", ""}})};
  for (const httplib::Result& result : results) {
    SCOPED_TRACE(&result - results);
    ASSERT_TRUE(result) << httplib::to_string(result.error());
    EXPECT_EQ(200, result->status);
    EXPECT_EQ(0u, result->get_header_value("Content-Type").rfind("application/json", 0));
    EXPECT_EQ("nas.test", ParseJson(result->body)["data"]["certificates"][0]["subject"]
                                                 ["common_name"].asString())
        << result->body;
    EXPECT_EQ(results[0]->body, result->body);
  }
}

TEST_F(ServeTest, RequestsWithoutTheTokenGet401AndRunNothing) {
  ServeProcess server(scratch_.root());
  ASSERT_TRUE(server.started()) << server.Log();
  const std::string entered = scratch_.Path("/entered");
  scratch_.WriteFile("/release", "");
  const std::string hold = "/webapi?api=ORVA.Test&method=hold&entered=" + entered +
                           "&release=" + scratch_.Path("/release");
  for (const std::string& authorization :
       {std::string(), "Bearer " + server.Token() + "0", std::string("Bearer "),
        "Bearer " + std::string(6000, 'a') + server.Token()}) {
    SCOPED_TRACE(authorization);
    httplib::Headers headers;
    if (!authorization.empty()) headers.emplace("Authorization", authorization);
    auto result = httplib::Client("127.0.0.1", server.http_port()).Get(hold.c_str(), headers);
    ASSERT_TRUE(result);
    EXPECT_EQ(401, result->status);
    EXPECT_EQ(HostError(401), ParseJson(result->body));
  }
  EXPECT_FALSE(FileExists(entered)) << "no handler ran";
  ASSERT_TRUE(server.AuthorizedClient().Get(hold.c_str()));
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
      {"/webapi?api=ORVA.Core.Certificate&method=import&cert_tmp=/etc/passwd&key_tmp=/x", 400},
      {"/webapi?api=ORVA.Test&method=silent", 500},
      {"/webapi?api=ORVA.Test&method=throws", 500},
      {"/webapi?api=ORVA.Test&method=download", 500},  // a download whose file is missing
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
}

TEST_F(ServeTest, BodiesOverFourMebibytesAreRefusedWith413) {
  ServeProcess server(scratch_.root());
  ASSERT_TRUE(server.started()) << server.Log();
  const int port = server.http_port();
  const std::string head = "POST /webapi HTTP/1.1\r\nHost: x\r\nConnection: close\r\n"
                           "Authorization: Bearer " + server.Token() + "\r\n";
  // A multipart form for "list" padded with an unchecked upload to `size`.
  auto list_form = [&](size_t size) {
    const std::string fields =
        "--b\r\nContent-Disposition: form-data; name=\"api\"\r\n\r\nORVA.Core.Certificate\r\n"
        "--b\r\nContent-Disposition: form-data; name=\"method\"\r\n\r\nlist\r\n"
        "--b\r\nContent-Disposition: form-data; name=\"pad\"; filename=\"pad.pem\"\r\n\r\n";
    const std::string end = "\r\n--b--\r\n";
    std::string body = fields + std::string(size - fields.size() - end.size(), 'a') + end;
    return head + "Content-Type: multipart/form-data; boundary=b\r\nContent-Length: " +
           std::to_string(body.size()) + "\r\n\r\n" + body;
  };
  const size_t limit = 4 * 1024 * 1024;
  EXPECT_EQ(200, RawStatus(RawExchange(port, list_form(limit)))) << "4 MiB exactly is served";
  std::string over = RawExchange(port, list_form(limit + 1));
  EXPECT_EQ(413, RawStatus(over));
  EXPECT_EQ(HostError(413), ParseJson(over.substr(over.find("\r\n\r\n") + 4)));
  EXPECT_EQ(0, CountFiles(server.UploadFolder())) << "nothing saved";
  EXPECT_EQ(413, RawStatus(RawExchange(
                     port, head + "Content-Length: 1000000000\r\nExpect: 100-continue\r\n\r\n")))
      << "refused before the body is sent";
  EXPECT_EQ(411, RawStatus(RawExchange(
                     port, head + "Transfer-Encoding: chunked\r\n\r\n5\r\napi=A\r\n0\r\n\r\n")))
      << "a body of unknown size";

  auto after = server.AuthorizedClient().Get(kListQuery);
  ASSERT_TRUE(after);
  EXPECT_EQ(200, after->status) << "the server serves on";
}

TEST_F(ServeTest, UploadReachesTheHandlerAsAPrivateFileThatIsGoneAfterTheCall) {
  ServeProcess server(scratch_.root());
  ASSERT_TRUE(server.started()) << server.Log();
  httplib::Client client = server.AuthorizedClient();
  const std::string content("-----BEGIN CERTIFICATE-----\n\0\x01\xfe\xff\r\n", 34);
  auto upload = [&](const char* method, const char* fileName) {
    return client.Post("/webapi", httplib::MultipartFormDataItems{
                                      {"api", "ORVA.Test", "", ""},
                                      {"method", method, "", ""},
                                      {"doc", content, fileName, "text/plain"}});
  };

  auto result = upload("upload", "../../evil name.pem");
  ASSERT_TRUE(result);
  ASSERT_EQ(200, result->status) << result->body;
  Json::Value data = ParseJson(result->body)["data"];
  EXPECT_EQ("2d2d2d2d2d424547494e2043455254494649434154452d2d2d2d2d0a0001feff0d0a",
            data["content_hex"].asString()) << "the content byte for byte";
  EXPECT_EQ(0600, data["mode"].asInt());
  EXPECT_EQ("../../evil name.pem", data["name"].asString()) << "the client's name, as text";
  const std::string path = data["path"].asString();
  EXPECT_EQ(server.UploadFolder() + "/", path.substr(0, server.UploadFolder().size() + 1));
  EXPECT_FALSE(FileExists(path));
  EXPECT_EQ(0, CountFiles(server.UploadFolder()));

  for (const char* method : {"throws", "silent"}) {
    SCOPED_TRACE(method);
    auto failed = upload(method, "a.pem");
    ASSERT_TRUE(failed);
    EXPECT_EQ(500, failed->status);
    EXPECT_EQ(0, CountFiles(server.UploadFolder())) << "removed whatever the handler did";
  }
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
    const char* body;  // null for a 404
    const char* type;
  } cases[] = {
      {"/", "<html>index</html>", "text/html"},
      {"/app.js", "let page = 1;", "text/javascript"},
      {"/sub/page.html", "<html>sub</html>", "text/html"},
      {"/sub/", nullptr, nullptr},
      {"/leak", nullptr, nullptr},
      {"/root/secret.txt", nullptr, nullptr},
      {"/../secret.txt", nullptr, nullptr},
      {"/sub/%2E%2E/%2E%2E/secret.txt", nullptr, nullptr},
      {"/..%2fsecret.txt", nullptr, nullptr},
      {"/index.html%00.js", nullptr, nullptr},
      {"/%2e%2e/secret.txt", nullptr, nullptr},
      {"/%2e%2e%2fsecret.txt", nullptr, nullptr},
      {"/sub/%252e%252e/%252e%252e/secret.txt", nullptr, nullptr},
      {"/sub/..\\..\\secret.txt", nullptr, nullptr},
      {"/sub/..%5c..%5csecret.txt", nullptr, nullptr},
      {"/%2fetc%2fpasswd", nullptr, nullptr},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.target);
    // Without a token: the page needs none.
    std::string response = RawExchange(
        server.http_port(),
        std::string("GET ") + c.target + " HTTP/1.1\r\nHost: x\r\nConnection: close\r\n\r\n");
    EXPECT_EQ(c.body != nullptr ? 200 : 404, RawStatus(response)) << response;
    EXPECT_EQ(std::string::npos, response.find("SECRET"));
    if (c.body != nullptr) {
      EXPECT_NE(std::string::npos, response.find(std::string("\r\n\r\n") + c.body));
      EXPECT_NE(std::string::npos, response.find(std::string("Content-Type: ") + c.type));
    }
  }
}

TEST_F(ServeTest, StartupNamesTheUrlsAndTheTokenFileAndSignalsStopItCleanly) {
  for (int signal_number : {SIGINT, SIGTERM}) {
    SCOPED_TRACE(signal_number);
    ServeProcess server(scratch_.root());
    ASSERT_TRUE(server.started()) << server.Log();
    const int port = server.http_port();
    const std::string output = server.Output();
    EXPECT_NE(std::string::npos,
              output.find("http:  http://127.0.0.1:" + std::to_string(port) + "/"));
    EXPECT_NE(std::string::npos, output.find("https: off (runHTTPS is not \"yes\")"));
    EXPECT_NE(std::string::npos, output.find("token: " + TokenPath(scratch_.root())));
    EXPECT_EQ(std::string::npos, output.find(server.Token())) << "the token itself stays private";

    EXPECT_EQ(0, server.Stop(signal_number));
    EXPECT_NE(std::string::npos, server.Output().find("orva-webapi: stopped"));
    EXPECT_EQ("", RawExchange(port, "GET / HTTP/1.1\r\nHost: x\r\n\r\n")) << "nothing listens";
  }
}
