// Hostile input in every parameter and uploaded file name, over HTTP to the
// real server and certificate module. The device root lies in a folder
// whose name is itself a shell payload, so every path on every command line
// carries one; the device's openssl and 7z are stand-ins that log the words
// they were given and run the real tools.

#include <unistd.h>

#include <algorithm>
#include <filesystem>
#include <sstream>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "host/device_root_init.h"
#include "tests/host/serve_process.h"
#include "tests/support/certificates.h"

namespace {

constexpr char kMarker[] = "orva-hostile-marker";
constexpr char kHostileFolder[] = "/it's $(touch orva-hostile-marker)\n`touch orva-hostile-marker`;#";

// Texts that make the marker wherever a shell meets them unquoted, and a
// text that is not UTF-8. The first five hold no control character.
std::vector<std::string> HostileValues() {
  const std::string touch = std::string("touch ") + kMarker;
  return {"'$(" + touch + ")'", "`" + touch + "`", ";" + touch + ";", "'; " + touch + "; '",
          "\"$(" + touch + ")\\';#%s%n", "\n" + touch + "\n", std::string("x\0;", 3) + touch,
          "caf\xE9 \xFF\xFE \xC0\xAF \xED\xA0\x80"};
}

constexpr char kSubjects[] =
    "ca_state ca_city ca_organization ca_department ca_common_name ca_email "
    "state city organization department common_name email";

// A method and where the hostile value goes: the text fields named in
// `texts`, and the client file names of the uploads named in `uploads`
// when `hostile_names` is set. When a method that `makes_server_subject`
// succeeds, the value is the server's subject.
const struct Method {
  const char* api;
  const char* method;
  const char* texts;
  const char* uploads;
  bool hostile_names;
  bool makes_server_subject;
} kMethods[] = {
    {"ORVA.Core.Certificate", "import", "", "cert key inter_cert", true, false},
    {"ORVA.Core.Certificate", "list", "type additional", "", false, false},
    {"ORVA.Core.Certificate", "export", "file", "", false, false},
    {"ORVA.Core.Certificate.CSR", "create", "country", "", false, false},
    {"ORVA.Core.Certificate.CSR", "create", "state city organization department common_name email",
     "", false, false},
    {"ORVA.Core.Certificate.CSR", "sign", "", "csr", true, false},
    {"ORVA.Core.Certificate.CSR", "sign", "alias", "csr", false, false},
    {"ORVA.Core.Certificate.CRT", "create", "country ca_country", "", false, false},
    {"ORVA.Core.Certificate.CRT", "create", "alias", "", false, false},
    {"ORVA.Core.Certificate.CRT", "create", kSubjects, "", false, true},
    {"ORVA.Core.Certificate.CSR", "renew", "", "", false, false},  // the subject just made
};

// The parts of `text` that `separator` divides or ends.
std::vector<std::string> Split(const std::string& text, char separator) {
  std::vector<std::string> parts;
  std::istringstream stream(text);
  for (std::string part; std::getline(stream, part, separator);) parts.push_back(part);
  return parts;
}

// Sends `method` with `value` in its hostile places (in the first
// `mostTexts` of its text fields), urlencoded when it has no uploads and
// `urlencoded` is set. Returns the answer, which must be JSON that tells
// success or failure.
Json::Value Call(const ServeProcess& server, const std::string& fixtures, const Method& method,
                 const std::string& value, bool urlencoded, size_t mostTexts = 100) {
  httplib::Params fields = {{"api", method.api}, {"method", method.method}, {"days", "30"},
                            {"key_length", "2048"}, {"ca_key_length", "2048"},
                            {"alias", "nas.local"}, {"country", "TW"}, {"ca_country", "TW"}};
  for (const std::string& field : Split(kSubjects, ' ')) fields.emplace(field, "hostile.local");
  const std::vector<std::string> texts = Split(method.texts, ' ');
  for (size_t i = 0; i < texts.size() && i < mostTexts; ++i) {
    fields.erase(texts[i]);
    fields.emplace(texts[i], value);
  }
  httplib::MultipartFormDataItems form;
  for (const auto& field : fields) form.push_back({field.first, field.second, "", ""});
  for (const std::string& name : Split(method.uploads, ' ')) {
    form.push_back({name, ReadFile(fixtures + name), method.hostile_names ? value : name, ""});
  }
  httplib::Client client = server.AuthorizedClient();
  auto result = urlencoded && *method.uploads == '\0' ? client.Post("/webapi", fields)
                                                     : client.Post("/webapi", form);
  if (!result) {
    ADD_FAILURE() << "no answer: " << httplib::to_string(result.error());
    return Json::Value();
  }
  Json::Value answer = ParseJson(result->body);
  EXPECT_TRUE(answer["success"].isBool()) << result->status << " " << result->body;
  return answer;
}

}  // namespace

TEST_F(ServeTest, NoHostileValueReachesAShellAndEveryArgumentArrivesWhole) {
  const std::string root = scratch_.Path(kHostileFolder);
  std::string error;
  ASSERT_TRUE(InitDeviceRoot(root, &error)) << error;
  for (const char* tool : {"openssl", "7z"}) {
    scratch_.WriteScript(std::string(kHostileFolder) + "/usr/orva/bin/" + tool,
                         std::string("{ printf '%s\\037' ") + tool +
                             "; for word in \"$@\"; do printf '%s\\037' \"$word\"; done;"
                             " printf '\\036'; } >> '" + scratch_.Path("/runs") +
                             "'\nexec /usr/bin/" + tool + " \"$@\"");
  }
  const std::string fixtures = scratch_.Path("/fixtures/");
  ASSERT_TRUE(MakeSelfSignedCa(fixtures + "ca.key", fixtures + "inter_cert", "/CN=Root"));
  ASSERT_TRUE(MakeSignedCertificate(fixtures + "ca.key", fixtures + "inter_cert",
                                    fixtures + "key", fixtures + "cert", "/CN=srv.local"));
  ASSERT_TRUE(MakeRequest(fixtures + "request.key", fixtures + "csr", "/CN=client.local"));
  unlink(kMarker);  // left by an earlier faulty run, if any
  ServeProcess server(root);
  ASSERT_TRUE(server.started()) << server.Log();
  const std::vector<std::string> values = HostileValues();
  int whole_subjects = 0;
  for (size_t i = 0; i < values.size(); ++i) {
    for (const Method& method : kMethods) {
      SCOPED_TRACE(testing::Message() << method.method << " (" << method.texts << "), value " << i);
      Json::Value answer = Call(server, fixtures, method, values[i], i % 2 == 0);
      // A file name is only text to the module; no multipart header holds a line break.
      if (method.method == std::string("import") && values[i].find('\n') == std::string::npos) {
        EXPECT_TRUE(answer["success"].asBool()) << "an import under any file names";
      }
      if (!method.makes_server_subject || answer["success"] != true) continue;
      auto listed = server.AuthorizedClient().Get(
          "/webapi?api=ORVA.Core.Certificate&method=list&type=server_cert");
      ASSERT_TRUE(listed);
      EXPECT_EQ(values[i], ParseJson(listed->body)["data"]["certificates"][0]["subject"]
                                                  ["common_name"].asString());
      ++whole_subjects;
    }
  }
  EXPECT_EQ(5, whole_subjects) << "each value without control characters, in UTF-8";
  // The body limit (4 MiB) leaves room for three such values in one call.
  const std::string big = values[0] + std::string(1024 * 1024, 'a');
  for (const Method& method : kMethods) {
    SCOPED_TRACE(std::string(method.method) + " with 1 MiB values");
    if (*method.texts == '\0') continue;
    Call(server, fixtures, method, big, method.method == std::string("list"), 3);
  }
  auto exported = server.AuthorizedClient().Get(
      "/webapi?api=ORVA.Core.Certificate&method=export&file=archive");
  ASSERT_TRUE(exported);
  EXPECT_EQ(0u, exported->body.rfind("PK\x03\x04", 0)) << exported->body;

  std::error_code walk_error;
  for (const auto& entry :
       std::filesystem::recursive_directory_iterator(scratch_.root(), walk_error)) {
    EXPECT_NE(kMarker, entry.path().filename().string()) << entry.path();
  }
  EXPECT_FALSE(FileExists(kMarker)) << "a shell ran a value in the server's folder";
  // A word cut out of a path or a value holds a piece of a payload without
  // the device root before it.
  const std::vector<std::string> runs = Split(ReadFile(scratch_.Path("/runs")), '\036');
  int archiver_runs = 0;
  for (const std::string& run : runs) {
    const std::vector<std::string> words = Split(run, '\037');
    archiver_runs += words[0] == "7z";
    for (size_t w = 1; w < words.size(); ++w) {
      const std::string& word = words[w];
      EXPECT_TRUE(word.rfind(root + "/", 0) == 0 ||
                  (!word.empty() && word.find_first_of("'$`;#\n") == std::string::npos &&
                   word.find(kMarker) == std::string::npos))
          << "word " << w << " of a " << words[0] << " run: " << word;
    }
  }
  EXPECT_GT(runs.size(), 50u);
  EXPECT_EQ(1, archiver_runs) << "only the last export packed";
}
