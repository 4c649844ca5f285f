#pragma once

#include <json/json.h>

#include <string>

#include "webapi/Export.h"

namespace QELO {

/// Access tokens of a user, for the API that gives them out. Needs the rights of the account that
/// owns the tokens' database.
class WEBAPI_API AccessToken {
 public:
  enum Result {
    TOKEN_OK,
    TOKEN_BAD_TERMS,  ///< the terms are not as they should be
    TOKEN_TOO_MANY,   ///< the user has as many as the setting "token_limit" allows
    TOKEN_NONE,       ///< the user has no such token
    TOKEN_FAILED      ///< the tokens cannot be used (logged)
  };

  /// Makes a token.
  /// @param terms   an object with "name" (1 to 64 bytes), "scopes" (array of 1 to 32 objects with
  ///                "api" and "method": a name, its beginning and a "*", or "*"; without "method"
  ///                all), "readOnly" (default false), "address" (address or network, default any)
  ///                and "days" (1 to 3650, default 90)
  /// @param record  receives what List() tells of it
  /// @param token   receives the token, a secret, this once
  /// @return TOKEN_OK; else the outputs are as they were
  static Result Create(const std::string& user, const Json::Value& terms, Json::Value& record,
                       std::string& token);
  /// @param records  receives an array of objects with "id", the terms, and as seconds since the
  ///                 epoch "created", "expires" (0: never) and "used" (0: not yet; a minute's
  ///                 precision)
  static Result List(const std::string& user, Json::Value& records);
  /// Removes a token of the user's; it is refused from then on.
  static Result Revoke(const std::string& user, long long id);
};

}  // namespace QELO
