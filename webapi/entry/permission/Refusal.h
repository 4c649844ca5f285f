#pragma once

#include <string>

#include "webapi/APIRequest.h"

namespace QELO {

/// Which check of a session or an access token refused, in words for the log.
/// @param hasToken  an access token came with the call
const char* RefusalReason(_tag_authorized_result_ result, bool hasToken);

/// One line to the authorisation facility, as logins have it: a call was refused, to whom and why.
/// @param caller  the process's own request: its client and, where that is known, its user
void LogRefusal(const APIRequest& caller, const std::string& reason);

}  // namespace QELO
