#pragma once

#include <json/json.h>

#include <cstddef>
#include <string>
#include <vector>

#include "webapi/Export.h"

/// The host's reader of JSON Schema, draft 7.
namespace QELO::Schema {

/// Something that is wrong with a value, or with a schema.
struct Fault {
  std::string path;     ///< where: a JSON pointer (RFC 6901), "" for the value or schema itself
  std::string rule;     ///< the schema's keyword, as "maximum"
  std::string message;  ///< for people; holds nothing of what a client sent
};

/// Most faults that are told of one value or schema.
inline constexpr size_t kMostFaults = 50;

enum class Verdict {
  kFits,
  kFaulty,      ///< the value does not fit
  kNoSchema,    ///< what should be the schema is none
  kUnreadable,  ///< schemas cannot be read on this host, which is logged
};

/// Whether a value is a schema that can be applied, for whoever writes one.
/// @param faults  receives what is wrong with it; paths lead into the schema
/// @return kFits, kNoSchema or kUnreadable
WEBAPI_API Verdict Check(const Json::Value& schema, std::vector<Fault>& faults);

/// Reads an object of parameters as a schema declares them, and checks it: a member that is
/// declared a text, and nothing else, takes the text that was sent for it; defaults are filled in;
/// a real without a fraction that is declared an integer becomes one.
/// @param sent    the texts that were sent, an object by name; a text counts while the member is
///                what it reads as. Null: members are as they should be
/// @param value   changed also when it does not fit
/// @param faults  receives what is wrong with the value, or, with kNoSchema, with the schema
WEBAPI_API Verdict Apply(const Json::Value& schema, const Json::Value& sent, Json::Value& value,
                         std::vector<Fault>& faults);

}  // namespace QELO::Schema
