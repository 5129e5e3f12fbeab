#include "platform/webapi/parameter_checker.h"

#include <climits>
#include <memory>
#include <string>

namespace {

bool ParseJsonArray(const std::string& text, Json::Value* array) {
  Json::CharReaderBuilder builder;
  builder["collectComments"] = false;
  builder["strictRoot"] = true;
  builder["rejectDupKeys"] = false;
  builder["stackLimit"] = 64;
  std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
  Json::Value parsed;
  std::string errors;
  try {
    if (!reader->parse(text.data(), text.data() + text.size(), &parsed,
                       &errors) ||
        !parsed.isArray()) {
      return false;
    }
  } catch (const Json::Exception&) {
    // The reader throws instead of failing when the text nests deeper than
    // the stack limit; for the client that is just a malformed value.
    return false;
  }
  *array = parsed;
  return true;
}

bool ParseWholeNumber(const std::string& text, int* number) {
  const bool negative = !text.empty() && text[0] == '-';
  const size_t digits_start = negative ? 1 : 0;
  if (text.size() == digits_start) return false;
  // The value decides, not the length: leading zeros are allowed, and the
  // sum stops as soon as it leaves the 32-bit range.
  long long value = 0;
  for (size_t i = digits_start; i < text.size(); ++i) {
    if (text[i] < '0' || text[i] > '9') return false;
    value = value * 10 + (text[i] - '0');
    if (value > static_cast<long long>(INT_MAX) + 1) return false;
  }
  if (negative) value = -value;
  if (value < INT_MIN || value > INT_MAX) return false;
  *number = static_cast<int>(value);
  return true;
}

// Checks one present value against its type code, converting in place.
bool CheckValue(ORVA::APIRequest* request, const std::string& name,
                int type) {
  Json::Value value = request->GetParam(name, Json::Value());
  switch (type) {
    case kParameterText:
      return value.isString();
    case kParameterJsonArray: {
      if (value.isArray()) return true;
      Json::Value array;
      if (!value.isString() || !ParseJsonArray(value.asString(), &array)) {
        return false;
      }
      request->SetParam(name, array);
      return true;
    }
    case kParameterWholeNumber: {
      bool is_integer_kind =
          value.type() == Json::intValue || value.type() == Json::uintValue;
      if (is_integer_kind) return value.isInt();
      int number = 0;
      if (!value.isString() || !ParseWholeNumber(value.asString(), &number)) {
        return false;
      }
      request->SetParam(name, number);
      return true;
    }
    default:
      return false;
  }
}

}  // namespace

bool ParameterChecker::check(ORVA::APIRequest* request,
                             const Json::Value& rules) {
  if (request == nullptr || !rules.isObject()) return false;
  const Json::Value& fields = rules["field"];
  if (!fields.isObject()) return false;
  for (const std::string& name : fields.getMemberNames()) {
    const Json::Value& rule = fields[name];
    if (!rule.isObject() || !rule["type"].isInt() ||
        !rule["necessary"].isBool()) {
      return false;
    }
    if (!request->HasParam(name)) {
      if (rule["necessary"].asBool()) return false;
      continue;
    }
    if (!CheckValue(request, name, rule["type"].asInt())) return false;
  }
  return true;
}
