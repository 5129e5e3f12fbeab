// The export: which files each set packs, the archive's mode, and the sets
// that are handed out once.

#include <sys/stat.h>

#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "api/certificate.h"
#include "common/store_paths.h"
#include "tests/support/certificates.h"
#include "tests/support/method_calls.h"
#include "tests/support/test_support.h"

namespace {

// The members of the archive that an export of `set` sent, one per line as
// unzip lists them; "" when it sent nothing (and answered nothing, keeping
// the last archive as it was).
std::string ExportedMembers(const TempDeviceRoot& root, const std::string& set) {
  struct stat archive;
  const bool kept = stat(root.Path(kArchivePath).c_str(), &archive) == 0 && S_ISREG(archive.st_mode);
  const std::string last = kept ? ReadFile(root.Path(kArchivePath)) : "";
  const MethodAnswer answer =
      CallMethod(doCertificateExport_v1, Params(root, R"({"file":")" + set + "\"}"));
  EXPECT_EQ(ORVA::APIResponse::Outcome::kNone, answer.response.outcome());
  EXPECT_EQ(!answer.download.has_body, answer.response.output_enabled());
  if (!answer.download.has_body) {
    EXPECT_TRUE(kept) << "a set handed out once is asked for again after an archive was made";
    EXPECT_EQ(last, ReadFile(root.Path(kArchivePath))) << "the last archive is kept";
    return "";
  }
  const decltype(answer.download.headers) expected = {
      {"content-disposition", "attachment; filename=\"archive.zip\""}};
  EXPECT_EQ(expected, answer.download.headers);
  EXPECT_EQ(answer.download.body, ReadFile(root.Path(kArchivePath)));
  EXPECT_EQ(0400, FileMode(root.Path(kArchivePath)));
  EXPECT_TRUE(RunForTest("(unzip -Z1 '" + root.Path(kArchivePath) + "' | sort >'" +
                         root.Path("/members") + "')"));
  return ReadFile(root.Path("/members"));
}

}  // namespace

// Every set from a full store, with a folder in the archive's place. A set
// handed out once is gone after it was packed, so asking again sends
// nothing; the archive of the installed files can be asked for again.
TEST(CertificateExport, EachSetPacksItsFilesAndGeneratedSetsAreHandedOutOnce) {
  const struct { const char* set; const char* members; std::vector<const char*> handed_out; }
  sets[] = {
      {"archive", "ca.crt\nca.key\nserver-ca.crt\nserver.crt\nserver.key\n", {}},
      {"csr_set", "server.csr\nserver.key\n", {kGenCsrPath, kGenKeyPath}},
      {"signed_set", "server.crt\n", {kGenCrtPath}},
  };
  const char* store[] = {kCaCrtPath, kCaKeyPath, kServerCrtPath, kServerKeyPath, kInterCrtPath,
                         kGenCsrPath, kGenKeyPath, kGenCrtPath};
  for (const auto& c : sets) {
    SCOPED_TRACE(c.set);
    TempDeviceRoot root;
    for (const char* path : store) root.WriteFile(path, std::string("content of ") + path, 0400);
    root.WriteFile(std::string(kArchivePath) + "/inside/file", "in the way");
    EXPECT_EQ(c.members, ExportedMembers(root, c.set));
    for (const char* path : store) {
      bool handed_out = false;
      for (const char* gone : c.handed_out) handed_out = handed_out || gone == path;
      EXPECT_NE(handed_out, FileExists(root.Path(path))) << path;
    }
    EXPECT_EQ(c.handed_out.empty() ? c.members : "", ExportedMembers(root, c.set));
  }
}
