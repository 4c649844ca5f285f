#pragma once

#include <json/json.h>

#include "webapi/ExecParam.h"

namespace QELO {

/// A call given as C texts, of which null counts as empty.
ExecParam ExecCall(int outputFd, const char* api, int version, const char* method,
                   const Json::Value& params, const Json::Value& attributes, const char* runner);

}  // namespace QELO
