// The host's parts whose edge cases a running server cannot reach cheaply.

#include <chrono>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

#include "host/access_token.h"
#include "host/api_call.h"
#include "host/call_order.h"
#include "host/listen_address.h"
#include "host/request_parsing.h"
#include "host/temporary_uploads.h"
#include "tests/support/test_support.h"

TEST(ListenAddress, ParsesHostAndPortAndRefusesAnythingElse) {
  struct Case {
    const char* text;
    const char* host;  // null when refused
    int port;
  } cases[] = {
      {"127.0.0.1:8080", "127.0.0.1", 8080}, {"[::1]:65535", "::1", 65535},
      {"localhost:65536", nullptr, 0},       {"localhost:80a", nullptr, 0},
      {"localhost:", nullptr, 0},            {"::1:8080", nullptr, 0},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.text);
    ListenAddress address{"unchanged", 7};
    ASSERT_EQ(c.host != nullptr, ParseListenAddress(c.text, &address));
    EXPECT_EQ(c.host != nullptr ? c.host : "unchanged", address.host);
    EXPECT_EQ(c.host != nullptr ? c.port : 7, address.port);
  }
  EXPECT_EQ("https://[::1]:8443/", ListenUrl("https", "::1", 8443, "/"));
}

TEST(AccessToken, AcceptsOnlyTheBearerOfTheExactToken) {
  TempDeviceRoot scratch;
  scratch.WriteFile("/token", "  0123abcd\n", 0600);
  scratch.WriteFile("/empty", " \n", 0600);
  AccessToken token;
  std::string error;
  ASSERT_TRUE(token.LoadFromFile(scratch.Path("/token"), &error)) << error;
  for (const char* accepted : {"Bearer 0123abcd", "bearer 0123abcd", "BEARER 0123abcd"}) {
    EXPECT_TRUE(token.Accepts(accepted)) << accepted;
  }
  for (const char* refused : {"", "Bearer ", "Bearer 0123abc", "Bearer 0123abcdd",
                              "Bearer 0123ABCD", "Bearer  0123abcd", "Bearer 0123abcd ",
                              "Basic 0123abcd", "0123abcd"}) {
    EXPECT_FALSE(token.Accepts(refused)) << refused;
  }

  for (const char* file : {"/missing", "/empty"}) {
    SCOPED_TRACE(file);
    AccessToken none;
    EXPECT_FALSE(none.LoadFromFile(scratch.Path(file), &error));
    EXPECT_NE(std::string::npos, error.find(scratch.Path(file)));
    EXPECT_FALSE(none.Accepts("Bearer ")) << "no token file accepts nothing";
  }
}

TEST(RequestParsing, RefusesMalformedRequestsWith400) {
  struct Case {
    const char* what;
    std::vector<std::pair<std::string, std::string>> params;
    std::vector<httplib::MultipartFormData> parts;
  } cases[] = {
      {"no method", {{"api", "A"}}, {}},
      {"version not a number", {{"api", "A"}, {"method", "m"}, {"version", "1x"}}, {}},
      {"version too long", {{"api", "A"}, {"method", "m"}, {"version", "1234567890"}}, {}},
      {"client names a file", {{"api", "A"}, {"method", "m"}, {"cert_tmp", "/etc/passwd"}}, {}},
      {"client names a file in a form field", {{"api", "A"}, {"method", "m"}},
       {{"key_tmp", "/etc/shadow", "", ""}}},
      {"upload named like a host file", {{"api", "A"}, {"method", "m"}},
       {{"cert_tmp", "x", "a.pem", ""}}},
      {"upload named like the api", {{"api", "A"}, {"method", "m"}}, {{"api", "x", "a.pem", ""}}},
      {"parameter given twice", {{"api", "A"}, {"method", "m"}, {"type", "a"}, {"type", "b"}}, {}},
      {"query and form both", {{"api", "A"}, {"method", "m"}}, {{"api", "B", "", ""}}},
      {"upload beside a field of its name", {{"api", "A"}, {"method", "m"}, {"cert", "x"}},
       {{"cert", "x", "a.pem", ""}}},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.what);
    httplib::Request request;
    for (const auto& param : c.params) request.params.emplace(param.first, param.second);
    for (const auto& part : c.parts) request.files.emplace(part.name, part);
    TemporaryUploads uploads;
    WebapiCall call;
    EXPECT_EQ(400, ParseWebapiRequest(request, &uploads, &call));
  }
}

TEST(OneLineJson, ReplacesEveryByteOutsideWellFormedUtf8) {
  const std::string kReplacement = "\xEF\xBF\xBD";
  struct Case {
    const char* text;
    std::string json;  // between the quotes
  } cases[] = {
      {"Z\xC3\xBCrich \xE2\x82\xAC \xF0\x9F\x98\x80", "Z\xC3\xBCrich \xE2\x82\xAC \xF0\x9F\x98\x80"},
      {"caf\xE9!", "caf" + kReplacement + "!"},
      {"a\xC3(b", "a" + kReplacement + "(b"},         // lead byte without its follower
      {"\xC0\xAF", kReplacement + kReplacement},        // overlong "/"
      {"\xED\xA0\x80", kReplacement + kReplacement + kReplacement},  // a surrogate
      {"\xF4\x90\x80\x80", kReplacement + kReplacement + kReplacement + kReplacement},
      {"end\xE2\x82", "end" + kReplacement + kReplacement},  // cut short
      {"\x80\tq\"", kReplacement + "\\tq\\\""},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.text);
    Json::Value object(Json::objectValue);
    object["k"] = c.text;
    EXPECT_EQ("{\"k\":\"" + c.json + "\"}", ToOneLineJson(object));
  }
}

TEST(CallOrder, ListCallsShareTheLockAndEveryCallStartsInTheOrderItCame) {
  CallOrder order;
  std::vector<std::string> finished;
  std::mutex finished_mutex;
  auto record = [&](const char* who) {
    std::lock_guard<std::mutex> lock(finished_mutex);
    finished.push_back(who);
  };
  auto first_reader = std::make_unique<CallOrder::Turn>(&order, "ORVA.Core.Certificate", "list");
  { CallOrder::Turn second_reader(&order, "ORVA.Core.Certificate", "list"); }
  // Only the certificate list shares the lock: "list" of another api writes.
  std::thread writer([&] {
    CallOrder::Turn turn(&order, "ORVA.Core.Certificate.CSR", "list");
    record("writer");
  });
  std::this_thread::sleep_for(std::chrono::milliseconds(100));
  std::thread late_reader([&] {
    CallOrder::Turn turn(&order, "ORVA.Core.Certificate", "list");
    record("late reader");
  });
  std::this_thread::sleep_for(std::chrono::milliseconds(100));
  std::thread late_writer([&] {
    CallOrder::Turn turn(&order, "ORVA.Core.Certificate.CRT", "create");
    record("late writer");
  });
  std::this_thread::sleep_for(std::chrono::milliseconds(100));
  record("first reader");
  first_reader.reset();
  writer.join();
  late_reader.join();
  late_writer.join();
  // A waiting writer goes before later readers, and a reader waiting behind
  // it goes before later writers: neither kind can hold the other off.
  EXPECT_EQ((std::vector<std::string>{"first reader", "writer", "late reader", "late writer"}),
            finished);
}
