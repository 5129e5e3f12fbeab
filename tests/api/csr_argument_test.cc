#include <gtest/gtest.h>

#include "api/csr_argument.h"
#include "tests/support/test_support.h"

TEST(FillCSRInfo, ReadsTheSelectedSetAndFallsBackToDefaults) {
  Json::Value params(Json::objectValue);
  params["ca_country"] = "DE";
  params["ca_common_name"] = "Local CA";
  params["country"] = "FR";
  params["state"] = "";
  params["organization"] = "O'Reilly \"quoted\"";
  ORVA::APIRequest request("ORVA.Core.Certificate.CRT", "create", 1, params);

  CSR_ARGUMENT server;
  ASSERT_EQ(0, fillCSRInfo(&request, &server, false));
  EXPECT_EQ("FR", server.country);
  EXPECT_EQ("", server.state) << "an empty text stays empty";
  EXPECT_EQ("Taipel", server.city);
  EXPECT_EQ("O'Reilly \"quoted\"", server.organization);
  EXPECT_EQ("Department", server.department);
  EXPECT_FALSE(server.common_name.empty());
  EXPECT_FALSE(server.email.empty());

  CSR_ARGUMENT ca;
  ASSERT_EQ(0, fillCSRInfo(&request, &ca, true));
  EXPECT_EQ("DE", ca.country);
  EXPECT_EQ("Taipei", ca.state);
  EXPECT_EQ("Local CA", ca.common_name);
  EXPECT_NE(server.email, ca.email);

  LogCapture log;
  EXPECT_EQ(-1, fillCSRInfo(&request, nullptr, false));
  EXPECT_TRUE(log.Contains(" sanity check failed\n")) << log.Text();
}
