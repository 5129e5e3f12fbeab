// The parameter checker's rules: presence, and the values each type code
// accepts and the conversions it makes in place.

#include <string>

#include <gtest/gtest.h>

#include "platform/webapi/api_request.h"
#include "platform/webapi/parameter_checker.h"

TEST(ParameterChecker, EachRuleAcceptsAndConvertsOnlyItsValues) {
  const Json::Value kAbsent;  // the parameter is not sent
  Json::Value pair(Json::arrayValue);
  pair.append("valid_from");
  pair.append("valid_till");
  auto nested = [](int depth) { return std::string(depth, '[') + std::string(depth, ']'); };
  const int kText = kParameterText, kNumber = kParameterWholeNumber;
  const int kArray = kParameterJsonArray;
  const struct {
    int type;
    bool necessary;
    Json::Value value;
    bool passes;
    Json::Value stored;  // after a passed check; null: not compared
  } cases[] = {
      {kText, true, kAbsent, false, {}},      {kText, false, kAbsent, true, {}},
      {kText, true, 5, false, {}},            {99, true, "archive", false, {}},
      {kNumber, true, "3650", true, 3650},    {kNumber, true, "-5", true, -5},
      {kNumber, true, 42, true, 42},          {kNumber, true, "2147483647", true, 2147483647},
      {kNumber, true, "2147483648", false, {}}, {kNumber, true, "0000000000005", true, 5},
      {kNumber, true, "-2147483648", true, -2147483647 - 1},
      {kNumber, true, "-2147483649", false, {}},
      {kNumber, true, Json::Value(Json::UInt64(5000000000ULL)), false, {}},
      {kNumber, true, 1.5, false, {}},        {kNumber, true, "12abc", false, {}},
      {kNumber, true, " 5", false, {}},       {kNumber, true, "", false, {}},
      {kArray, false, "[\"valid_from\",\"valid_till\"]", true, pair},
      {kArray, false, "{\"a\":1}", false, {}},
      {kArray, false, "valid_from", false, {}},
      {kArray, false, nested(64), true, {}},  {kArray, false, nested(65), false, {}},
      {kArray, false, nested(100000), false, {}},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(std::to_string(c.type) + " " + c.value.toStyledString().substr(0, 80));
    Json::Value params(Json::objectValue);
    if (!c.value.isNull()) params["p"] = c.value;
    ORVA::APIRequest request("api", "method", 1, params);
    Json::Value rules;
    rules["field"]["p"]["type"] = c.type;
    rules["field"]["p"]["necessary"] = c.necessary;
    bool passed = !c.passes;
    EXPECT_NO_THROW(passed = ParameterChecker::check(&request, rules));
    EXPECT_EQ(c.passes, passed);
    if (passed && !c.stored.isNull()) {
      EXPECT_EQ(c.stored, request.GetParam("p", Json::Value()));
    }
  }
}
