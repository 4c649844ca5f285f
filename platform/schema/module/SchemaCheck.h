#pragma once

#include <json/json.h>

#include <string>

#include "platform/schema/module/Faults.h"

namespace QELO::Platform {

/// Looks whether a value is a schema, and one that can be applied whatever the value is that it is
/// applied to. Keywords that draft 7 does not know are left alone.
class SchemaCheck {
 public:
  static constexpr int kMostSchemas =
      1000;                            ///< in one, those that are referred to counted each time
  static constexpr int kDeepest = 32;  ///< schemas within schemas, likewise
  static constexpr unsigned kMostChoices = 1000;  ///< of an "enum"

  /// @param faults  receives what is wrong
  SchemaCheck(const Json::Value& root, Faults& faults) : root_(root), faults_(faults) {}

  void Check() { Schema(root_, Place(), 0); }

 private:
  void Schema(const Json::Value& schema, const Place& place, int depth);
  void Reference(const Json::Value& schema, const Place& place, int depth);
  void Keyword(const std::string& name, const Json::Value& value, const Place& place, int depth);
  bool Plain(const std::string& name, const Json::Value& value, const Place& place);
  bool Nested(const std::string& name, const Json::Value& value, const Place& place, int depth);
  void Schemas(const Json::Value& list, const Place& place, int depth);
  void Members(const Json::Value& schemas, const Place& place, int depth);
  void Dependencies(const Json::Value& value, const Place& place, int depth);
  void Type(const Json::Value& value, const Place& place);
  void Names(const Json::Value& value, const Place& place, const char* rule);
  void Expression(const std::string& text, const Place& place, const char* rule);

  const Json::Value& root_;
  Faults& faults_;
  int count_ = 0;
};

}  // namespace QELO::Platform
