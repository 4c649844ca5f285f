#pragma once

#include <json/json.h>

#include <cstdint>
#include <string>

#include "webapi/Export.h"

namespace QELO {

class APIRequest;

/// Sharing links, for the API by which users share and visitors come in. All but Of() needs the
/// rights of the account that owns the links' database.
///
/// `terms` and `link` are objects; docs/sharing.md tells their members. Outputs are unchanged
/// unless the result is LINK_OK, or told otherwise.
class WEBAPI_API SharingLink {
 public:
  enum Result {
    LINK_OK,
    LINK_ABSENT,          ///< there is no such link, or it is another user's
    LINK_BAD_TERMS,       ///< a term is none, of a wrong type or out of range
    LINK_TOO_MANY,        ///< the user has as many links as one may have
    LINK_REFUSED,         ///< it has expired or is used up, or its owner may not use it
    LINK_WRONG_PASSWORD,  ///< the attempt was counted
    LINK_WAIT,            ///< refused without looking: too many wrong passwords
    LINK_FAILED,          ///< the database cannot be used, which is logged
    LINK_NOT_POST,        ///< refused without looking: a password in an address ends in logs
    LINK_OTHER_SITE       ///< likewise: the page that a browser sent it for is another site's
  };

  /// The links of the request's user.
  /// @param link  receives what was made, with its secret "link"
  static Result Create(const APIRequest& request, const Json::Value& terms, Json::Value& link);
  /// @param links  receives a list, the oldest first
  static Result List(const APIRequest& request, Json::Value& links);
  /// @param terms  those that change
  /// @param link   receives what it is now
  static Result Change(const APIRequest& request, int64_t id, const Json::Value& terms,
                       Json::Value& link);
  static Result Remove(const APIRequest& request, int64_t id);
  /// The one with an id.
  /// @param id    the secret that the link's address ends with
  /// @param link  receives what it is, with that secret as "link"
  static Result Find(const APIRequest& request, const std::string& id, Json::Value& link);

  /// Opens a link for whoever sends the request; one line to the authorisation facility says what
  /// came of it.
  /// @param id     the secret that the link's address ends with
  /// @param visit  receives "sid", "seconds", "project", "path" and "upload"; for LINK_WAIT
  ///               "retryAfter", the seconds until the next attempt is looked at
  static Result Open(const APIRequest& request, const std::string& id, const std::string& password,
                     Json::Value& visit);

  /// What is shared by the link that the request came by: an object with "project", "path",
  /// "upload" and "owner"; null without a link that is known. Says nothing of whether the visitor
  /// may use it.
  static Json::Value Of(const APIRequest& request);
};

}  // namespace QELO
