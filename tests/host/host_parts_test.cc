
#include <chrono>
#include <cstdlib>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

#include "host/access_token.h"
#include "host/call_order.h"
#include "host/listen_address.h"
#include "host/request_parsing.h"
#include "host/temporary_uploads.h"
#include "tests/host/serve_process.h"
#include "tests/support/test_support.h"

namespace {

// Points TMPDIR, where uploads are saved, at `folder` while it lives.
class UploadFolder {
 public:
  explicit UploadFolder(const std::string& folder) : folder_(folder) {
    MakeDirs(folder);
    const char* previous = std::getenv("TMPDIR");
    if (previous != nullptr) previous_ = previous;
    had_previous_ = previous != nullptr;
    setenv("TMPDIR", folder.c_str(), 1);
  }
  ~UploadFolder() {
    if (had_previous_) {
      setenv("TMPDIR", previous_.c_str(), 1);
    } else {
      unsetenv("TMPDIR");
    }
  }
  const std::string& path() const { return folder_; }

 private:
  std::string folder_;
  std::string previous_;
  bool had_previous_ = false;
};

httplib::MultipartFormData Part(const std::string& name, const std::string& content,
                                const std::string& filename = "",
                                const std::string& type = "") {
  return httplib::MultipartFormData{name, content, filename, type};
}

}  // namespace

TEST(ListenAddress, ParsesHostAndPortAndRefusesAnythingElse) {
  struct Case {
    const char* text;
    bool valid;
    const char* host;
    int port;
  } cases[] = {
      {"127.0.0.1:8080", true, "127.0.0.1", 8080},
      {"localhost:0", true, "localhost", 0},
      {"[::1]:65535", true, "::1", 65535},
      {"8080", false, "", 0},
      {":8080", false, "", 0},
      {"localhost:", false, "", 0},
      {"localhost:65536", false, "", 0},
      {"localhost:-1", false, "", 0},
      {"localhost:80a", false, "", 0},
      {"::1:8080", false, "", 0},
      {"[::1]8080", false, "", 0},
      {"[]:8080", false, "", 0},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.text);
    ListenAddress address{"unchanged", 7};
    ASSERT_EQ(c.valid, ParseListenAddress(c.text, &address));
    EXPECT_EQ(c.valid ? c.host : "unchanged", address.host);
    EXPECT_EQ(c.valid ? c.port : 7, address.port);
  }
  EXPECT_EQ("https://[::1]:8443/", ListenUrl("https", "::1", 8443, "/"));
  EXPECT_EQ("http://127.0.0.1:80/webapi", ListenUrl("http", "127.0.0.1", 80, "/webapi"));
}

TEST(AccessToken, AcceptsOnlyTheBearerOfTheExactToken) {
  TempDeviceRoot scratch;
  scratch.WriteFile("/token", "  0123abcd\n", 0600);
  AccessToken token;
  std::string error;
  ASSERT_TRUE(token.LoadFromFile(scratch.Path("/token"), &error)) << error;
  struct Case {
    const char* authorization;
    bool accepted;
  } cases[] = {
      {"Bearer 0123abcd", true},
      {"bearer 0123abcd", true},
      {"BEARER 0123abcd", true},
      {"", false},
      {"Bearer", false},
      {"Bearer ", false},
      {"Bearer 0123abc", false},
      {"Bearer 0123abcdd", false},
      {"Bearer 0123ABCD", false},
      {"Bearer  0123abcd", false},
      {"Bearer 0123abcd ", false},
      {"Basic 0123abcd", false},
      {"0123abcd", false},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.authorization);
    EXPECT_EQ(c.accepted, token.Accepts(c.authorization));
  }
}

TEST(AccessToken, MissingOrEmptyTokenFileAcceptsNothing) {
  TempDeviceRoot scratch;
  scratch.WriteFile("/empty", " \n", 0600);
  for (const char* file : {"/missing", "/empty"}) {
    SCOPED_TRACE(file);
    AccessToken token;
    std::string error;
    EXPECT_FALSE(token.LoadFromFile(scratch.Path(file), &error));
    EXPECT_NE(std::string::npos, error.find(scratch.Path(file)));
    EXPECT_FALSE(token.Accepts("Bearer "));
    EXPECT_FALSE(token.Accepts("Bearer x"));
  }
}

TEST(RequestParsing, TakesTheCallFromQueryAndFormFields) {
  httplib::Request request;
  request.params.emplace("api", "ORVA.Core.Certificate");
  request.params.emplace("method", "list");
  request.params.emplace("additional", "[\"valid_from\"]");
  request.files.emplace("type", Part("type", "server_cert"));
  request.files.emplace("inter", Part("inter", "", "", "application/octet-stream"));
  TemporaryUploads uploads;
  WebapiCall call;
  ASSERT_EQ(0, ParseWebapiRequest(request, &uploads, &call));
  EXPECT_EQ("ORVA.Core.Certificate", call.api);
  EXPECT_EQ("list", call.method);
  EXPECT_EQ(1, call.version);
  Json::Value expected(Json::objectValue);
  expected["additional"] = "[\"valid_from\"]";
  expected["type"] = "server_cert";
  EXPECT_EQ(expected, call.params) << "no reserved names, no empty file input";
}

TEST(RequestParsing, RefusesMalformedRequestsBeforeSavingAnything) {
  struct Case {
    const char* what;
    std::vector<std::pair<std::string, std::string>> params;
    std::vector<httplib::MultipartFormData> parts;
    int status;
  } cases[] = {
      {"no api", {{"method", "list"}}, {}, 400},
      {"no method", {{"api", "A"}}, {}, 400},
      {"version not a number", {{"api", "A"}, {"method", "m"}, {"version", "1x"}}, {}, 400},
      {"version empty", {{"api", "A"}, {"method", "m"}, {"version", ""}}, {}, 400},
      {"version too long", {{"api", "A"}, {"method", "m"}, {"version", "1234567890"}}, {}, 400},
      {"client names a file", {{"api", "A"}, {"method", "m"}, {"cert_tmp", "/etc/passwd"}}, {}, 400},
      {"client names a file in a form field", {{"api", "A"}, {"method", "m"}},
       {Part("key_tmp", "/etc/shadow")}, 400},
      {"upload named like a host file", {{"api", "A"}, {"method", "m"}},
       {Part("cert_tmp", "x", "a.pem")}, 400},
      {"upload named like the api", {{"api", "A"}, {"method", "m"}},
       {Part("api", "x", "a.pem")}, 400},
      {"parameter given twice", {{"api", "A"}, {"method", "m"}, {"type", "a"}, {"type", "b"}}, {}, 400},
      {"query and form both", {{"api", "A"}, {"method", "m"}}, {Part("api", "B")}, 400},
      {"upload beside a field of its name", {{"api", "A"}, {"method", "m"}, {"cert", "x"}},
       {Part("cert", "x", "a.pem")}, 400},
      {"empty name", {{"api", "A"}, {"method", "m"}, {"", "x"}}, {}, 400},
  };
  TempDeviceRoot scratch;
  UploadFolder folder(scratch.Path("/uploads"));
  for (const Case& c : cases) {
    SCOPED_TRACE(c.what);
    httplib::Request request;
    for (const auto& param : c.params) request.params.emplace(param.first, param.second);
    for (const auto& part : c.parts) request.files.emplace(part.name, part);
    request.files.emplace("later", Part("later", "content", "later.pem"));
    TemporaryUploads uploads;
    WebapiCall call;
    EXPECT_EQ(c.status, ParseWebapiRequest(request, &uploads, &call));
    EXPECT_EQ(0, CountFiles(folder.path())) << "nothing saved before the refusal";
  }
}

TEST(CallOrder, ListCallsShareTheLockButQueueBehindAWaitingWriter) {
  CallOrder order;
  std::vector<std::string> finished;
  std::mutex finished_mutex;
  auto record = [&](const std::string& who) {
    std::lock_guard<std::mutex> lock(finished_mutex);
    finished.push_back(who);
  };
  auto first_reader = std::make_unique<CallOrder::Turn>(&order, "ORVA.Core.Certificate", "list");
  {
    // A second "list" gets in beside the first one.
    CallOrder::Turn second(&order, "ORVA.Core.Certificate", "list");
  }
  std::thread writer([&] {
    CallOrder::Turn turn(&order, "ORVA.Core.Certificate", "import");
    record("writer");
  });
  std::this_thread::sleep_for(std::chrono::milliseconds(100));
  std::thread late_reader([&] {
    CallOrder::Turn turn(&order, "ORVA.Core.Certificate", "list");
    record("late reader");
  });
  std::this_thread::sleep_for(std::chrono::milliseconds(100));
  {
    std::lock_guard<std::mutex> lock(finished_mutex);
    EXPECT_TRUE(finished.empty()) << "both wait for the first reader";
  }
  first_reader.reset();
  writer.join();
  late_reader.join();
  ASSERT_EQ(2u, finished.size());
  EXPECT_EQ("writer", finished[0]) << "a waiting writer goes before later readers";
  EXPECT_TRUE(CallOrder::IsSharedCall("ORVA.Core.Certificate", "list"));
  EXPECT_FALSE(CallOrder::IsSharedCall("ORVA.Core.Certificate.CSR", "list"));
}
