#pragma once

#include <json/json.h>

#include <string>

#include "webapi/JsonHelper.h"
#include "webapi/json/Reader.h"

namespace QELO::DaemonMessage {

/// Members of the message to a daemon: the request's and the response's record. Its answer is the
/// response's record alone.
inline constexpr char kRequest[] = "req";
inline constexpr char kResponse[] = "resp";

/// Levels of nesting around what a request or a response may hold by itself: the message, the
/// record, its section, and what a body has around its data.
inline constexpr int kLevelsAround = 8;

/// Reads a message. @return false when the text is no JSON
inline bool Read(const std::string& text, Json::Value& message) {
  JsonHelper::Reading how;
  how.maxDepth = JsonHelper::kMaxDepth + kLevelsAround;
  return JsonHelper::readJsonText(text, how, message) == JsonHelper::ReadResult::kRead;
}

}  // namespace QELO::DaemonMessage
