#pragma once

#include <json/json.h>

#include "webapi/Export.h"

/// Texts by their names, as the host's CGI library hands out the fields of a form. Each name has
/// one value; names and values end at their first NUL.
struct QLIBSZHASH;

extern "C" {

/// @param size  names expected; more may be set
/// @return an empty hash, which the caller frees; null without memory
WEBAPI_API QLIBSZHASH* QLIBCSzHashAlloc(int size);
/// Null is freed too.
WEBAPI_API void QLIBCSzHashFree(QLIBSZHASH* hash);
WEBAPI_API void QLIBCHashRemoveAll(QLIBSZHASH* hash);
/// Gives a name its value in place of a former one.
/// @param hash  one that is null is made
/// @return 0 on success, a negative value without memory
WEBAPI_API int QLIBCSzHashSetValue(QLIBSZHASH** hash, const char* name, const char* value);
/// @return the value, which lives until the name is set again or removed; null when there is none
WEBAPI_API const char* QLIBCSzHashGetValue(const QLIBSZHASH* hash, const char* name);
/// The names with their values one after the other, in the order of the bytes of the names.
/// @param name  null: the first; else one that is in the hash: what comes behind it
/// @return the name, and `value` if it is not null; null behind the last
WEBAPI_API const char* QLIBCSzHashNext(const QLIBSZHASH* hash, const char* name,
                                       const char** value);

}  // extern "C"

namespace QELO::WebAPIUtil {

/// Copies a hash into an object, a member for each name: a value that is a JSON text as a whole
/// becomes that JSON, as in a parameter line; all else is a string.
/// @return false, and nothing is copied, when `object` is neither null nor an object, or the values
///         are more than a parameter line may have
WEBAPI_API bool SzHashToJsonObj(const QLIBSZHASH* hash, Json::Value& object);

}  // namespace QELO::WebAPIUtil
