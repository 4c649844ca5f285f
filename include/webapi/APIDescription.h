#pragma once

#include <json/json.h>

#include <string>
#include <string_view>
#include <vector>

#include "webapi/Export.h"

namespace QELO {

/// One API's description, as APIRunner::InitLibDesc() puts it into a catalogue: which versions and
/// methods there are, what is set for a method, and who may call it.
///
///     {"lib": "./Files.so", "minVersion": 1, "maxVersion": 2, "authLevel": 1,
///      "methods": {"1": ["list", {"get": {"allowDownload": true}}], "2": [...]}}
///
/// It reads the JSON value in place: the value outlives it, and the values that it hands out live
/// as long as that one is unchanged. Whatever the value holds, nothing is thrown.
class WEBAPI_API APIDescription {
 public:
  /// Who must be logged in, and what becomes of a caller who may not call.
  enum AuthLevel : int {
    AUTH_NONE = 0,   ///< nobody is asked who he is
    AUTH_LOGIN = 1,  ///< refused
    AUTH_SKIP = 2    ///< the caller is checked, and let in whatever comes of it
  };

  explicit APIDescription(const Json::Value& description) : description_(description) {}

  /// What makes a description unusable, in words that name the key; "" when it is usable: "lib" a
  /// string, "minVersion" and "maxVersion" integers, "methods" an object, "priority", if any, an
  /// integer from -10 to 10.
  std::string Fault() const;

  /// Whether a version lies within "minVersion" and "maxVersion".
  bool HasVersion(int version) const;
  /// The versions that can be called, ascending: those above 0 and within the bounds that "methods"
  /// has a list for.
  std::vector<int> Versions() const;

  /// Whether a version lists a method, as a text or as any member of an object.
  bool Lists(int version, const std::string& method) const;
  /// The methods that a version lists, in the list's order, each once.
  std::vector<std::string> Methods(int version) const;
  /// A method's own attributes as they stand there, be they no object; null when it has none: the
  /// defaults of lib.def hold then. Only the first member of an object in the list has its own.
  const Json::Value* Attributes(int version, const std::string& method) const;
  /// Whether an attribute is set. Attributes that are no object set none.
  static bool IsSet(const Json::Value& attributes, std::string_view attribute);
  /// Whether calls of the method may share a process that stays: its "isolation" is "worker".
  /// Anything else, of whatever type, is the strictest: a process for each call.
  static bool SharesProcess(const Json::Value& attributes);

  /// An AuthLevel, or another integer, which asks for a login too. So does a level that is missing
  /// or no integer, be it the text "0" or false: it is AUTH_LOGIN.
  int GetAuthLevel() const;
  /// The user classes that may call: the method's own "allowUser" if it has one, else the API's; a
  /// null value when there is none, and then nobody may.
  /// @param attributes  the method's
  const Json::Value& GetAllowUser(const Json::Value& attributes) const;
  /// The application privilege that callers must hold. Missing, null or empty it asks for nothing;
  /// one that is no text is held by nobody.
  const Json::Value& GetAppPriv() const;
  /// The account that a method runs as, unless "grantByDefault" or "grantByUser" is set: the
  /// method's own "runAs" if it has one, else the API's, else "system".
  std::string GetRunAs(const Json::Value& attributes) const;

 private:
  const Json::Value& Entries(int version) const;

  const Json::Value& description_;
};

}  // namespace QELO
