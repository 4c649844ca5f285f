#include "platform/tasks/Values.h"

#include "webapi/JsonHelper.h"

namespace QELO::Platform {
namespace {

constexpr size_t kNameLength = 256;
constexpr int kErrorCode = 117;  // no result was set

bool nestsDeeper(const Json::Value& value, int depth) {
  if (!value.isArray() && !value.isObject()) {
    return false;
  }
  if (depth == 0) {
    return true;
  }
  for (const Json::Value& element : value) {
    if (nestsDeeper(element, depth - 1)) {
      return true;
    }
  }
  return false;
}

const char* reasonOf(TaskEnding ending) {
  switch (ending) {
    case TaskEnding::kNeverStarted:
      return "The process that should do the task did not start.";
    case TaskEnding::kRestarted:
      return "The machine was restarted before the task was finished.";
    default:
      return "The task's process ended without finishing it.";
  }
}

}  // namespace

bool isTaskPropertyName(std::string_view name) {
  return !name.empty() && name.size() <= kNameLength && name.find('\0') == std::string_view::npos;
}

bool writeTaskValue(const Json::Value& value, std::string& text) {
  if (nestsDeeper(value, JsonHelper::kMaxDepth)) {
    return false;
  }
  text = JsonHelper::toString(value);
  return true;
}

bool hasTaskFailed(TaskEnding ending) {
  return ending != TaskEnding::kRunning && ending != TaskEnding::kFinished;
}

Json::Value makeTaskErrorBody(TaskEnding ending) {
  Json::Value body;
  body["success"] = false;
  body["error"]["code"] = kErrorCode;
  body["error"]["errors"]["reason"] = reasonOf(ending);
  return body;
}

}  // namespace QELO::Platform
