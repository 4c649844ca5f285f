#pragma once

#include <json/json.h>

#include <cstddef>
#include <map>
#include <string>
#include <string_view>

#include "platform/schema/module/Faults.h"
#include "platform/schema/module/Pattern.h"

namespace QELO::Platform {

/// Checks values against a schema that SchemaCheck finds nothing wrong with.
class Validator {
 public:
  static constexpr size_t kMostVisits = 1'000'000;  ///< of a schema to a value
  static constexpr size_t kMostWork = 50'000'000;   ///< steps of regular expressions

  /// @param root    the schema's document
  /// @param faults  receives what is wrong with values
  Validator(const Json::Value& root, Faults& faults) : root_(root), faults_(&faults) {}

  bool Fits(const Json::Value& value) { return Check(root_, value, Place(), "not"); }

 private:
  /// @param rule  the keyword that the schema stands under, which a schema `false` is told as
  bool Check(const Json::Value& schema, const Json::Value& value, const Place& place,
             const char* rule);
  bool CheckType(const Json::Value& schema, const Json::Value& value, const Place& place);
  bool CheckChoice(const Json::Value& schema, const Json::Value& value, const Place& place);
  bool CheckNumber(const Json::Value& schema, const Json::Value& value, const Place& place);
  bool CheckText(const Json::Value& schema, const Json::Value& value, const Place& place);
  bool CheckList(const Json::Value& schema, const Json::Value& value, const Place& place);
  bool CheckItems(const Json::Value& schema, const Json::Value& value, const Place& place);
  bool CheckObject(const Json::Value& schema, const Json::Value& value, const Place& place);
  bool CheckRequired(const Json::Value& schema, const Json::Value& value, const Place& place);
  bool CheckMembers(const Json::Value& schema, const Json::Value& value, const Place& place);
  bool CheckMember(const Json::Value& schema, const std::string& name, const Json::Value& value,
                   const Place& place);
  bool CheckDependencies(const Json::Value& schema, const Json::Value& value, const Place& place);
  bool CheckTogether(const Json::Value& schema, const Json::Value& value, const Place& place);
  bool CheckCondition(const Json::Value& schema, const Json::Value& value, const Place& place);
  /// How many of the schemas a value fits; nothing is told of those that it does not.
  size_t CountFitting(const Json::Value& schemas, const Json::Value& value, const Place& place);
  bool Probe(const Json::Value& schema, const Json::Value& value, const Place& place);
  bool IsTooMany(const Json::Value& schema, const char* most, const char* least, size_t count,
                 const char* what, const Place& place);
  bool Matches(const std::string& expression, std::string_view text);

  /// @return false
  bool Fail(const Place& place, const char* rule, const std::string& message);
  bool Exhausted();

  const Json::Value& root_;
  Faults* faults_;  ///< null: nothing is told
  std::map<std::string, Pattern> patterns_;
  size_t visitsLeft_ = kMostVisits;
  size_t workLeft_ = kMostWork;
  bool isExhausted_ = false;
};

}  // namespace QELO::Platform
