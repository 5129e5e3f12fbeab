// Hostile input over HTTP against the real server and certificate module.
// The device root lies in a folder whose name is itself a shell payload, so
// every path on every command line carries one; the device's openssl and 7z
// are stand-ins that log the words they were given and run the real tools.

#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <filesystem>
#include <future>
#include <string>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

#include "host/device_root_init.h"
#include "tests/host/serve_process.h"
#include "tests/support/certificates.h"
#include "tests/support/test_support.h"

namespace {

constexpr char kMarker[] = "orva-hostile-marker";
constexpr char kHostileFolder[] = "/it's $(touch orva-hostile-marker)\n`touch orva-hostile-marker`;#";
constexpr char kList[] = "/webapi?api=ORVA.Core.Certificate&method=list&type=server_cert";

// Texts that make the marker wherever a shell meets them unquoted, and a
// text that is not UTF-8. The first five hold no control character.
std::vector<std::string> HostileValues() {
  const std::string touch = std::string("touch ") + kMarker;
  return {"'$(" + touch + ")'", "`" + touch + "`", ";" + touch + ";", "'; " + touch + "; '",
          "\"$(" + touch + ")\\';#%s%n", "\n" + touch + "\n", std::string("x\0;", 3) + touch,
          "caf\xE9 \xFF\xFE \xC0\xAF \xED\xA0\x80"};
}

// A method and where the hostile value goes: text fields, and the client
// file names of its uploads when `hostile_names` is set. When a method that
// `makes_server_subject` succeeds, the value is the server's subject.
struct Method {
  const char* api;
  const char* method;
  std::vector<std::string> texts;
  std::vector<std::string> uploads;
  bool hostile_names;
  bool makes_server_subject;
};

const char* const kSubject[] = {"state", "city", "organization", "department",
                                "common_name", "email"};

std::vector<Method> Methods() {
  std::vector<std::string> subject(std::begin(kSubject), std::end(kSubject)), both;
  for (const char* field : kSubject) both.push_back(std::string("ca_") + field);
  both.insert(both.end(), subject.begin(), subject.end());
  return {
      {"ORVA.Core.Certificate", "import", {}, {"cert", "key", "inter_cert"}, true, false},
      {"ORVA.Core.Certificate", "list", {"type", "additional"}, {}, false, false},
      {"ORVA.Core.Certificate", "export", {"file"}, {}, false, false},
      {"ORVA.Core.Certificate.CSR", "create", {"country"}, {}, false, false},
      {"ORVA.Core.Certificate.CSR", "create", subject, {}, false, false},
      {"ORVA.Core.Certificate.CSR", "sign", {}, {"csr"}, true, false},
      {"ORVA.Core.Certificate.CSR", "sign", {"alias"}, {"csr"}, false, false},
      {"ORVA.Core.Certificate.CRT", "create", {"country", "ca_country"}, {}, false, false},
      {"ORVA.Core.Certificate.CRT", "create", {"alias"}, {}, false, false},
      {"ORVA.Core.Certificate.CRT", "create", both, {}, false, true},
      {"ORVA.Core.Certificate.CSR", "renew", {}, {}, false, false},  // the subject just made
  };
}

class ServeHostileInputTest : public testing::Test {
 protected:
  void SetUp() override {
    std::string error;
    ASSERT_TRUE(InitDeviceRoot(root_, &error)) << error;
    for (const char* tool : {"openssl", "7z"}) {
      scratch_.WriteScript(std::string(kHostileFolder) + "/usr/orva/bin/" + tool,
                           std::string("{ printf '%s\\037' ") + tool +
                               "; for word in \"$@\"; do printf '%s\\037' \"$word\"; done;"
                               " printf '\\036'; } >> '" + scratch_.Path("/runs") +
                               "'\nexec /usr/bin/" + tool + " \"$@\"");
    }
    const std::string fixtures = scratch_.Path("/fixtures/");
    ASSERT_TRUE(MakeSelfSignedCa(fixtures + "ca.key", fixtures + "inter_cert", "/CN=Root", 1024));
    ASSERT_TRUE(MakeSignedCertificate(fixtures + "ca.key", fixtures + "inter_cert",
                                      fixtures + "key", fixtures + "cert", "/CN=srv.local", 1024));
    ASSERT_TRUE(MakeRequest(fixtures + "request.key", fixtures + "csr", "/CN=client.local", 1024));
  }

  std::string Fixture(const std::string& name) const {
    return ReadFile(scratch_.Path("/fixtures/" + name));
  }

  // The runs of the stand-ins so far, each as its words (tool name first).
  std::vector<std::vector<std::string>> ToolRuns() const {
    std::vector<std::vector<std::string>> runs;
    std::string log = ReadFile(scratch_.Path("/runs"));
    for (size_t start = 0, end; (end = log.find('\036', start)) != std::string::npos;
         start = end + 1) {
      runs.emplace_back();
      for (size_t word = start, stop; (stop = log.find('\037', word)) < end; word = stop + 1) {
        runs.back().push_back(log.substr(word, stop - word));
      }
    }
    return runs;
  }

  // Sends `method` with `value` in its hostile places (urlencoded when it
  // has no uploads and `urlencoded` is set) and expects the module's answer
  // or the host's documented refusal. Returns the answer.
  Json::Value Call(const ServeProcess& server, const Method& method, const std::string& value,
                   bool urlencoded) {
    httplib::Params fields = {{"api", method.api}, {"method", method.method}, {"days", "30"},
                              {"key_length", "1024"}, {"ca_key_length", "1024"},
                              {"alias", "nas.local"}, {"country", "TW"}, {"ca_country", "TW"}};
    for (const char* field : kSubject) {
      fields.emplace(field, "hostile.local");
      fields.emplace(std::string("ca_") + field, "hostile.local");
    }
    for (const std::string& name : method.texts) {
      fields.erase(name);
      fields.emplace(name, value);
    }
    httplib::MultipartFormDataItems form;
    for (const auto& field : fields) form.push_back({field.first, field.second, "", ""});
    for (const std::string& name : method.uploads) {
      form.push_back({name, Fixture(name), method.hostile_names ? value : name + ".pem", ""});
    }
    urlencoded = urlencoded && method.uploads.empty();
    httplib::Client client = server.AuthorizedClient();
    auto result = urlencoded ? client.Post("/webapi", fields) : client.Post("/webapi", form);
    if (!result) {
      ADD_FAILURE() << "no answer: " << httplib::to_string(result.error());
      return Json::Value();
    }
    Json::Value answer = ParseJson(result->body);
    // Refusals in the README: an urlencoded form over 8 KiB; a file name
    // with a line break, which no multipart header can hold; an export of no
    // set, which the module leaves unanswered.
    int refusal = urlencoded && value.size() > 8192 ? 413
                  : method.hostile_names && value.find('\n') != value.npos ? 400
                  : std::string(method.method) == "export" ? 500 : 0;
    int code = answer["error"]["code"].asInt();
    EXPECT_EQ(refusal == 0 ? 200 : refusal, result->status) << result->body;
    EXPECT_TRUE(refusal != 0 ? answer == HostError(refusal)
                             : answer["success"] == true || (answer["success"] == false &&
                                                             code >= 5501 && code <= 5519))
        << result->body;
    return answer;
  }

  TempDeviceRoot scratch_;
  const std::string root_ = scratch_.Path(kHostileFolder);
};

}  // namespace

TEST_F(ServeHostileInputTest, NoValueReachesAShellAndEveryPathReachesTheToolsWhole) {
  unlink(kMarker);  // left by an earlier faulty run, if any
  ServeProcess server(root_);
  ASSERT_TRUE(server.started()) << server.Log();
  const std::vector<std::string> values = HostileValues();
  int whole_subjects = 0;
  for (size_t i = 0; i < values.size(); ++i) {
    for (const Method& method : Methods()) {
      SCOPED_TRACE(testing::Message() << method.method << " " << method.texts.size()
                                      << " texts, value " << i);
      Json::Value answer = Call(server, method, values[i], i % 2 == 0);
      if (!method.makes_server_subject || answer["success"] != true) continue;
      auto listed = server.AuthorizedClient().Get(kList);
      ASSERT_TRUE(listed);
      EXPECT_EQ(values[i], ParseJson(listed->body)["data"]["certificates"][0]["subject"]
                                                  ["common_name"].asString());
      ++whole_subjects;
    }
  }
  EXPECT_EQ(5, whole_subjects) << "each value without control characters, in UTF-8";
  // The body limit (4 MiB) leaves room for three such values in one call.
  const std::string big = values[0] + std::string(1024 * 1024, 'a');
  for (Method method : Methods()) {
    SCOPED_TRACE(std::string(method.method) + " with 1 MiB values");
    method.texts.resize(std::min<size_t>(3, method.texts.size()));
    if (!method.texts.empty()) Call(server, method, big, method.method == std::string("list"));
  }
  auto exported = server.AuthorizedClient().Get(
      "/webapi?api=ORVA.Core.Certificate&method=export&file=archive");
  ASSERT_TRUE(exported);
  EXPECT_EQ(0u, exported->body.rfind("PK\x03\x04", 0)) << exported->body;

  std::error_code error;
  for (const auto& entry : std::filesystem::recursive_directory_iterator(scratch_.root(), error)) {
    EXPECT_NE(kMarker, entry.path().filename().string()) << entry.path();
  }
  EXPECT_FALSE(FileExists(kMarker)) << "a shell ran a value in the server's folder";
  std::vector<std::vector<std::string>> runs = ToolRuns();
  for (const std::vector<std::string>& run : runs) {
    for (size_t w = 1; w < run.size(); ++w) {
      const std::string& word = run[w];
      bool number = !word.empty() && word.find_first_not_of("0123456789") == std::string::npos;
      bool whole = number || word[0] == '-' || word == "genrsa" || word == "req" ||
                   word == "x509" || word == "rsa" || word == "md5" || word == "a" ||
                   word.rfind(root_ + "/", 0) == 0 || (run[w - 1] == "-rand" && word[0] == '/');
      EXPECT_TRUE(whole) << "word " << w << " of a " << run[0] << " run: " << word;
    }
  }
  EXPECT_GT(runs.size(), 50u);
  EXPECT_EQ(1, std::count_if(runs.begin(), runs.end(), [](auto& run) { return run[0] == "7z"; }));
}

TEST_F(ServeHostileInputTest, ListShowsACertificateNameThatIsNotUtf8AsValidUtf8) {
  scratch_.WriteFile("/fixtures/t61.cnf", "[req]\ndistinguished_name=dn\nstring_mask=default\n[dn]\n");
  // Latin-1 bytes, kept as they stand in a T61String.
  ASSERT_TRUE(RunForTest("openssl req -x509 -newkey rsa:1024 -nodes -keyout '" +
                         scratch_.Path("/fixtures/t61.key") + "' -out '" +
                         scratch_.Path("/fixtures/t61.crt") + "' -config '" +
                         scratch_.Path("/fixtures/t61.cnf") + "' -subj '/CN=caf\xE9 \xFF'"));
  scratch_.WriteFile(std::string(kHostileFolder) + "/usr/orva/etc/ssl/ssl.crt/server.crt",
                     Fixture("t61.crt"));
  ServeProcess server(root_);
  ASSERT_TRUE(server.started()) << server.Log();
  auto listed = server.AuthorizedClient().Get(kList);
  ASSERT_TRUE(listed);
  EXPECT_NE(std::string::npos,
            listed->body.find("\"subject\":{\"common_name\":\"caf\xEF\xBF\xBD \xEF\xBF\xBD\"}"))
      << listed->body;
  EXPECT_TRUE(ParseJson(listed->body)["success"].asBool());
}

TEST_F(ServeHostileInputTest, ClientSentTmpNamesNeverReachTheModule) {
  ServeProcess server(root_);
  ASSERT_TRUE(server.started()) << server.Log();
  httplib::Client client = server.AuthorizedClient();
  const std::string cert = scratch_.Path("/fixtures/cert");
  const std::string key = scratch_.Path("/fixtures/key");
  const std::string import = "/webapi?api=ORVA.Core.Certificate&method=import";
  struct Case {
    const char* what;
    httplib::Result result;
    int code;  // the host's status, or the module's code
  } cases[] = {
      {"urlencoded", client.Post("/webapi", httplib::Params{{"api", "ORVA.Core.Certificate"},
                                                            {"method", "import"},
                                                            {"cert_tmp", cert},
                                                            {"key_tmp", key}}), 400},
      {"form fields", client.Post(import.c_str(), httplib::MultipartFormDataItems{
                                                      {"cert_tmp", cert, "", ""},
                                                      {"key_tmp", key, "", ""}}), 400},
      {"NUL after the name",
       client.Get((import + "&cert_tmp%00=" + cert + "&key_tmp%00=" + key).c_str()), 5503},
      {"other case", client.Get((import + "&CERT_TMP=" + cert + "&key_TMP=" + key).c_str()), 5503},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.what);
    ASSERT_TRUE(c.result);
    EXPECT_EQ(c.code == 400 ? 400 : 200, c.result->status);
    EXPECT_EQ(HostError(c.code), ParseJson(c.result->body));
  }
  EXPECT_TRUE(ToolRuns().empty()) << "nothing ran";
  EXPECT_FALSE(FileExists(root_ + "/usr/orva/etc/ssl/ssl.crt/server.crt"));
}

TEST_F(ServeHostileInputTest, ClientsThatStallAreCutOffWhileOthersAreServed) {
  ServeProcess server(root_);
  ASSERT_TRUE(server.started()) << server.Log();
  const std::string form = "POST /webapi HTTP/1.1\r\nHost: x\r\nAuthorization: Bearer " +
                           server.Token() +
                           "\r\nContent-Type: application/x-www-form-urlencoded\r\n";
  const auto start = std::chrono::steady_clock::now();
  std::future<std::string> stalled[] = {
      std::async(std::launch::async, RawExchange, server.http_port(), form + "Content-Len",
                 45000),
      std::async(std::launch::async, RawExchange, server.http_port(),
                 form + "Content-Length: 100\r\n\r\napi=ORVA.Core.Certificate.CSR&method=create",
                 45000)};
  std::this_thread::sleep_for(std::chrono::milliseconds(300));  // both connected
  auto listed = server.AuthorizedClient().Get(kList);
  ASSERT_TRUE(listed);
  EXPECT_EQ(200, listed->status);
  EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(5));
  for (std::future<std::string>& answer : stalled) {
    std::string response = answer.get();
    EXPECT_EQ(400, RawStatus(response)) << response;
    EXPECT_EQ(HostError(400), ParseJson(response.substr(response.find("\r\n\r\n") + 4)));
  }
  EXPECT_GT(std::chrono::steady_clock::now() - start, std::chrono::seconds(25))
      << "cut by the read timeout (30 s), not before";
  EXPECT_TRUE(server.AuthorizedClient().Get(kList));
  EXPECT_TRUE(ToolRuns().empty()) << "the cut request never ran";
}
