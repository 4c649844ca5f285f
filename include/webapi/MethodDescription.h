#pragma once

#include <json/json.h>

#include <map>
#include <string>
#include <vector>

#include "webapi/Export.h"

namespace QELO {

/// What a method's attributes tell its callers: texts, and the schemas of what it takes and gives.
///
///     {"create": {"grantByUser": true, "summary": "Adds a person",
///                 "params": {"type": "object", "properties": {"phone": {"type": "string"}}},
///                 "returns": {"type": "object"}, "errors": {"401": "no room"},
///                 "example": {"phone": "12345"}}}
///
/// It reads the attributes in place: they outlive it, and the values that it hands out live as long
/// as they are unchanged. Whatever they hold, nothing is thrown.
class WEBAPI_API MethodDescription {
 public:
  /// A part of the attributes that is not as it must be.
  struct Fault {
    std::string path;     ///< a JSON pointer into the attributes, as "/params/properties/size/type"
    std::string message;  ///< for the author
  };

  static constexpr int kFirstOwnError = 400;  ///< codes from here on are the API's own

  /// @param attributes  a method's, as APIRunner::GetMethod() gives them
  explicit MethodDescription(const Json::Value& attributes) : attributes_(attributes) {}

  /// One line, and more about it; "" when there is none.
  std::string GetSummary() const;
  std::string GetText() const;
  /// The schema of the parameters, an object; null when they are not declared. Of another type it
  /// is a fault, and comes as it is.
  const Json::Value& GetParams() const;
  /// The schema of an answer's "data", and an example of the parameters; null when there is none.
  const Json::Value& GetReturns() const;
  const Json::Value& GetExample() const;
  /// The API's own errors, in words. What is no fault-free member is left out.
  std::map<int, std::string> GetErrors() const;

  /// The keys that this class reads.
  static const std::vector<std::string>& Keys();

  /// All that is wrong with them, schemas included; none for attributes that have none of the keys.
  /// Schemas take the host's reader of schemas, and when there is none that is the fault.
  std::vector<Fault> Faults() const;

  /// The schema with what its references lead to in their places, for readers that know no
  /// references into a part of a document. @return null when one leads nowhere or in a circle
  static Json::Value Expand(const Json::Value& schema);

 private:
  const Json::Value& attributes_;
};

}  // namespace QELO
