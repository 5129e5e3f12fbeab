#include <openssl/pem.h>
#include <openssl/x509.h>

#include <cstdio>
#include <string>

#include <gtest/gtest.h>

#include "common/pem_password.h"
#include "common/raii.h"
#include "tests/support/certificates.h"
#include "tests/support/test_support.h"
#include "tests/toolkit/toolkit_test_util.h"
#include "toolkit/mkcert.h"

namespace {

const std::string kCaCrt = "/usr/orva/etc/ssl/ssl.crt/ca.crt";
const std::string kCaKey = "/usr/orva/etc/ssl/ssl.key/ca.key";
const std::string kCaCsr = "/usr/orva/etc/ssl/ssl.csr/ca.csr";

// Days between the certificate's start and end; -1 when unreadable.
int ValidityDays(const std::string& path) {
  FilePtr file(std::fopen(path.c_str(), "r"));
  if (!file) return -1;
  X509Ptr certificate(
      PEM_read_X509(file.get(), nullptr, RefusePemPassword, nullptr));
  int days = -1;
  int seconds = 0;
  if (!certificate ||
      ASN1_TIME_diff(&days, &seconds, X509_get0_notBefore(certificate.get()),
                     X509_get0_notAfter(certificate.get())) != 1) {
    return -1;
  }
  return days;
}

}  // namespace

TEST(GenCASet, MakesAProvenSelfSignedCaForTenYears) {
  TempDeviceRoot root;
  CSR_ARGUMENT subject = FullSubject();
  subject.common_name = "Local CA";
  ASSERT_EQ(0, genCASet(&subject, 2048));
  for (const std::string& file : {kCaCrt, kCaKey, kCaCsr}) {
    SCOPED_TRACE(file);
    EXPECT_EQ(0400, FileMode(root.Path(file)));
  }
  EXPECT_EQ(3650, ValidityDays(root.Path(kCaCrt)));
  std::string text = CertificateText(root.Path(kCaCrt));
  EXPECT_NE(std::string::npos, text.find("CA:TRUE, pathlen:0")) << text;
  EXPECT_TRUE(RunForTest("openssl verify -CAfile '" + root.Path(kCaCrt) +
                         "' '" + root.Path(kCaCrt) + "'"));
  EXPECT_EQ(0, verifyCrtAndKey(root.Path(kCaCrt).c_str(),
                               root.Path(kCaKey).c_str(), CYPHER_RSA));
}

TEST(GenCASet, FirstFailedStepEndsTheSetWithItsResult) {
  CSR_ARGUMENT bad_country = FullSubject();
  bad_country.country = "TWN";
  CSR_ARGUMENT good = FullSubject();
  const struct {
    const char* name;
    CSR_ARGUMENT* subject;
    int bits;
    const char* failing_subcommand;
    int result;
    const char* message;
  } cases[] = {
      {"size 0", &good, 0, nullptr, -1, " genCAKey() failed\n"},
      {"subject", &bad_country, 1024, nullptr, -2, " genCACsr() failed\n"},
      {"no subject", nullptr, 1024, nullptr, -2, " genCACsr() failed\n"},
      {"signing", &good, 1024, "x509", -1, " genCACrt() failed\n"},
      {"digest", &good, 1024, "md5", -1,
       " Root certificate and key is not matching\n"},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.name);
    TempDeviceRoot root;
    if (c.failing_subcommand != nullptr) {
      FailToolSubcommand(root, c.failing_subcommand);
    }
    LogCapture log;
    EXPECT_EQ(c.result, genCASet(c.subject, c.bits));
    EXPECT_TRUE(log.Contains(c.message)) << log.Text();
    // The set is installed whole or not at all.
    for (const std::string& file : {kCaKey, kCaCsr, kCaCrt}) {
      EXPECT_FALSE(FileExists(root.Path(file))) << file;
    }
    EXPECT_EQ("", TemporaryFilesIn(root.Path("/usr/orva/etc/ssl/ssl.key")));
  }
}
