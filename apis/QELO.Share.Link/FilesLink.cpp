#include "FilesLink.h"

#include <webapi/APIRunner.h>
#include <webapi/JsonHelper.h>
#include <webapi/WebAPIError.h>

#include <string>

namespace share {
namespace {

namespace JsonHelper = QELO::JsonHelper;

constexpr char kFiles[] = "QELO.Files.Item";
constexpr int kNotToBeShared = 409;

/// Asks as the owner, by whose rights visitors will come.
Json::Value lookAt(const QELO::APIRequest& request, const Json::Value& path) {
  Json::Value params(Json::objectValue);
  params["path"] = path;
  Json::Value answer;
  QELO::APIRunner::Exec(answer, kFiles, 1, "stat", params, Json::Value(),
                        request.GetLoginUserName().c_str());
  return answer;
}

/// Why nothing can be shared by a path; null: it can.
Json::Value reasonAgainst(const Json::Value& answer) {
  const Json::Value& data = JsonHelper::member(answer, "data");
  const Json::Value& items = JsonHelper::member(data, "items");
  if (items.type() != Json::arrayValue || items.size() != 1) {
    const Json::Value& errors = JsonHelper::member(JsonHelper::member(answer, "error"), "errors");
    const Json::Value& reason = JsonHelper::member(errors, "reason");
    return reason.type() == Json::stringValue ? reason : Json::Value("failed");
  }
  const std::string type = JsonHelper::asString(JsonHelper::member(items[0], "type"));
  const bool isShared = type == "file" || type == "folder" || type == "share";
  return isShared ? Json::Value() : Json::Value(type);
}

}  // namespace

Json::Value faultAt(const char* path, const char* rule, const char* message) {
  Json::Value fault(Json::objectValue);
  fault["path"] = path;
  fault["rule"] = rule;
  fault["message"] = message;
  Json::Value faults(Json::arrayValue);
  faults.append(fault);
  return faults;
}

bool checkFilesTerms(const QELO::APIRequest& request, bool isNew, Json::Value& terms,
                     QELO::APIResponse* response) {
  if (isNew && !JsonHelper::hasMember(terms, "protect")) {
    terms["protect"] = "owner";
  }
  if (JsonHelper::hasMember(terms, "protect") && terms["protect"] != Json::Value("owner")) {
    response->SetError(QELO::WEBAPI_ERR_BAD_REQUEST,
                       faultAt("/protect", "files", "must be owner for files"));
    return false;
  }
  if (!JsonHelper::hasMember(terms, "path")) {
    if (isNew) {
      response->SetError(QELO::WEBAPI_ERR_BAD_REQUEST, faultAt("/path", "required", "is missing"));
    }
    return !isNew;
  }
  const Json::Value reason = reasonAgainst(lookAt(request, terms["path"]));
  if (!reason.isNull()) {
    Json::Value errors(Json::objectValue);
    errors["path"] = terms["path"];
    errors["reason"] = reason;
    response->SetError(kNotToBeShared, errors);
  }
  return reason.isNull();
}

}  // namespace share
