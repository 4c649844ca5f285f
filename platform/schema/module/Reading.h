#pragma once

#include <json/json.h>

#include <cstddef>

namespace QELO::Platform {

/// Reads values as a schema that SchemaCheck finds nothing wrong with declares them. Of a schema
/// counts what holds in any case: not what stands below "anyOf", "if" and the like, but for the
/// types that are declared there.
class Reading {
 public:
  static constexpr size_t kMostVisits = 1'000'000;  ///< of a schema to a value

  explicit Reading(const Json::Value& root) : root_(root) {}

  /// @param sent  the texts of the object's members, or null; see Schema::Apply()
  void Read(const Json::Value& sent, Json::Value& value) { Read(root_, sent, value); }

 private:
  void Read(const Json::Value& schema, const Json::Value& sent, Json::Value& value);
  void ReadMembers(const Json::Value& schema, const Json::Value& sent, Json::Value& value);
  void ReadItems(const Json::Value& schema, Json::Value& value);
  void TakeText(const Json::Value& schema, const Json::Value& sent, Json::Value& value);
  unsigned Declared(const Json::Value& schema, int depth);

  const Json::Value& root_;
  size_t visitsLeft_ = kMostVisits;
};

}  // namespace QELO::Platform
