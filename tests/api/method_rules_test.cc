// Each method's parameter rules: a necessary parameter that is missing or
// not of its kind is answered with 5503 and null data.

#include <string>

#include <gtest/gtest.h>

#include "api/certificate.h"
#include "tests/support/method_calls.h"
#include "tests/support/test_support.h"

namespace {

// Parameters named `names`, each holding the text "TW".
Json::Value Texts(std::initializer_list<const char*> names) {
  Json::Value params(Json::objectValue);
  for (const char* name : names) params[name] = "TW";
  return params;
}

}  // namespace

TEST(MethodRules, MissingOrMistypedParameterAnswers5503) {
  const struct { MethodHandler handler; Json::Value params; } cases[] = {
      {doCertificateExport_v1, Texts({})},
      {doCertificateImport_v1, Texts({"cert_tmp"})},
      {doCertificateImport_v1, Texts({"key_tmp", "inter_cert_tmp"})},
      {doCertificateCreateCSR_v1,
       Texts({"country", "state", "city", "organization", "department", "common_name"})},
      {doCertificateSign_v1, Texts({"csr", "csr_tmp"})},
      {doCertificateSign_v1, Texts({"days", "csr_tmp"})},
      {doCertificateSign_v1, Texts({"csr", "csr_tmp", "days"})},
      {doCertificateCreateCRT_v1,
       Texts({"ca_country", "ca_state", "ca_city", "ca_organization", "ca_department",
              "ca_common_name", "ca_email", "country", "state", "city", "organization",
              "department", "common_name"})},
      {doCertificateList_v1, Texts({"type", "additional"})},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.params.toStyledString());
    TempDeviceRoot root;
    const ORVA::APIResponse response = CallMethod(c.handler, c.params).response;
    EXPECT_EQ(ORVA::APIResponse::Outcome::kError, response.outcome());
    EXPECT_EQ(5503, response.error_code());
    EXPECT_TRUE(response.data().isNull());
  }
}
