#pragma once

#include <json/json.h>

#include <string>
#include <string_view>

#include "platform/tasks/module/TaskModule.h"

/// What task records hold as JSON.
namespace QELO::Platform {

/// The property that holds the answer to a client.
inline constexpr char kTaskBody[] = "body";

/// One to 256 bytes, no NUL among them.
bool isTaskPropertyName(std::string_view name);

/// @return false when the value nests deeper than it could be read again
bool writeTaskValue(const Json::Value& value, std::string& text);

/// Whether the task ended without being finished.
bool hasTaskFailed(TaskEnding ending);

/// The answer that says how such a task ended.
Json::Value makeTaskErrorBody(TaskEnding ending);

}  // namespace QELO::Platform
