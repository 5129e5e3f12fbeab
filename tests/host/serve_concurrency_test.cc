// Sixteen clients change and read the certificate store over HTTP at the
// same time for a while; every call gets a whole answer, and the store and
// the server are sound afterwards.


#include <atomic>
#include <csignal>
#include <chrono>
#include <functional>
#include <iostream>
#include <map>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

#include "host/device_root_init.h"
#include "tests/faults/fault_support.h"
#include "tests/host/serve_process.h"
#include "tests/support/certificates.h"
#include "tests/support/test_support.h"

namespace {

constexpr int kClients = 16;
// Clients start calls for this long. The calls queued at the end add up to
// one store change per client, which on a busy machine and in the sanitizer
// build still ends the test well within a minute.
constexpr auto kRunTime = std::chrono::seconds(12);

constexpr char kCreatedName[] = "created.local";
constexpr char kImportedName[] = "imported.example";
constexpr char kInstalled[] = "{\"data\":{\"restart_httpd\":true},\"success\":true}";
constexpr char kEmptySuccess[] = "{\"data\":{},\"success\":true}";

// One kind of call the clients make, and the answer it must get.
struct CallKind {
  const char* name;
  std::function<httplib::Result(httplib::Client&)> send;
  // The exact success answer; empty for a download and for a list (whose
  // first entry must be the server certificate).
  std::string success_body;
  int refusal = 0;        // the error code the call must get instead, or 0
  bool download = false;  // the answer is the archive of the installed set
};

struct Tally {
  std::atomic<int> ran{0};
  std::atomic<int> as_meant{0};  // succeeded, or refused with its own code
};

// Adds the seven subject fields, each name after `prefix`.
void AddSubject(const char* prefix, const char* commonName, httplib::Params* form) {
  const char* fields[][2] = {{"country", "TW"},     {"state", "Taipei"},  {"city", "Neihu"},
                             {"organization", "Lab"}, {"department", "QA"},
                             {"common_name", commonName}, {"email", "admin@lab.local"}};
  for (const auto& field : fields) form->emplace(std::string(prefix) + field[0], field[1]);
}

// Empty when `result` is the answer `kind` must get, else what is wrong.
std::string Misanswer(const CallKind& kind, const httplib::Result& result) {
  if (!result) return "no answer: " + httplib::to_string(result.error());
  if (result->status != 200) return "HTTP " + std::to_string(result->status) + " " + result->body;
  if (kind.download) {
    bool zip = result->body.rfind("PK\x03\x04", 0) == 0 &&
               result->get_header_value("content-disposition") ==
                   "attachment; filename=\"archive.zip\"";
    return zip ? "" : "not a ZIP download: " + result->body.substr(0, 200);
  }
  Json::Value answer = ParseJson(result->body);
  if (kind.refusal != 0) {
    return !answer["success"].asBool() && answer["error"]["code"].asInt() == kind.refusal
               ? ""
               : result->body;
  }
  if (!kind.success_body.empty()) return result->body == kind.success_body ? "" : result->body;
  return answer["success"].asBool() &&
                 answer["data"]["certificates"][0]["type"].asString() == "server_cert"
             ? ""
             : result->body;
}

class ServeConcurrencyTest : public testing::Test {
 protected:
  void SetUp() override {
    std::string error;
    ASSERT_TRUE(InitDeviceRoot(root_.root(), &error)) << error;
    ASSERT_NO_FATAL_FAILURE(InstallOldStore(root_));
    // Every installed set then also reloads the HTTPS listener, beside the
    // calls that follow.
    root_.WriteFile("/usr/orva/etc/orva.conf", "runHTTPS=\"yes\"\n");
    request_ = ReadFile(root_.Path("/outside/request.csr"));
    ASSERT_FALSE(request_.empty());

    const std::string work = root_.Path("/outside");
    ASSERT_TRUE(MakeSelfSignedCa(work + "/root.key", work + "/root.crt", "/CN=Outside Root", 1024));
    ASSERT_TRUE(MakeSignedCertificate(work + "/root.key", work + "/root.crt", work + "/inter.key",
                                      work + "/inter.crt", "/CN=Outside Intermediate", 1024));
    ASSERT_TRUE(MakeSignedCertificate(work + "/inter.key", work + "/inter.crt", work + "/srv.key",
                                      work + "/srv.crt", std::string("/CN=") + kImportedName,
                                      1024));
    for (const char* name : {"root.crt", "inter.key", "inter.crt", "srv.key", "srv.crt"}) {
      outside_[name] = ReadFile(work + "/" + name);
    }
  }

  std::vector<CallKind> CallKinds() {
    // The smallest keys the tool makes, so that there are many calls.
    httplib::Params crt = {{"api", "ORVA.Core.Certificate.CRT"}, {"method", "create"},
                           {"key_length", "512"}, {"ca_key_length", "512"},
                           {"alias", std::string(kCreatedName) + ";10.0.0.1"}};
    AddSubject("", kCreatedName, &crt);
    AddSubject("ca_", "Concurrent Root", &crt);
    httplib::Params csr = {{"api", "ORVA.Core.Certificate.CSR"}, {"method", "create"},
                           {"key_length", "512"}};
    AddSubject("", "pending.local", &csr);
    httplib::MultipartFormDataItems sign = {
        {"api", "ORVA.Core.Certificate.CSR", "", ""}, {"method", "sign", "", ""},
        {"days", "30", "", ""},                        {"alias", "client.local", "", ""},
        {"csr", request_, "request.csr", "application/pkcs10"}};
    auto post_form = [](httplib::Params form) {
      return [form](httplib::Client& client) { return client.Post("/webapi", form); };
    };
    auto post_multipart = [](httplib::MultipartFormDataItems form) {
      return [form](httplib::Client& client) { return client.Post("/webapi", form); };
    };
    auto get = [](std::string query) {
      return [query](httplib::Client& client) { return client.Get(query.c_str()); };
    };
    auto& o = outside_;
    return {
        {"CRT create", post_form(crt), kInstalled},
        {"CSR create", post_form(csr), kEmptySuccess},
        {"import", post_multipart(ImportForm(o["srv.crt"], o["srv.key"], o["inter.crt"])),
         kInstalled},
        {"import of a key of another pair",
         post_multipart(ImportForm(o["srv.crt"], o["inter.key"], o["inter.crt"])), "", 5514},
        {"import of a chain that does not fit",
         post_multipart(ImportForm(o["srv.crt"], o["srv.key"], o["root.crt"])), "", 5517},
        {"sign", post_multipart(sign), kEmptySuccess},
        {"export", get("/webapi?api=ORVA.Core.Certificate&method=export&file=archive"), "", 0,
         true},
        {"list", get("/webapi?api=ORVA.Core.Certificate&method=list"), ""},
    };
  }

  TempDeviceRoot root_;
  std::string request_;
  std::map<std::string, std::string> outside_;
};

}  // namespace

TEST_F(ServeConcurrencyTest, SixteenClientsMixingEveryMethodLeaveASoundStoreAndServer) {
  const StoreState before = ReadStore(root_);
  ServeProcess server(root_.root());
  ASSERT_TRUE(server.started()) << server.Log();
  ASSERT_GT(server.https_port(), 0) << server.Log();
  const std::vector<CallKind> kinds = CallKinds();
  std::vector<Tally> tallies(kinds.size());
  std::mutex misanswers_mutex;
  std::vector<std::string> misanswers;

  const auto started = std::chrono::steady_clock::now();
  std::vector<std::thread> clients;
  for (int client_number = 0; client_number < kClients; ++client_number) {
    clients.emplace_back([&, client_number] {
      httplib::Client client = server.AuthorizedClient();
      // Each client starts at another kind and takes them in turn.
      for (size_t call = client_number; std::chrono::steady_clock::now() < started + kRunTime;
           ++call) {
        const size_t index = call % kinds.size();
        std::string wrong = Misanswer(kinds[index], kinds[index].send(client));
        ++tallies[index].ran;
        if (wrong.empty()) {
          ++tallies[index].as_meant;
        } else {
          std::lock_guard<std::mutex> lock(misanswers_mutex);
          misanswers.push_back(std::string(kinds[index].name) + ": " + wrong);
        }
      }
    });
  }
  for (std::thread& client : clients) client.join();
  const double seconds =
      std::chrono::duration<double>(std::chrono::steady_clock::now() - started).count();

  std::cout << "[ counted  ] " << kClients << " clients, " << seconds << " s\n";
  for (size_t i = 0; i < kinds.size(); ++i) {
    std::cout << "[ counted  ] " << kinds[i].name << ": " << tallies[i].ran << " ran, "
              << tallies[i].as_meant << (kinds[i].refusal ? " refused as meant\n" : " succeeded\n");
    EXPECT_GT(tallies[i].ran.load(), 0) << kinds[i].name;
  }
  for (size_t i = 0; i < misanswers.size() && i < 10; ++i) ADD_FAILURE() << misanswers[i];
  EXPECT_EQ(0u, misanswers.size()) << "calls answered otherwise than they must be";

  auto listed = server.AuthorizedClient().Get("/webapi?api=ORVA.Core.Certificate&method=list");
  ASSERT_TRUE(listed) << "the server still answers";
  const Json::Value server_entry = ParseJson(listed->body)["data"]["certificates"][0];
  EXPECT_EQ("server_cert", server_entry["type"].asString()) << listed->body;
  const std::string listed_name = server_entry["subject"]["common_name"].asString();
  EXPECT_TRUE(listed_name == kCreatedName || listed_name == kImportedName) << listed_name;

  // No temporary or work file in the store; the live server pair, the CA
  // pair and the pending request pair each match.
  for (const char* file : {"ssl.key/server.key", "ssl.crt/server.crt", "ssl.key/ca.key",
                           "ssl.crt/ca.crt"}) {
    EXPECT_TRUE(FileExists(root_.Path(std::string(kStore) + "/" + file))) << file;
  }
  ExpectStoreWhole(root_, before);
  EXPECT_EQ(0, CountFiles(server.UploadFolder())) << "uploads are removed after each call";

  EXPECT_EQ(0, server.Stop(SIGTERM)) << "a clean stop";
  const std::string log = server.Log();
  for (const char* report : {"Sanitizer", "runtime error", "HTTPS listener is down"}) {
    const size_t at = log.find(report);
    EXPECT_EQ(std::string::npos, at) << log.substr(at > 1000 ? at - 1000 : 0, 4000);
  }
}
