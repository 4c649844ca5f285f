#include "programs/entry/RestEntry.h"

#include <strings.h>
#include <unistd.h>

#include <chrono>
#include <cstdlib>
#include <string_view>
#include <utility>

#include "programs/entry/RestPath.h"
#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/JsonHelper.h"
#include "webapi/WebAPIError.h"
#include "webapi/base/Number.h"
#include "webapi/base/Text.h"
#include "webapi/entry/intake/RequestBody.h"
#include "webapi/json/Reader.h"

namespace QELO {
namespace {

constexpr size_t kMostValues = 50'000;           ///< JSON values of a body, as in a parameter line
constexpr std::chrono::minutes kLongestWait{5};  ///< for a body, in all
constexpr std::string_view kJson = "application/json";

std::string variable(const char* name) {
  const char* value = getenv(name);
  return value != nullptr ? value : "";
}

/// A body's values are JSON already: none takes the text that the query has by its name.
void forgetTextsOf(const Json::Value& body, APIRequest& request) {
  Json::Value texts = request.GetSentTexts();
  for (auto it = body.begin(); it != body.end(); ++it) {
    texts.removeMember(it.name());
  }
  request.ForgetSentTexts();
  request.KeepSentTexts(std::move(texts));
}

/// Whether a media type is JSON's, whatever stands behind it.
bool isJson(std::string_view type) {
  const std::string name(Trim(TakePiece(type, ";")));
  return strcasecmp(name.c_str(), kJson.data()) == 0;
}

}  // namespace

bool RestEntry::Refuse(int code, _tag_HTTP_STATUS_CODE status, const char* rule,
                       const char* message) {
  Json::Value faults;
  if (*rule != '\0') {
    Json::Value fault(Json::objectValue);
    fault["path"] = "";
    fault["rule"] = rule;
    fault["message"] = message;
    faults.append(std::move(fault));
  }
  Response()->SetError(code, faults);
  Response()->SetStatus(status, "");
  return false;
}

bool RestEntry::Initialize(const Json::Value& param) {
  TellErrorsByStatus();
  RestPath call;
  if (!RestPath::Read(variable("PATH_INFO"), call)) {
    return Refuse(WEBAPI_ERR_NO_SUCH_API, HTTP_STATUS_NOT_FOUND);
  }
  if (variable("REQUEST_METHOD") != "POST") {
    Response()->SetHeader("Allow", "POST");
    return Refuse(WEBAPI_ERR_BAD_REQUEST, HTTP_STATUS_METHOD_NOT_ALLOWED);
  }
  Json::Value all(Json::objectValue);
  Json::Value& params = all["postParam"];
  if (!TakeBody(params)) {
    return false;
  }
  // To all that follows the body was never there.
  setenv("REQUEST_METHOD", "GET", 1);
  for (const char* name : {"CONTENT_LENGTH", "CONTENT_TYPE", "HTTP_X_TYPE_NAME"}) {
    unsetenv(name);
  }
  if (!WebEntry::Initialize(param)) {
    return false;
  }
  if (!params.empty()) {
    forgetTextsOf(params, *Request());
  }
  params["api"] = call.api;
  params["version"] = call.version;
  params["method"] = call.method;
  Request()->InitParam(std::move(all), false);
  return true;
}

bool RestEntry::TakeBody(Json::Value& params) {
  params = Json::Value(Json::objectValue);
  const std::string length = variable("CONTENT_LENGTH");
  int64_t size = 0;
  if (!length.empty() && (!ParseNumber(length, size) || size < 0)) {
    return Refuse(WEBAPI_ERR_BAD_REQUEST, HTTP_STATUS_BAD_REQUEST);
  }
  if (size == 0) {
    return true;
  }
  if (!isJson(variable("CONTENT_TYPE"))) {
    return Refuse(WEBAPI_ERR_BAD_REQUEST, HTTP_STATUS_UNSUPPORTED_MEDIA_TYPE, "type",
                  "the body must be of the type application/json");
  }
  if (size > RequestBody::kMaxLength) {
    return Refuse(WEBAPI_ERR_BAD_REQUEST, HTTP_STATUS_PAYLOAD_TOO_LARGE, "size",
                  "the body is too long");
  }
  std::string text;
  PaceLimits pace;
  pace.longest = kLongestWait;
  const bool isRead = RequestBody::Read(STDIN_FILENO, size, pace, text);
  RequestBody::CloseStandardInput();
  JsonHelper::Reading how;
  how.maxValues = kMostValues;
  Json::Value body;
  // What was cut off, or stands behind a NUL, is no part of the text.
  if (!isRead || text.size() != static_cast<size_t>(size) ||
      JsonHelper::readJsonText(text, how, body) != JsonHelper::ReadResult::kRead ||
      !body.isObject()) {
    return Refuse(WEBAPI_ERR_BAD_REQUEST, HTTP_STATUS_BAD_REQUEST, "type",
                  "the body must be a JSON object");
  }
  params.swap(body);
  return true;
}

}  // namespace QELO
