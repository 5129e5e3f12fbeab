#include <string>

#include <gtest/gtest.h>

#include "api/certificate.h"
#include "common/shell_command.h"
#include "platform/webapi/api_download.h"
#include "tests/support/test_support.h"

namespace {

const char kArchive[] = "/usr/orva/etc/ssl/.gen/archive.zip";

struct Export {
  ORVA::APIResponse response;
  ORVA::DownloadResult download;
};

Export RunExport(const Json::Value& params) {
  ORVA::APIRequest request("ORVA.Core.Certificate", "export", 1, params);
  Export result;
  ORVA::DownloadCollector collector;
  doCertificateExport_v1(&request, &result.response);
  result.download = collector.result();
  return result;
}

Export ExportSet(const char* file) {
  Json::Value params(Json::objectValue);
  params["file"] = file;
  return RunExport(params);
}

// Member names of the ZIP archive `body`, one per line, as unzip lists them.
std::string ZipMembers(const TempDeviceRoot& root, const std::string& body) {
  root.WriteFile("/downloaded.zip", body);
  ShellCommand list(512);
  list.Append("unzip -Z1 %s | sort", {root.Path("/downloaded.zip")});
  ShellPipe pipe(list);
  std::string names;
  char buffer[256];
  while (pipe.stream() != nullptr && std::fgets(buffer, sizeof buffer, pipe.stream())) {
    names += buffer;
  }
  EXPECT_EQ(0, pipe.Close());
  return names;
}

void ExpectDownload(const Export& result) {
  EXPECT_FALSE(result.response.output_enabled());
  EXPECT_EQ(ORVA::APIResponse::Outcome::kNone, result.response.outcome());
  ASSERT_TRUE(result.download.has_body);
  ASSERT_EQ(1u, result.download.headers.size());
  EXPECT_EQ("content-disposition", result.download.headers[0].first);
  EXPECT_EQ("attachment; filename=\"archive.zip\"", result.download.headers[0].second);
}

void ExpectNothingSent(const Export& result) {
  EXPECT_TRUE(result.response.output_enabled());
  EXPECT_EQ(ORVA::APIResponse::Outcome::kNone, result.response.outcome());
  EXPECT_FALSE(result.download.has_body);
  EXPECT_TRUE(result.download.headers.empty());
}

}  // namespace

TEST(CertificateExport, ArchivePacksTheInstalledSetAndRemovesNothing) {
  TempDeviceRoot root;
  const char* store[] = {"/usr/orva/etc/ssl/ssl.crt/ca.crt", "/usr/orva/etc/ssl/ssl.key/ca.key",
                         "/usr/orva/etc/ssl/ssl.crt/server.crt",
                         "/usr/orva/etc/ssl/ssl.key/server.key",
                         "/usr/orva/etc/ssl/ssl.intercrt/server-ca.crt"};
  for (const char* path : store) root.WriteFile(path, std::string("content of ") + path, 0400);
  root.WriteFile("/usr/orva/etc/ssl/.gen/server.csr", "pending request", 0400);

  for (int round = 0; round < 2; ++round) {
    SCOPED_TRACE(round);
    Export result = ExportSet("archive");
    ExpectDownload(result);
    EXPECT_EQ("ca.crt\nca.key\nserver-ca.crt\nserver.crt\nserver.key\n",
              ZipMembers(root, result.download.body));
    EXPECT_EQ(result.download.body, ReadFile(root.Path(kArchive)));
    EXPECT_EQ(0400, FileMode(root.Path(kArchive)));
    for (const char* path : store) EXPECT_TRUE(FileExists(root.Path(path))) << path;
    EXPECT_TRUE(FileExists(root.Path("/usr/orva/etc/ssl/.gen/server.csr")));
  }
}

// A folder where the archive belongs is not a plain file: it is removed with
// everything in it, as the removal command does, and the archive takes its
// place.
TEST(CertificateExport, ArchiveReplacesAFolderInItsPlace) {
  TempDeviceRoot root;
  root.WriteFile("/usr/orva/etc/ssl/ssl.crt/server.crt", "certificate", 0400);
  root.WriteFile(std::string(kArchive) + "/inside/file", "in the way");
  Export result = ExportSet("archive");
  ExpectDownload(result);
  EXPECT_EQ("server.crt\n", ZipMembers(root, result.download.body));
  EXPECT_EQ(result.download.body, ReadFile(root.Path(kArchive)));
}

TEST(CertificateExport, ArchiveLeavesOutMissingMembers) {
  TempDeviceRoot root;
  root.WriteFile("/usr/orva/etc/ssl/ssl.crt/server.crt", "certificate", 0400);
  root.WriteFile("/usr/orva/etc/ssl/ssl.key/server.key", "key", 0400);
  Export result = ExportSet("archive");
  ExpectDownload(result);
  EXPECT_EQ("server.crt\nserver.key\n", ZipMembers(root, result.download.body));
}

TEST(CertificateExport, GeneratedSetsAreHandedOutOnce) {
  const struct {
    const char* choice;
    const char* files[2];
    const char* members;
  } sets[] = {
      {"csr_set",
       {"/usr/orva/etc/ssl/.gen/server.csr", "/usr/orva/etc/ssl/.gen/server.key"},
       "server.csr\nserver.key\n"},
      {"signed_set", {"/usr/orva/etc/ssl/.gen/server.crt", nullptr}, "server.crt\n"},
  };
  for (const auto& set : sets) {
    SCOPED_TRACE(set.choice);
    TempDeviceRoot root;
    root.WriteFile("/usr/orva/etc/ssl/ssl.crt/server.crt", "installed", 0400);
    for (const char* file : set.files) {
      if (file != nullptr) {
        root.WriteFile(file, "generated", 0400);
      }
    }
    Export first = ExportSet(set.choice);
    ExpectDownload(first);
    EXPECT_EQ(set.members, ZipMembers(root, first.download.body));
    for (const char* file : set.files) {
      if (file != nullptr) {
        EXPECT_FALSE(FileExists(root.Path(file))) << file;
      }
    }
    EXPECT_EQ(0400, FileMode(root.Path(kArchive)));
    EXPECT_TRUE(FileExists(root.Path("/usr/orva/etc/ssl/ssl.crt/server.crt")));

    LogCapture log;
    Export second = ExportSet(set.choice);
    ExpectNothingSent(second);
    EXPECT_TRUE(log.Contains(" No file will be compress\n")) << log.Text();
    EXPECT_TRUE(log.Contains(" Create archive failed[0x")) << log.Text();
    EXPECT_FALSE(FileExists(root.Path(kArchive))) << "the previous archive is removed first";
  }
}

TEST(CertificateExport, UnknownChoicesSendNothingAndSetNoError) {
  for (const char* choice : {"Archive", "archive ", "", "CSR_SET", "signed"}) {
    SCOPED_TRACE(choice);
    TempDeviceRoot root;
    root.WriteFile("/usr/orva/etc/ssl/ssl.crt/server.crt", "certificate", 0400);
    LogCapture log;
    ExpectNothingSent(ExportSet(choice));
    EXPECT_EQ("", log.Text());
    EXPECT_FALSE(FileExists(root.Path(kArchive)));
  }
}

TEST(CertificateExport, MissingFileParameterAnswers5503) {
  TempDeviceRoot root;
  Export result = RunExport(Json::Value(Json::objectValue));
  EXPECT_EQ(ORVA::APIResponse::Outcome::kError, result.response.outcome());
  EXPECT_EQ(5503, result.response.error_code());
  EXPECT_TRUE(result.response.data().isNull());
  EXPECT_FALSE(result.download.has_body);
}

TEST(CertificateExport, FailingArchiverSendsNothingAndKeepsTheGeneratedSet) {
  TempDeviceRoot root;
  root.WriteScript("/usr/orva/bin/7z", "exit 2");
  root.WriteFile("/usr/orva/etc/ssl/.gen/server.csr", "request", 0400);
  root.WriteFile("/usr/orva/etc/ssl/.gen/server.key", "key", 0400);
  LogCapture log;
  ExpectNothingSent(ExportSet("csr_set"));
  EXPECT_TRUE(log.Contains(" 7z file failed[0x")) << log.Text();
  EXPECT_TRUE(log.Contains(" Create archive failed[0x")) << log.Text();
  EXPECT_TRUE(FileExists(root.Path("/usr/orva/etc/ssl/.gen/server.csr")));
  EXPECT_TRUE(FileExists(root.Path("/usr/orva/etc/ssl/.gen/server.key")));
}
