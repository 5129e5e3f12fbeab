#include <set>
#include <string>

#include <gtest/gtest.h>

#include "api/certificate.h"
#include "tests/support/test_support.h"

namespace {

const ORVA::APIEntry* FindRow(const std::string& api, const std::string& method) {
  const ORVA::APIEntry* table = GetAPITable();
  for (int i = 0; i < kCertificateApiCount; ++i) {
    if (api == table[i].api && method == table[i].method) return &table[i];
  }
  return nullptr;
}

Json::Value Texts(std::initializer_list<const char*> names) {
  Json::Value params(Json::objectValue);
  for (const char* name : names) params[name] = "TW";
  return params;
}

}  // namespace

TEST(ApiTable, SevenRowsInOrderAtOneAddress) {
  const ORVA::APIEntry* table = GetAPITable();
  EXPECT_EQ(table, GetAPITable());
  const char* expected[][2] = {
      {"ORVA.Core.Certificate", "list"},     {"ORVA.Core.Certificate", "export"},
      {"ORVA.Core.Certificate", "import"},   {"ORVA.Core.Certificate.CSR", "create"},
      {"ORVA.Core.Certificate.CSR", "renew"}, {"ORVA.Core.Certificate.CSR", "sign"},
      {"ORVA.Core.Certificate.CRT", "create"},
  };
  for (int i = 0; i < kCertificateApiCount; ++i) {
    SCOPED_TRACE(i);
    EXPECT_STREQ(expected[i][0], table[i].api);
    EXPECT_STREQ(expected[i][1], table[i].method);
    EXPECT_EQ(1, table[i].version);
    EXPECT_NE(nullptr, table[i].handler);
  }
}

// Each checked method answers 5503 with null data when one necessary
// parameter is missing, and nothing is written to the store.
TEST(ApiTable, MissingNecessaryParameterAnswers5503) {
  struct Case {
    const char* api;
    const char* method;
    Json::Value params;
  } cases[] = {
      {"ORVA.Core.Certificate", "export", Texts({})},
      {"ORVA.Core.Certificate", "import", Texts({"cert_tmp"})},
      {"ORVA.Core.Certificate", "import", Texts({"key_tmp", "inter_cert_tmp"})},
      {"ORVA.Core.Certificate.CSR", "create",
       Texts({"country", "state", "city", "organization", "department", "common_name"})},
      {"ORVA.Core.Certificate.CSR", "sign", Texts({"csr", "csr_tmp"})},
      {"ORVA.Core.Certificate.CSR", "sign", Texts({"days", "csr_tmp"})},
      {"ORVA.Core.Certificate.CRT", "create",
       Texts({"ca_country", "ca_state", "ca_city", "ca_organization", "ca_department",
              "ca_common_name", "ca_email", "country", "state", "city", "organization",
              "department", "common_name"})},
      {"ORVA.Core.Certificate", "list", Texts({"type", "additional"})},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(std::string(c.api) + " " + c.method + " " + c.params.toStyledString());
    TempDeviceRoot root;
    const ORVA::APIEntry* row = FindRow(c.api, c.method);
    ASSERT_NE(nullptr, row);
    ORVA::APIRequest request(c.api, c.method, 1, c.params);
    ORVA::APIResponse response;
    row->handler(&request, &response);
    EXPECT_EQ(ORVA::APIResponse::Outcome::kError, response.outcome());
    EXPECT_EQ(5503, response.error_code());
    EXPECT_TRUE(response.data().isNull());
    EXPECT_FALSE(FileExists(root.Path("/usr/orva/etc/ssl/.gen")));
  }
}

TEST(ApiTable, SignRefusesDaysThatAreNotWholeNumbers) {
  TempDeviceRoot root;
  Json::Value params = Texts({"csr", "csr_tmp"});
  params["days"] = "ten";
  ORVA::APIRequest request("ORVA.Core.Certificate.CSR", "sign", 1, params);
  ORVA::APIResponse response;
  doCertificateSign_v1(&request, &response);
  EXPECT_EQ(5503, response.error_code());
}
