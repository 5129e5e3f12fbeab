#include <gtest/gtest.h>

#include "platform/webapi/api_request.h"
#include "platform/webapi/parameter_checker.h"

namespace {

Json::Value Rules(const char* name, int type, bool necessary) {
  Json::Value rules;
  rules["field"][name]["type"] = type;
  rules["field"][name]["necessary"] = necessary;
  return rules;
}

ORVA::APIRequest RequestWith(const char* name, const Json::Value& value) {
  Json::Value params(Json::objectValue);
  params[name] = value;
  return ORVA::APIRequest("api", "method", 1, params);
}

}  // namespace

TEST(ParameterChecker, NecessaryAndOptionalParameters) {
  ORVA::APIRequest empty("api", "method", 1, Json::Value());
  EXPECT_FALSE(ParameterChecker::check(&empty, Rules("email", 4, true)));
  EXPECT_TRUE(ParameterChecker::check(&empty, Rules("email", 4, false)));
  ORVA::APIRequest with_email = RequestWith("email", "");
  EXPECT_TRUE(ParameterChecker::check(&with_email, Rules("email", 4, true)))
      << "an empty text is present";
}

TEST(ParameterChecker, WholeNumbersAreConvertedInPlace) {
  struct Case {
    Json::Value value;
    bool passes;
    int converted;
  } cases[] = {
      {"3650", true, 3650},       {"-5", true, -5},
      {"0", true, 0},             {Json::Value(42), true, 42},
      {"2147483647", true, 2147483647},
      {"2147483648", false, 0},   {"-2147483649", false, 0},
      {"12abc", false, 0},        {"", false, 0},
      {"-", false, 0},            {" 5", false, 0},
      {"1e3", false, 0},          {Json::Value(1.5), false, 0},
      {Json::Value(Json::UInt64(5000000000ULL)), false, 0},
      {"99999999999999999999", false, 0},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.value.toStyledString());
    ORVA::APIRequest request = RequestWith("days", c.value);
    EXPECT_EQ(c.passes, ParameterChecker::check(&request, Rules("days", 14, true)));
    if (c.passes) {
      Json::Value stored = request.GetParam("days", Json::Value());
      ASSERT_TRUE(stored.isInt());
      EXPECT_EQ(c.converted, stored.asInt());
    }
  }
}

TEST(ParameterChecker, ArraysMayArriveAsText) {
  ORVA::APIRequest text = RequestWith("additional", "[\"valid_from\",\"valid_till\"]");
  ASSERT_TRUE(ParameterChecker::check(&text, Rules("additional", 8, false)));
  Json::Value stored = text.GetParam("additional", Json::Value());
  ASSERT_TRUE(stored.isArray());
  EXPECT_EQ("valid_till", stored[1].asString());

  for (const char* bad : {"{\"a\":1}", "valid_from", "[1,", ""}) {
    SCOPED_TRACE(bad);
    ORVA::APIRequest request = RequestWith("additional", bad);
    EXPECT_FALSE(ParameterChecker::check(&request, Rules("additional", 8, false)));
  }
}

TEST(ParameterChecker, TextRuleRefusesOtherKindsAndUnknownCodesFail) {
  ORVA::APIRequest number = RequestWith("file", 5);
  EXPECT_FALSE(ParameterChecker::check(&number, Rules("file", 4, true)));
  ORVA::APIRequest text = RequestWith("file", "archive");
  EXPECT_FALSE(ParameterChecker::check(&text, Rules("file", 99, true)));
  Json::Value malformed;
  malformed["field"]["file"] = "4";
  EXPECT_FALSE(ParameterChecker::check(&text, malformed));
}

TEST(ParameterChecker, DeeplyNestedArrayTextFailsItsRuleWithoutThrowing) {
  for (int depth : {32, 100, 100000}) {
    SCOPED_TRACE(depth);
    ORVA::APIRequest request = RequestWith(
        "additional", std::string(depth, '[') + std::string(depth, ']'));
    bool passed = true;
    EXPECT_NO_THROW(passed = ParameterChecker::check(&request, Rules("additional", 8, false)));
    EXPECT_EQ(depth <= 64, passed);
  }
}
