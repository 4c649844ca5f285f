#pragma once

#include <json/json.h>

#include <cstddef>
#include <string_view>

namespace QELO::Platform {

/// JSON's types as bits.
enum JsonTypes : unsigned {
  kNoType = 0,
  kNull = 1,
  kBoolean = 2,
  kInteger = 4,  ///< a number without a fraction, as 5.0 too
  kNumber = 8,
  kText = 16,
  kList = 32,
  kObject = 64,
};

/// The bit of a type's name, kNoType for another name.
unsigned typeBit(std::string_view name);
/// Those that a value is of: an integer is a number too.
unsigned typesOf(const Json::Value& value);

bool isNumber(const Json::Value& value);
/// Whether a number has no fraction; true of any real as large as that.
bool isWhole(const Json::Value& number);
/// A text as it stands in the value, without a copy.
std::string_view textOf(const Json::Value& text);
/// Code points; bytes that are no UTF-8 count as one each.
size_t pointsIn(std::string_view text);

/// Orders two values, by type first; 0 when they are the same to JSON Schema, as 1 and 1.0 are.
/// Numbers are compared exactly.
int compare(const Json::Value& left, const Json::Value& right);
/// Whether a number is a whole number of times `unit`, above 0. Integers exactly; reals within what
/// rounding leaves of them.
bool isMultiple(const Json::Value& number, const Json::Value& unit);

}  // namespace QELO::Platform
