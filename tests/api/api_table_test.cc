#include <string>

#include <gtest/gtest.h>

#include "api/certificate.h"
#include "tests/support/test_support.h"

namespace {

// The table's row for the method at version 1; null when there is none.
const ORVA::APIEntry* FindRow(const std::string& api, const std::string& method) {
  const ORVA::APIEntry* table = GetAPITable();
  for (int i = 0; i < kCertificateApiCount; ++i) {
    if (api == table[i].api && method == table[i].method && table[i].version == 1) {
      return &table[i];
    }
  }
  return nullptr;
}

// Parameters named `names`, each holding the text "TW".
Json::Value Texts(std::initializer_list<const char*> names) {
  Json::Value params(Json::objectValue);
  for (const char* name : names) params[name] = "TW";
  return params;
}

}  // namespace

// Each checked method answers 5503 with null data when one necessary
// parameter is missing or is not of its kind, and nothing is written to the
// store.
TEST(ApiTable, MissingNecessaryParameterAnswers5503) {
  const struct { const char *api, *method; Json::Value params; } cases[] = {
      {"ORVA.Core.Certificate", "export", Texts({})},
      {"ORVA.Core.Certificate", "import", Texts({"cert_tmp"})},
      {"ORVA.Core.Certificate", "import", Texts({"key_tmp", "inter_cert_tmp"})},
      {"ORVA.Core.Certificate.CSR", "create",
       Texts({"country", "state", "city", "organization", "department", "common_name"})},
      {"ORVA.Core.Certificate.CSR", "sign", Texts({"csr", "csr_tmp"})},
      {"ORVA.Core.Certificate.CSR", "sign", Texts({"days", "csr_tmp"})},
      {"ORVA.Core.Certificate.CSR", "sign", Texts({"csr", "csr_tmp", "days"})},
      {"ORVA.Core.Certificate.CRT", "create",
       Texts({"ca_country", "ca_state", "ca_city", "ca_organization", "ca_department",
              "ca_common_name", "ca_email", "country", "state", "city", "organization",
              "department", "common_name"})},
      {"ORVA.Core.Certificate", "list", Texts({"type", "additional"})},
  };
  for (const auto& c : cases) {
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
  EXPECT_NE(nullptr, FindRow("ORVA.Core.Certificate.CSR", "renew")) << "it has no parameter";
}
