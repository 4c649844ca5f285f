// QELO.Work.Task: the caller's background tasks.
//
// Whose tasks a caller may see is APIPolling's business; the process runs as root to read the
// records of every user.

#include <webapi/APIAuth.h>
#include <webapi/APIPolling.h>
#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>
#include <webapi/APITable.h>
#include <webapi/WebAPIError.h>

#include <string>

namespace {

using QELO::APIParameter;
using QELO::APIPolling;
using QELO::APIRequest;
using QELO::APIResponse;

constexpr char kApi[] = "QELO.Work.Task";
constexpr unsigned kMostIds = 1000;  ///< tasks in one call
constexpr int kDefaultWait = 30;     ///< seconds

/// A parameter that may be left out. @return false when it is of another type
template <typename T>
bool Optional(const APIParameter<T>& parameter, T def, T& value) {
  value = parameter.Get(def);
  return !parameter.IsInvalid();
}

bool OptionalText(const APIRequest& request, const char* name, std::string& value) {
  return Optional(request.GetAndCheckString(name, APIRequest::PARAM_OPTIONAL), std::string(),
                  value);
}

bool OptionalBool(const APIRequest& request, const char* name, bool& value) {
  return Optional(request.GetAndCheckBool(name, APIRequest::PARAM_OPTIONAL), false, value);
}

void AnswerBadRequest(APIResponse* response) {
  response->SetError(QELO::WEBAPI_ERR_BAD_REQUEST);
}

void Answer(APIResponse* response, const APIPolling& polling, bool success,
            const Json::Value& data) {
  if (success) {
    response->SetSuccess(data);
  } else {
    response->SetError(polling.GetError());
  }
}

/// Looking at tasks is no activity of the session, which would never time out while a page is
/// open that looks; unless the caller asks for it.
/// @return false when the parameter is malformed
bool CountActivity(APIRequest* request) {
  bool activity = false;
  if (!OptionalBool(*request, "activity", activity)) {
    return false;
  }
  if (activity) {
    QELO::APIAuth::UpdateTimeout(request);
  }
  return true;
}

void List(APIRequest* request, APIResponse* response) {
  const APIParameter<Json::Value> groups =
      request->GetAndCheckUnitArray("groups", APIRequest::PARAM_OPTIONAL);
  std::string prefix;
  if (groups.IsInvalid() || groups.IsReset() || !OptionalText(*request, "prefix", prefix)) {
    AnswerBadRequest(response);
    return;
  }
  Json::Value own(Json::arrayValue);
  own.append("user");
  APIPolling polling(request);
  Json::Value data;
  const bool found = polling.List(prefix, groups.Get(own), data);
  for (Json::Value& ids : data) {
    if (ids.isNull()) {
      ids = Json::Value(Json::arrayValue);
    }
  }
  Answer(response, polling, found, data);
}

void Status(APIRequest* request, APIResponse* response) {
  const APIParameter<Json::Value> ids =
      request->GetAndCheckArray("task_ids", APIRequest::PARAM_OPTIONAL);
  std::string id;
  if (ids.IsInvalid() || ids.IsReset() || ids.Get().size() > kMostIds ||
      !OptionalText(*request, "task_id", id) || ids.IsSet() == !id.empty() ||
      !CountActivity(request)) {
    AnswerBadRequest(response);
    return;
  }
  APIPolling polling(request);
  Json::Value data;
  const bool found = ids.IsSet() ? polling.Status(ids.Get(), data) : polling.Status(id, data);
  Answer(response, polling, found, data);
}

void Stop(APIRequest* request, APIResponse* response) {
  const APIParameter<std::string> id = request->GetAndCheckString("task_id");
  bool remove = false;
  if (id.IsInvalid() || id.IsReset() || !OptionalBool(*request, "remove", remove)) {
    AnswerBadRequest(response);
    return;
  }
  APIPolling polling(request);
  Answer(response, polling, polling.Stop(id.Get(), remove), Json::Value());
}

void Wait(APIRequest* request, APIResponse* response) {
  const APIParameter<std::string> id = request->GetAndCheckString("task_id");
  const APIParameter<int> seconds = request->GetAndCheckInt(
      "timeout", APIRequest::PARAM_OPTIONAL,
      [](const int& value) { return value >= 0 && value <= APIPolling::kLongestWait; });
  std::string state;
  if (id.IsInvalid() || id.IsReset() || seconds.IsInvalid() || seconds.IsReset() ||
      !OptionalText(*request, "state", state) || !CountActivity(request)) {
    AnswerBadRequest(response);
    return;
  }
  APIPolling polling(request);
  Json::Value data;
  const bool found = polling.Wait(id.Get(), state, seconds.Get(kDefaultWait), data);
  Answer(response, polling, found, data);
}

QELO::_tag_API_TABLE table[] = {
    {kApi, 1, "list", List}, {kApi, 1, "status", Status},    {kApi, 1, "stop", Stop},
    {kApi, 1, "wait", Wait}, {nullptr, 0, nullptr, nullptr},
};

}  // namespace

extern "C" WEBAPI_API QELO::_tag_API_TABLE* GetAPITable() {
  return table;
}
