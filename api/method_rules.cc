#include "api/method_rules.h"

Json::Value BuildRules(std::initializer_list<Rule> rules) {
  Json::Value set(Json::objectValue);
  set["field"] = Json::Value(Json::objectValue);  // A method without parameters has no rule.
  for (const Rule& rule : rules) {
    set["field"][rule.name]["type"] = static_cast<int>(rule.type);
    set["field"][rule.name]["necessary"] = rule.necessary;
  }
  return set;
}
