// Sixteen clients change and read the certificate store over HTTP at the
// same time, each making every kind of call once; every call succeeds, and
// the store and the server are sound afterwards.

#include <signal.h>

#include <functional>
#include <mutex>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include <gtest/gtest.h>

#include "tests/host/serve_process.h"
#include "tests/support/method_calls.h"
#include "tests/support/store_state.h"

namespace {

using Call = std::function<httplib::Result(httplib::Client&)>;

// Every kind of call, with the smallest keys the tool makes.
std::vector<std::pair<const char*, Call>> Calls(const TempDeviceRoot& root) {
  auto post = [](auto form) {
    return Call([form](httplib::Client& client) { return client.Post("/webapi", form); });
  };
  auto get = [](std::string query) {
    return Call([query](httplib::Client& client) { return client.Get(query.c_str()); });
  };
  httplib::Params crt = {{"api", "ORVA.Core.Certificate.CRT"}, {"method", "create"},
                         {"key_length", "2048"}, {"ca_key_length", "2048"}};
  httplib::Params csr = {{"api", "ORVA.Core.Certificate.CSR"}, {"method", "create"},
                         {"key_length", "2048"}};
  for (const char* prefix : {"", "ca_"}) {
    const Json::Value subject = SubjectParams(prefix);
    for (const std::string& name : subject.getMemberNames()) {
      crt.emplace(name, subject[name].asString());
      if (*prefix == '\0') csr.emplace(name, subject[name].asString());
    }
  }
  const std::string outside = root.Path("/outside/");
  return {
      {"CRT create", post(crt)},
      {"CSR create", post(csr)},
      {"import", post(ImportForm(ReadFile(outside + "server.crt"), ReadFile(outside + "server.key"),
                                 ReadFile(outside + "server-ca.crt")))},
      {"sign", post(httplib::MultipartFormDataItems{
                   {"api", "ORVA.Core.Certificate.CSR", "", ""},
                   {"method", "sign", "", ""},
                   {"days", "30", "", ""},
                   {"csr", ReadFile(outside + "request.csr"), "request.csr", ""}})},
      {"export", get("/webapi?api=ORVA.Core.Certificate&method=export&file=archive")},
      {"list", get(kListQuery)},
  };
}

// Empty when `result` is a success (for an export, the archive), else what
// is wrong.
std::string Misanswer(const httplib::Result& result) {
  if (!result) return "no answer: " + httplib::to_string(result.error());
  if (result->status != 200) return "HTTP " + std::to_string(result->status) + " " + result->body;
  if (result->get_header_value("Content-Type") == "application/zip") {
    const bool whole = result->body.rfind("PK\x03\x04", 0) == 0 &&
                       result->get_header_value("content-disposition") ==
                           "attachment; filename=\"archive.zip\"";
    return whole ? "" : "not a ZIP download";
  }
  return ParseJson(result->body)["success"].asBool() ? "" : result->body;
}

}  // namespace

TEST_F(ServeTest, SixteenClientsMixingEveryMethodLeaveASoundStoreAndServer) {
  ASSERT_NO_FATAL_FAILURE(InstallOldStore(scratch_));
  // Every installed set then also has nginx test the store's pair (keys
  // this small it refuses).
  scratch_.WriteFile("/usr/orva/etc/orva.conf", "runHTTPS=\"yes\"\n");
  const StoreState before = ReadStore(scratch_);
  ServeProcess server(scratch_.root());
  ASSERT_TRUE(server.started()) << server.Log();
  const auto calls = Calls(scratch_);
  std::mutex misanswers_mutex;
  std::vector<std::string> misanswers;
  std::vector<std::thread> clients;
  for (size_t client_number = 0; client_number < 16; ++client_number) {
    clients.emplace_back([&, client_number] {
      httplib::Client client = server.AuthorizedClient();
      // Each client starts at another kind and takes them in turn.
      for (size_t i = client_number; i < client_number + calls.size(); ++i) {
        const auto& call = calls[i % calls.size()];
        const std::string wrong = Misanswer(call.second(client));
        std::lock_guard<std::mutex> lock(misanswers_mutex);
        if (!wrong.empty()) misanswers.push_back(std::string(call.first) + ": " + wrong);
      }
    });
  }
  for (std::thread& client : clients) client.join();
  for (const std::string& misanswer : misanswers) ADD_FAILURE() << misanswer;

  auto listed = server.AuthorizedClient().Get(kListQuery);
  ASSERT_TRUE(listed) << "the server still answers";
  EXPECT_EQ("server_cert", ParseJson(listed->body)["data"]["certificates"][0]["type"].asString())
      << listed->body;
  for (const char* file : {"/ssl.key/server.key", "/ssl.crt/server.crt", "/ssl.key/ca.key"}) {
    EXPECT_TRUE(FileExists(scratch_.Path(kStore + std::string(file)))) << file;
  }
  ExpectStoreWhole(scratch_, before);
  EXPECT_EQ(0, CountFiles(server.UploadFolder())) << "uploads are removed after each call";
  EXPECT_EQ(0, server.Stop(SIGTERM)) << "a clean stop";
  for (const char* report : {"Sanitizer", "runtime error"}) {
    EXPECT_EQ(std::string::npos, server.Log().find(report)) << server.Log();
  }
}
