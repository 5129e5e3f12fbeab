#include "api/method_rules.h"

Json::Value BuildRules(std::initializer_list<Rule> rules) {
  Json::Value set(Json::objectValue);
  for (const Rule& rule : rules) {
    set["field"][rule.name]["type"] = static_cast<int>(rule.type);
    set["field"][rule.name]["necessary"] = rule.necessary;
  }
  return set;
}
