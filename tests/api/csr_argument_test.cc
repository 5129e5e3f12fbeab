#include <gtest/gtest.h>

#include "api/csr_argument.h"
#include "tests/support/test_support.h"

namespace {

std::string Fields(const CSR_ARGUMENT& subject) {
  return subject.country + "|" + subject.state + "|" + subject.city + "|" +
         subject.organization + "|" + subject.department + "|" + subject.common_name + "|" +
         subject.email;
}

}  // namespace

TEST(FillCSRInfo, ReadsTheSelectedSetAndFallsBackToDefaults) {
  Json::Value params(Json::objectValue);
  params["ca_country"] = "DE";
  params["country"] = "FR";
  params["state"] = "";
  params["organization"] = "O'Reilly \"quoted\"";
  ORVA::APIRequest request("ORVA.Core.Certificate.CRT", "create", 1, params);
  CSR_ARGUMENT server, ca;
  ASSERT_EQ(0, fillCSRInfo(&request, &server, false));
  ASSERT_EQ(0, fillCSRInfo(&request, &ca, true));
  EXPECT_EQ("FR||Taipel|O'Reilly \"quoted\"|Department|server.example.com|admin@server.example.com",
            Fields(server))
      << "an empty text stays empty";
  EXPECT_EQ("DE|Taipei|Taipel|Organization|Department|server.example.com|ca@server.example.com",
            Fields(ca));
  LogCapture log;
  EXPECT_EQ(-1, fillCSRInfo(&request, nullptr, false));
  EXPECT_TRUE(log.Contains(" sanity check failed\n")) << log.Text();
}
