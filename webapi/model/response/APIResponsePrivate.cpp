#include "webapi/model/response/APIResponsePrivate.h"

#include <algorithm>
#include <cstdlib>
#include <utility>

#include "webapi/APIRequest.h"
#include "webapi/JsonHelper.h"
#include "webapi/base/Log.h"
#include "webapi/json/Literal.h"
#include "webapi/platform/Task.h"

namespace QELO {

APIResponsePrivate::APIResponsePrivate(APIRequest* request, APIResponse* owner)
    : request_(request), owner_(owner) {
  AddSection("headers");
  store_[Literal("setCookie")] = Json::Value(Json::arrayValue);
  AddSection("success");
  AddSection("option");
  store_[Literal("code")] = Json::Int64{0};
}

void APIResponsePrivate::SetError(int code, const Json::Value& data) {
  PrepareTask();
  Json::Value body(Json::objectValue);
  body[Literal("success")] = code == 0;
  Json::Value* detail = nullptr;
  const bool isNull = data.type() == Json::nullValue;
  if (code != 0) {
    Json::Value& error = body[Literal("error")];
    error[Literal("code")] = Json::Int64{code};
    detail = isNull ? nullptr : &error[Literal("errors")];
  } else if (!isNull) {
    detail = &body[Literal("data")];
  }
  if (detail != nullptr) {
    *detail = data;
  }
  if (store_.type() != Json::objectValue) {  // a record that another process sent broken
    store_ = Json::Value(Json::objectValue);
  }
  store_[Literal("code")] = Json::Int64{code};
  store_[Literal("body")].swap(body);
  UpdateTask();
}

bool APIResponsePrivate::SetStatus(int code, const std::string& message) {
  return SetData("headers", "Status", std::to_string(code), true) &&
         SetData("option", "statusMsg", message, true);
}

bool APIResponsePrivate::Redirect(const std::string& path) {
  if (request_ == nullptr) {
    return false;
  }
  std::string location =
      request_->GetURLProto("") + "://" + JsonHelper::asString(request_->GetEnv("HTTP_HOST"));
  if (path.at(0) != '/') {
    location += '/';
  }
  return SetData("headers", "Location", location + path, true);
}

void APIResponsePrivate::SetCallbackFunc(APIResponse::CallbackFunc function, void* argument) {
  if (getenv("in_qeloapid") != nullptr) {
    WEBAPI_LOG("APIResponse.cpp", "cannot use callback function in qeloapid");
    return;
  }
  const std::pair<APIResponse::CallbackFunc, void*> entry(function, argument);
  if (function != nullptr &&
      std::find(callbacks_.begin(), callbacks_.end(), entry) == callbacks_.end()) {
    callbacks_.push_back(entry);
  }
}

}  // namespace QELO
