// End-to-end tests of "orva-webapi serve" and its nginx over loopback at the
// door: start and stop, the token, the refusals of both, the page folder,
// the headers and uploads.

#include <signal.h>
#include <unistd.h>

#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "host/device_root_init.h"
#include "tests/host/serve_process.h"

namespace {

// The end of the answer to a /webapi request refused with `status`.
std::string HostError(int status) {
  return "\r\n\r\n{\"error\":{\"code\":" + std::to_string(status) + "},\"success\":false}";
}

// A text of nginx's own error pages: nginx refused the request itself.
constexpr char kNginxPage[] = "<center>nginx</center>";

}  // namespace

TEST_F(ServeTest, StartupNamesTheUrlsAndTheTokenFileAndASignalOrNginxsEndStopsBoth) {
  const struct {
    const char* what;
    bool to_nginx;  // the signal goes to nginx's master, not to the server
    int signal_number;
    int status;
    const char* says;
  } cases[] = {
      {"Ctrl-C", false, SIGINT, 0, "orva-webapi: stopped"},
      {"SIGTERM", false, SIGTERM, 0, "orva-webapi: stopped"},
      {"nginx ends", true, SIGTERM, 1, "orva-webapi: nginx ended on its own (status 0); stopping"},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.what);
    ServeProcess server(scratch_.root());
    ASSERT_TRUE(server.started()) << server.Output() << server.Log();
    const std::string output = server.Output();
    EXPECT_NE(std::string::npos, output.find("\nhttps: off (runHTTPS is not \"yes\")\n"));
    EXPECT_NE(std::string::npos, output.find("\ntoken: " + TokenPath(scratch_.root())));
    EXPECT_EQ(std::string::npos, output.find(server.Token())) << "the token itself stays private";
    const pid_t nginx = server.NginxPid();
    ASSERT_GT(nginx, 0);

    if (c.to_nginx) kill(nginx, c.signal_number);
    EXPECT_EQ(c.status, server.Stop(c.to_nginx ? 0 : c.signal_number));
    EXPECT_NE(std::string::npos, (server.Output() + server.Log()).find(c.says)) << server.Log();
    EXPECT_EQ("", RawExchange(server.http_port(), "GET / HTTP/1.1\r\n\r\n")) << "nothing listens";
    EXPECT_NE(0, kill(nginx, 0)) << "nginx has ended";
  }
}

TEST_F(ServeTest, EveryRequestGetsItsAnswerAtTheDoor) {
  scratch_.WriteFile("/secret.txt", "SECRET");
  scratch_.WriteFile("/web/index.html", "<html>index</html>");
  const std::string challenges = "/usr/orva/etc/ssl/acme-webroot/.well-known/acme-challenge/";
  for (const char* name : {"Az-09_z", "a.txt", "sub/Az-09_z"}) {
    scratch_.WriteFile(challenges + name, "CHALLENGE");
  }
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
    return start + " HTTP/1.1\r\nHost: device\r\nConnection: close\r\n" +
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
  const std::string echo = "api=ORVA.Test&method=echo&mark=" + mark;
  const std::string run_echo = "GET /webapi?" + echo + " HTTP/1.1\r\nHost: d\r\n" +
                               "Authorization: " + bearer + "\r\n\r\n";
  std::string ranges = "Range: bytes=-1";  // 2,700 ranges in 8 KiB
  for (int i = 1; i < 2700; ++i) ranges += ",-1";
  const std::string page_headers[] = {
      "Cache-Control: no-cache", "X-Frame-Options: DENY", "X-Content-Type-Options: nosniff",
      "Content-Security-Policy: default-src 'self'; img-src 'self' data:; frame-ancestors 'none'"};
  const size_t limit = 4 * 1024 * 1024;
  const struct {
    const char* what;
    std::string request;
    int status;
    std::vector<std::string> shows = {};  // texts of the answer
  } cases[] = {
      {"no token", get(list, ""), 401},
      {"token and more", get(list, bearer + "0"), 401},
      {"token cut short", get(list, bearer.substr(0, bearer.size() - 1)), 401},
      {"token after other text", get(list, "Bearer " + std::string(6000, 'a') + token), 401},
      {"other scheme", get(list, "Basic " + token), 401},
      {"a refused body is no request", raw("POST /webapi", "Content-Length: " +
           std::to_string(run_echo.size()) + "\r\n\r\n" + run_echo, ""), 401},
      {"scheme in any case", get(list, "bEARER " + token), 200},
      {"answer that is not UTF-8", call("api=ORVA.Test&method=echo&text=Z%C3%BCrich%E9%C0%AF%E2%82"),
       200, {"\"text\":\"Z\xC3\xBCrich\xEF\xBF\xBD\xEF\xBF\xBD"
             "\xEF\xBF\xBD\xEF\xBF\xBD\xEF\xBF\xBD\""}},
      {"web API answers", call("api=ORVA.Test&method=echo"), 200,
       {"Cache-Control: no-store", "X-Content-Type-Options: nosniff"}},
      {"2,700 ranges of an answer",
       raw("GET /webapi?api=ORVA.Test&method=echo", ranges + "\r\n\r\n", bearer), 200,
       {"\r\n\r\n{\"data\""}},
      {"HEAD runs no handler", raw("HEAD /webapi?" + echo, "\r\n", bearer), 405},
      {"unknown method", call("api=ORVA.Core.Certificate&method=delete"), 404},
      {"unknown version", call(list + "&version=2"), 404},
      {"last row of the test module", call("api=ORVA.Test&method=restart"), 200},
      {"row past the test module's count", call("api=ORVA.Test&method=beyond"), 404},
      {"no method", call("api=ORVA.Core.Certificate"), 400},
      {"version not a number", call(list + "&version=1x"), 400},
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
      {"odd Transfer-Encoding", raw("POST /webapi", "Transfer-Encoding : chunked\r\n\r\n" + echo,
                                    bearer), 400, {kNginxPage}},
      {"other Transfer-Encoding", raw("POST /webapi", "Transfer-Encoding: gzip\r\n\r\n", bearer),
       501, {kNginxPage}},
      {"two lengths",
       raw("POST /webapi", "Content-Length: 1\r\nContent-Length: 1\r\n\r\na", bearer), 400,
       {kNginxPage}},
      {"signed length", raw("POST /webapi", "Content-Length: +1\r\n\r\na", bearer), 400,
       {kNginxPage}},
      {"listed length", raw("POST /webapi", "Content-Length: 1, 1\r\n\r\na", bearer), 400,
       {kNginxPage}},
      {"page", page("/"), 200, {"\r\n\r\n<html>index</html>", page_headers[0], page_headers[1],
                                page_headers[2], page_headers[3]}},
      {"2,700 ranges of the page", raw("GET /", ranges + "\r\n\r\n", ""), 200,
       {"\r\n\r\n<html>index</html>"}},
      {"ACME token of the whole alphabet", page("/.well-known/acme-challenge/Az-09_z"), 200,
       {"\r\n\r\nCHALLENGE"}},
      {"ACME name with a dot", page("/.well-known/acme-challenge/a.txt"), 404},
      {"ACME folder", page("/.well-known/acme-challenge/sub"), 404},
      {"ACME file in a folder", page("/.well-known/acme-challenge/sub/Az-09_z"), 404},
      {"ACME challenge listing", page("/.well-known/acme-challenge/"), 404},
      {"link out of the folder", page("/leak"), 403},
      {"folder linked from outside", page("/root/secret.txt"), 404},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.what);
    const std::string response = RawExchange(server.http_port(), c.request);
    EXPECT_EQ(c.status, RawStatus(response)) << response.substr(0, 500);
    // Refusals of web API requests keep the JSON shape, unless nginx could
    // not read the request at all.
    if (c.request.find(" /webapi") != std::string::npos && c.status != 200 &&
        c.request.rfind("HEAD", 0) != 0 && (c.shows.empty() || c.shows[0] != kNginxPage)) {
      EXPECT_NE(std::string::npos, response.find(HostError(c.status))) << response;
    }
    for (const std::string& text : c.shows) {
      EXPECT_NE(std::string::npos, response.find(text)) << response.substr(0, 500);
    }
    EXPECT_LT(response.size(), 16384u) << "one answer, once";
    EXPECT_EQ(std::string::npos, response.find("SECRET"));
  }
  EXPECT_EQ(0, CountFiles(server.UploadFolder())) << "no upload kept";
  EXPECT_FALSE(FileExists(mark)) << "no refused request, body or HEAD ran a handler";
}
