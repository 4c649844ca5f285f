#pragma once

#include <json/json.h>

#include <span>
#include <string>

#include "programs/webapi/check/Findings.h"
#include "webapi/runner/catalogue/DescriptionKeys.h"

namespace QELO::AuthorProgram {

/// What a description is checked against beside itself.
struct CheckOptions {
  bool hasAccounts = true;   ///< accounts are looked up here
  bool hasLibraries = true;  ///< libraries are loaded
  std::string library;       ///< instead of the one that the description names; "": that one
  int seconds = 0;           ///< that loading one may take
};

/// Whether names other than the known ones may stand there.
enum class Others : bool { kNone, kOwn };

/// Checks an object's members: names, types, and of those whose values are bounded the values.
/// @param where  as "the method", for what is said of unknown names
void CheckMembers(const Json::Value& object, std::span<const DescriptionKeys::Key> keys,
                  Others others, const std::string& where, const CheckOptions& options,
                  Findings& findings);

}  // namespace QELO::AuthorProgram
