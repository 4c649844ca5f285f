#pragma once

#include <json/json.h>

#include <string>

#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/runner/daemon/Message.h"

/// What goes between a front and a worker: an API daemon's message, and beside it the environment
/// that the method finds.
namespace QELO::WorkerMessage {

/// "NAME=value" texts.
inline constexpr char kEnvironment[] = "environ";

/// The text of a call as permitted so far.
std::string Call(APIRequest& request, APIResponse& response);

/// What tells workers apart: an account's name behind a priority.
std::string KeyOf(int priority, const std::string& account);
/// @return false for a text that KeyOf() does not make
bool ReadKey(const std::string& key, int& priority, std::string& account);

}  // namespace QELO::WorkerMessage
