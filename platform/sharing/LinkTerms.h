#pragma once

#include <json/json.h>

#include "platform/sharing/LinkStore.h"

namespace QELO::Platform {

/// Takes a link's terms from an object, each where it is named; see CreateLink().
/// @param link      its password is left alone
/// @param password  receives the one that is named, or null
/// @return false when a term is none, of a wrong type or out of range, and when they do not go
///         together: a password, a number of uses or an address match without a session
bool takeTerms(const Json::Value& terms, StoredLink& link, Json::Value& password);

/// What the link's owner may know of it.
Json::Value toJson(const StoredLink& link);

}  // namespace QELO::Platform
