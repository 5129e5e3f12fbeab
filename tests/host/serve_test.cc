// End-to-end tests of "orva-webapi serve" over loopback at its door: start
// and stop, the token, the host's own refusals, the page folder, stalled
// clients and uploads.

#include <signal.h>
#include <unistd.h>

#include <chrono>
#include <string>

#include <gtest/gtest.h>

#include "host/device_root_init.h"
#include "tests/host/serve_process.h"

namespace {

// The end of the host's answer to a request it refuses with `status`.
std::string HostError(int status) {
  return "\r\n\r\n{\"error\":{\"code\":" + std::to_string(status) + "},\"success\":false}";
}

}  // namespace

TEST_F(ServeTest, StartupNamesTheUrlsAndTheTokenFileAndSignalsStopItCleanly) {
  for (int signal_number : {SIGINT, SIGTERM}) {
    SCOPED_TRACE(signal_number);
    ServeProcess server(scratch_.root());
    ASSERT_TRUE(server.started()) << server.Output() << server.Log();
    const std::string output = server.Output();
    EXPECT_NE(std::string::npos, output.find("\nhttps: off (runHTTPS is not \"yes\")\n"));
    EXPECT_NE(std::string::npos, output.find("\ntoken: " + TokenPath(scratch_.root())));
    EXPECT_EQ(std::string::npos, output.find(server.Token())) << "the token itself stays private";

    EXPECT_EQ(0, server.Stop(signal_number));
    EXPECT_NE(std::string::npos, server.Output().find("orva-webapi: stopped"));
    EXPECT_EQ("", RawExchange(server.http_port(), "GET / HTTP/1.1\r\n\r\n")) << "nothing listens";
  }
}

TEST_F(ServeTest, EveryRequestGetsItsAnswerAtTheDoorWhileStalledClientsAreCutOff) {
  scratch_.WriteFile("/secret.txt", "SECRET");
  scratch_.WriteFile("/web/index.html", "<html>index</html>");
  scratch_.WriteFile("/web/app.js", "let page = 1;");
  MakeDirs(scratch_.Path("/web/sub"));
  ASSERT_EQ(0, symlink(scratch_.Path("/secret.txt").c_str(), scratch_.Path("/web/leak").c_str()));
  ASSERT_EQ(0, symlink(scratch_.root().c_str(), scratch_.Path("/web/root").c_str()));
  ServeProcess server(scratch_.root(), scratch_.Path("/web"));
  ASSERT_TRUE(server.started()) << server.Log();
  const std::string token = server.Token();
  const std::string bearer = "Bearer " + token;
  // `start` ("GET /path"), the authorization header when not empty, then
  // `rest`: more headers, the blank line and the body.
  auto raw = [](const std::string& start, const std::string& rest,
                const std::string& authorization) {
    return start + " HTTP/1.1\r\nConnection: close\r\n" +
           (authorization.empty() ? "" : "Authorization: " + authorization + "\r\n") + rest;
  };
  auto get = [&](const std::string& query, const std::string& authorization) {
    return raw("GET /webapi?" + query, "\r\n", authorization);
  };
  auto call = [&](const std::string& query) { return get(query, bearer); };
  auto page = [&](const std::string& path) { return raw("GET " + path, "\r\n", ""); };
  auto post = [&](const std::string& target, const std::string& type, const std::string& body) {
    return raw("POST " + target, "Content-Type: " + type + "\r\nContent-Length: " +
                                     std::to_string(body.size()) + "\r\n\r\n" + body, bearer);
  };
  // A multipart "list" with an upload named `name` that pads it to `size`.
  auto list_with_upload = [&](const std::string& name, size_t size) {
    const std::string fields =
        "--b\r\nContent-Disposition: form-data; name=\"api\"\r\n\r\nORVA.Core.Certificate\r\n"
        "--b\r\nContent-Disposition: form-data; name=\"method\"\r\n\r\nlist\r\n"
        "--b\r\nContent-Disposition: form-data; name=\"" + name + "\"; filename=\"a.pem\"\r\n\r\n";
    const std::string end = "\r\n--b--\r\n";
    return post("/webapi", "multipart/form-data; boundary=b",
                fields + std::string(size - fields.size() - end.size(), 'a') + end);
  };
  const std::string list = "api=ORVA.Core.Certificate&method=list";
  const std::string mark = scratch_.Path("/mark");
  const auto start = std::chrono::steady_clock::now();
  // Connected first, so the server takes them before the rows below.
  RawConnection stalled[] = {
      {server.http_port(), raw("POST /webapi", "Content-Len", bearer)},
      {server.http_port(),
       raw("POST /webapi", "Content-Length: 1000\r\n\r\napi=ORVA.Test&method=echo&mark=" + mark,
           bearer)}};
  const size_t limit = 4 * 1024 * 1024;
  const struct {
    const char* what;
    std::string request;
    int status;
    const char* shows = "";  // a text of the answer
  } cases[] = {
      {"no token", get(list, ""), 401},
      {"empty token", get(list, "Bearer "), 401},
      {"token and more", get(list, bearer + "0"), 401},
      {"token cut short", get(list, bearer.substr(0, bearer.size() - 1)), 401},
      {"token after other text", get(list, "Bearer " + std::string(6000, 'a') + token), 401},
      {"two blanks", get(list, "Bearer  " + token), 401},
      {"no blank", get(list, "Bearer-" + token), 401},
      {"other scheme", get(list, "Basic " + token), 401},
      {"token alone", get(list, token), 401},
      {"scheme in small letters", get(list, "bearer " + token), 200},
      {"scheme in capitals", get(list, "BEARER " + token), 200},
      {"answer that is not UTF-8", call("api=ORVA.Test&method=echo&text=Z%C3%BCrich%E9%C0%AF%E2%82"),
       200, "\"text\":\"Z\xC3\xBCrich\xEF\xBF\xBD\xEF\xBF\xBD\xEF\xBF\xBD\xEF\xBF\xBD\xEF\xBF\xBD\""},
      {"unknown method", call("api=ORVA.Core.Certificate&method=delete"), 404},
      {"unknown version", call(list + "&version=2"), 404},
      {"last row of the test module", call("api=ORVA.Test&method=restart"), 200},
      {"row past the test module's count", call("api=ORVA.Test&method=beyond"), 404},
      {"no method", call("api=ORVA.Core.Certificate"), 400},
      {"version not a number", call(list + "&version=1x"), 400},
      {"version too long", call(list + "&version=1234567890"), 400},
      {"parameter given twice", call(list + "&type=a&type=b"), 400},
      {"query and form both",
       post("/webapi?" + list, "application/x-www-form-urlencoded", "api=ORVA.Test"), 400},
      {"client names a host file", call(list + "&_tmp=/x"), 400},
      {"upload named like the api", list_with_upload("api", 1000), 400},
      {"handler answers nothing", call("api=ORVA.Test&method=silent"), 500},
      {"handler throws", call("api=ORVA.Test&method=throws"), 500},
      {"download of a missing file", call("api=ORVA.Test&method=download"), 500},
      {"4 MiB exactly", list_with_upload("pad", limit), 200},
      {"over 4 MiB", list_with_upload("pad", limit + 1), 413},
      {"over 4 MiB announced before the body",
       raw("POST /webapi", "Content-Length: 1000000000\r\nExpect: 100-continue\r\n\r\n", bearer),
       413},
      {"body of unknown size",
       raw("POST /webapi", "Transfer-Encoding: chunked\r\n\r\n5\r\napi=A\r\n0\r\n\r\n", bearer),
       411},
      {"page", page("/"), 200, "\r\n\r\n<html>index</html>"},
      {"script", page("/app.js"), 200, "Content-Type: text/javascript"},
      {"folder without index", page("/sub/"), 404},
      {"link out of the folder", page("/leak"), 404},
      {"folder linked from outside", page("/root/secret.txt"), 404},
      {"..", page("/../secret.txt"), 404},
      {"encoded ..", page("/sub/%2E%2E/%2E%2E/secret.txt"), 404},
      {"encoded .. inside the folder", page("/sub/%2E%2E/index.html"), 404},
      {"encoded slash", page("/..%2fsecret.txt"), 404},
      {"encoded NUL", page("/index.html%00.js"), 404},
      {"encoded backslashes", page("/sub/..%5c..%5csecret.txt"), 404},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.what);
    const std::string response = RawExchange(server.http_port(), c.request);
    EXPECT_EQ(c.status, RawStatus(response)) << response.substr(0, 500);
    EXPECT_NE(std::string::npos, response.find(c.status == 200 ? c.shows : HostError(c.status)))
        << response.substr(0, 500);
    EXPECT_EQ(std::string::npos, response.find("SECRET"));
  }
  EXPECT_EQ(0, CountFiles(server.UploadFolder())) << "no upload kept";
  EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(20))
      << "served beside the stalled clients";

  for (RawConnection& connection : stalled) {
    const std::string response = connection.Reply(45000);
    EXPECT_EQ(400, RawStatus(response)) << response;
    EXPECT_NE(std::string::npos, response.find(HostError(400)));
  }
  EXPECT_GT(std::chrono::steady_clock::now() - start, std::chrono::seconds(25))
      << "cut by the read timeout (30 s), not before";
  EXPECT_FALSE(FileExists(mark)) << "the cut request never ran";
}
