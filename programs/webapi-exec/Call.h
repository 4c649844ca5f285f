#pragma once

#include <json/json.h>

#include "programs/webapi-exec/Options.h"

namespace QELO::ExecProgram {

/// The user whom the options name, or the calling account.
/// @param user  receives the name
/// @return why the caller may not call as this user, or ""
std::string findUser(const Options& options, std::string& user);

/// Makes the call or the batch that the options tell.
/// @param answer  receives the answer
/// @return what kept it from being made, or from writing the file of the option "output" whole; ""
///         when nothing did. In the second case the answer is an object, else null.
std::string makeCall(const Options& options, Json::Value& answer);

}  // namespace QELO::ExecProgram
