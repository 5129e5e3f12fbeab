#include <unistd.h>

#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "api/certificate.h"
#include "platform/webapi/api_download.h"
#include "tests/support/certificates.h"
#include "tests/support/test_support.h"

namespace {

const char kArchive[] = "/usr/orva/etc/ssl/.gen/archive.zip";

struct Export {
  ORVA::APIResponse response;
  ORVA::DownloadResult download;
};

// Runs the export with "file" set to `choice`.
Export ExportSet(const char* choice) {
  Json::Value params(Json::objectValue);
  params["file"] = choice;
  ORVA::APIRequest request("ORVA.Core.Certificate", "export", 1, params);
  Export result;
  ORVA::DownloadCollector collector;
  doCertificateExport_v1(&request, &result.response);
  result.download = collector.result();
  return result;
}

// Member names of the ZIP archive `body`, one per line, as unzip lists them.
std::string ZipMembers(const TempDeviceRoot& root, const std::string& body) {
  root.WriteFile("/downloaded.zip", body);
  EXPECT_TRUE(RunForTest("(unzip -Z1 '" + root.Path("/downloaded.zip") + "' | sort >'" +
                         root.Path("/members") + "')"));
  return ReadFile(root.Path("/members"));
}

void ExpectDownload(const Export& result) {
  EXPECT_FALSE(result.response.output_enabled());
  EXPECT_EQ(ORVA::APIResponse::Outcome::kNone, result.response.outcome());
  EXPECT_TRUE(result.download.has_body);
  const decltype(result.download.headers) expected = {
      {"content-disposition", "attachment; filename=\"archive.zip\""}};
  EXPECT_EQ(expected, result.download.headers);
}

void ExpectNothingSent(const Export& result) {
  EXPECT_TRUE(result.response.output_enabled());
  EXPECT_EQ(ORVA::APIResponse::Outcome::kNone, result.response.outcome());
  EXPECT_FALSE(result.download.has_body);
  EXPECT_TRUE(result.download.headers.empty());
}

}  // namespace

// The first archive replaces a folder in its place (removed with everything
// in it, as the removal command does), the second a plain earlier archive.
TEST(CertificateExport, ArchivePacksTheInstalledFilesThereAreAndRemovesNothing) {
  TempDeviceRoot root;
  const std::string inter = "/usr/orva/etc/ssl/ssl.intercrt/server-ca.crt";
  const std::string kept[] = {
      "/usr/orva/etc/ssl/ssl.crt/ca.crt", "/usr/orva/etc/ssl/ssl.key/ca.key",
      "/usr/orva/etc/ssl/ssl.crt/server.crt", "/usr/orva/etc/ssl/ssl.key/server.key",
      "/usr/orva/etc/ssl/.gen/server.csr"};
  for (const std::string& path : kept) root.WriteFile(path, "content of " + path, 0400);
  root.WriteFile(inter, "intermediate", 0400);
  root.WriteFile(std::string(kArchive) + "/inside/file", "in the way");

  for (const char* members : {"ca.crt\nca.key\nserver-ca.crt\nserver.crt\nserver.key\n",
                              "ca.crt\nca.key\nserver.crt\nserver.key\n"}) {
    SCOPED_TRACE(members);
    Export result = ExportSet("archive");
    ExpectDownload(result);
    EXPECT_EQ(members, ZipMembers(root, result.download.body)) << "never the pending request";
    EXPECT_EQ(result.download.body, ReadFile(root.Path(kArchive)));
    EXPECT_EQ(0400, FileMode(root.Path(kArchive)));
    for (const std::string& path : kept) EXPECT_TRUE(FileExists(root.Path(path))) << path;
    unlink(root.Path(inter).c_str());  // the next archive leaves it out
  }
}

// A failing archiver sends nothing and keeps the set; once packed, the set
// is removed and a second request gets nothing.
TEST(CertificateExport, GeneratedSetsAreHandedOutOnce) {
  const struct {
    const char* choice;
    std::vector<const char*> files;
    const char* members;
  } sets[] = {
      {"csr_set",
       {"/usr/orva/etc/ssl/.gen/server.csr", "/usr/orva/etc/ssl/.gen/server.key"},
       "server.csr\nserver.key\n"},
      {"signed_set", {"/usr/orva/etc/ssl/.gen/server.crt"}, "server.crt\n"},
  };
  for (const auto& set : sets) {
    SCOPED_TRACE(set.choice);
    TempDeviceRoot root;
    root.WriteFile("/usr/orva/etc/ssl/ssl.crt/server.crt", "installed", 0400);
    for (const char* file : set.files) root.WriteFile(file, "generated", 0400);
    root.WriteScript("/usr/orva/bin/7z", "exit 2");
    {
      LogCapture log;
      ExpectNothingSent(ExportSet(set.choice));
      EXPECT_TRUE(log.Contains(" 7z file failed[0x") && log.Contains(" Create archive failed[0x"))
          << log.Text();
    }
    unlink(root.Path("/usr/orva/bin/7z").c_str());
    ASSERT_EQ(0, symlink("/usr/bin/7z", root.Path("/usr/orva/bin/7z").c_str()));
    Export first = ExportSet(set.choice);
    ExpectDownload(first);
    EXPECT_EQ(set.members, ZipMembers(root, first.download.body));
    for (const char* file : set.files) EXPECT_FALSE(FileExists(root.Path(file))) << file;
    EXPECT_EQ(0400, FileMode(root.Path(kArchive)));
    EXPECT_TRUE(FileExists(root.Path("/usr/orva/etc/ssl/ssl.crt/server.crt")));

    LogCapture log;
    ExpectNothingSent(ExportSet(set.choice));
    EXPECT_TRUE(log.Contains(" No file will be compress\n")) << log.Text();
    EXPECT_TRUE(log.Contains(" Create archive failed[0x")) << log.Text();
    EXPECT_FALSE(FileExists(root.Path(kArchive))) << "the previous archive is removed first";
  }
}

// Only the exact choices are packed; no choice is the method table's 5503.
TEST(CertificateExport, OtherChoicesSendNothing) {
  for (const char* choice : {"Archive", "archive ", "", "CSR_SET", "signed"}) {
    SCOPED_TRACE(choice);
    TempDeviceRoot root;
    root.WriteFile("/usr/orva/etc/ssl/ssl.crt/server.crt", "certificate", 0400);
    LogCapture log;
    Export result = ExportSet(choice);
    ExpectNothingSent(result);
    EXPECT_EQ(0, result.response.error_code());
    EXPECT_EQ("", log.Text());
    EXPECT_FALSE(FileExists(root.Path(kArchive)));
  }
}
