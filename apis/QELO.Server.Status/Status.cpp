// QELO.Server.Status: how the fork server is doing.

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>
#include <webapi/APITable.h>
#include <webapi/JsonHelper.h>

#include <string>

#include "Page.h"

namespace {

namespace JsonHelper = QELO::JsonHelper;

enum Error : int { kNoAnswer = 400 };

void Get(QELO::APIRequest* request, QELO::APIResponse* response) {
  const std::string socket = JsonHelper::asString(request->GetAPIInfo("metrics"));
  std::string text;
  Json::Value data(Json::objectValue);
  switch (serverstatus::ReadPage(socket, "/status", text)) {
    case serverstatus::Outcome::kNobody:
      data["running"] = false;
      response->SetSuccess(data);
      return;
    case serverstatus::Outcome::kRead:
      if (JsonHelper::fromString(text, data) && data.isObject()) {
        data["running"] = true;
        response->SetSuccess(data);
        return;
      }
      break;
    case serverstatus::Outcome::kFailed:
      break;
  }
  response->SetError(kNoAnswer);
}

QELO::_tag_API_TABLE table[] = {
    {"QELO.Server.Status", 1, "get", Get},
    {nullptr, 0, nullptr, nullptr},
};

}  // namespace

extern "C" WEBAPI_API QELO::_tag_API_TABLE* GetAPITable() {
  return table;
}
