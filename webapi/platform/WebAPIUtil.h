#pragma once

#include <json/json.h>

#include <cstddef>
#include <string>

#include "webapi/Export.h"

/// The host's web-API utility library.
namespace QELO::WebAPIUtil {

/// Reads a file of JSON text. @return false, and `value` unchanged, on failure
WEBAPI_API bool ReadJsonFile(const std::string& path, Json::Value& value);
/// Decodes %XX; a malformed escape stays as it is.
/// @param plusIsBlank  "+" means a blank
WEBAPI_API std::string URLDecode(const std::string& text, bool plusIsBlank);
/// Encodes every byte but letters, digits, "-", "_", "." and "~".
WEBAPI_API std::string URLEncode(const std::string& text);
/// The pieces between separators, without blanks around them; empty pieces are left out.
WEBAPI_API Json::Value ParseToArray(const char* text, const char* separator);
/// Parameters that a line may have. A person's request has a dozen.
inline constexpr size_t kMostParameters = 10'000;
/// JSON values in all parameters of a line, nested ones counted: each takes 100 to 200 bytes.
inline constexpr size_t kMostValues = 50'000;

/// Adds the name=value pairs of a parameter line to an object; a later name replaces an earlier.
/// @param decode     %XX and "+" are decoded
/// @param parseJson  a value that is a JSON text as a whole becomes that JSON, unless a number
///                   would lose digits; all else is a string
/// @return false, and nothing is added, when the line has a broken %XX escape, or more than
///         kMostParameters or kMostValues: what is beyond was not built
WEBAPI_API bool strPairToJsonObj(const std::string& line, Json::Value& object, bool decode,
                                 bool parseJson);

}  // namespace QELO::WebAPIUtil
