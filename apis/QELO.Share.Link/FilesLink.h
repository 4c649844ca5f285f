#pragma once

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>

namespace share {

/// What a link of the project "files" has to be, so that visitors get anywhere by it: its path
/// leads to a file or folder that the owner can look at, and calls by it are made in the owner's
/// name.
/// @param terms     those that are named; "protect" is set when a new link's is not
/// @param isNew     the link is not there yet, so "path" has to be named
/// @param response  receives the error: 101 or 409 with what is wrong
/// @return whether they are good
bool checkFilesTerms(const QELO::APIRequest& request, bool isNew, Json::Value& terms,
                     QELO::APIResponse* response);

/// The same fault as a declared parameter's has.
Json::Value faultAt(const char* path, const char* rule, const char* message);

}  // namespace share
