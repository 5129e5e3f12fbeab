// Fuzz target: the parameter checker on arbitrary rule sets and values.
//
// Input: a rule set as JSON text, a newline, then the parameters. The
// parameters are a JSON object; any other text is given as the value of
// every parameter the rule set names, so raw texts reach the conversions.
// A rule set that is not JSON is passed as a JSON text, which must fail.
//
// Beyond crashes it checks that a passed check means what it says: every
// necessary parameter is there, every checked one is of its kind after the
// conversion, a converted number is the number the text spelled, and
// parameters without a rule are left alone.

#include <cerrno>
#include <climits>
#include <cstdint>
#include <cstdlib>
#include <memory>
#include <string>

#include <json/json.h>

#include "platform/webapi/api_request.h"
#include "platform/webapi/parameter_checker.h"

namespace {

// The harness's own reading of the input; text nested too deeply for it
// counts as not JSON.
bool ParseJson(const std::string& text, Json::Value* value) {
  Json::CharReaderBuilder builder;
  builder["stackLimit"] = 200;
  std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
  std::string errors;
  try {
    return reader->parse(text.data(), text.data() + text.size(), value, &errors);
  } catch (const Json::Exception&) {
    return false;
  }
}

// The number a type 14 text spells, by an independent reading.
bool SpelledNumber(const std::string& text, long long* number) {
  if (text.empty()) return false;
  errno = 0;
  char* end = nullptr;
  *number = std::strtoll(text.c_str(), &end, 10);
  return errno == 0 && end == text.c_str() + text.size();
}

bool HoldsAfterPass(const Json::Value& rules, const Json::Value& before,
                    const ORVA::APIRequest& request) {
  if (!rules.isObject() || !rules["field"].isObject()) return false;
  const Json::Value& fields = rules["field"];
  for (const std::string& name : before.getMemberNames()) {
    if (!fields.isMember(name) && request.params()[name] != before[name]) {
      return false;
    }
  }
  for (const std::string& name : fields.getMemberNames()) {
    const Json::Value& rule = fields[name];
    if (!rule.isObject() || !rule["type"].isInt() || !rule["necessary"].isBool()) {
      return false;
    }
    if (!request.HasParam(name)) {
      if (rule["necessary"].asBool()) return false;
      continue;
    }
    const Json::Value value = request.GetParam(name, Json::Value());
    const Json::Value& original = before[name];
    switch (rule["type"].asInt()) {
      case 4:
        if (!value.isString() || value != original) return false;
        break;
      case 8:
        if (!value.isArray()) return false;
        if (!original.isArray() && !original.isString()) return false;
        break;
      case 14: {
        if (!value.isInt()) return false;
        if (original.isString()) {
          long long number = 0;
          if (!SpelledNumber(original.asString(), &number) ||
              number != value.asInt()) {
            return false;
          }
        } else if (original != value) {
          return false;
        }
        break;
      }
      default:
        return false;
    }
  }
  return true;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  const std::string input(reinterpret_cast<const char*>(data), data != nullptr ? size : 0);
  const std::string::size_type newline = input.find('\n');
  const std::string rules_text = input.substr(0, newline);
  const std::string params_text =
      newline == std::string::npos ? "" : input.substr(newline + 1);

  Json::Value rules;
  if (!ParseJson(rules_text, &rules)) rules = Json::Value(rules_text);
  Json::Value params;
  if (!ParseJson(params_text, &params) || !params.isObject()) {
    params = Json::Value(Json::objectValue);
    if (rules.isObject() && rules["field"].isObject()) {
      for (const std::string& name : rules["field"].getMemberNames()) {
        params[name] = params_text;
      }
    }
  }

  ORVA::APIRequest request("ORVA.Core.Fuzz", "check", 1, params);
  if (ParameterChecker::check(&request, rules) &&
      !HoldsAfterPass(rules, params, request)) {
    std::abort();
  }
  if (ParameterChecker::check(nullptr, rules)) std::abort();
  return 0;
}
