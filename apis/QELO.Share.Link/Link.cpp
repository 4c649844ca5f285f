// QELO.Share.Link: users share by links, and visitors open them.

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>
#include <webapi/APITable.h>
#include <webapi/JsonHelper.h>
#include <webapi/SharingLink.h>
#include <webapi/WebAPIError.h>

#include <string>

#include "FilesLink.h"
#include "QrCode.h"

namespace {

using QELO::APIRequest;
using QELO::APIResponse;
using QELO::SharingLink;
namespace JsonHelper = QELO::JsonHelper;

constexpr char kApi[] = "QELO.Share.Link";
constexpr char kCookie[] = "sharing_sid";
constexpr char kFilesProject[] = "files";
constexpr const char* kTerms[] = {"name",   "path",    "protect", "password", "matchAddress",
                                  "upload", "expires", "maxUses", "maxBytes"};

enum Error : int {
  kAbsent = 400,
  kUnavailable = 401,
  kRefused = 402,
  kOtherSite = 403,
  kWrongPassword = 404,
  kNotPost = 405,
  kTooManyLinks = 406,
  kTooManyAttempts = 407,
  kTooLong = 408
};

int ErrorOf(SharingLink::Result result) {
  switch (result) {
    case SharingLink::LINK_ABSENT:
      return kAbsent;
    case SharingLink::LINK_BAD_TERMS:
      return QELO::WEBAPI_ERR_BAD_REQUEST;
    case SharingLink::LINK_TOO_MANY:
      return kTooManyLinks;
    case SharingLink::LINK_REFUSED:
      return kRefused;
    case SharingLink::LINK_WRONG_PASSWORD:
      return kWrongPassword;
    case SharingLink::LINK_WAIT:
      return kTooManyAttempts;
    case SharingLink::LINK_NOT_POST:
      return kNotPost;
    case SharingLink::LINK_OTHER_SITE:
      return kOtherSite;
    default:
      return kUnavailable;
  }
}

/// A text as it was typed: one that looks like JSON, as a password of digits does, has been read as
/// JSON.
Json::Value TypedText(const Json::Value& value) {
  return value.isNull() ? Json::Value("null") : Json::Value(JsonHelper::asString(value));
}

/// The terms that the request names.
Json::Value TermsOf(const APIRequest& request) {
  Json::Value terms(Json::objectValue);
  for (const char* name : kTerms) {
    if (request.HasParam(name)) {
      terms[name] = request.GetParam(name);
    }
  }
  for (const char* name : {"name", "path", "password"}) {
    if (JsonHelper::hasMember(terms, name)) {
      terms[name] = TypedText(terms[name]);
    }
  }
  return terms;
}

/// Adds the address that visitors are sent to, where the secret is known. What stands behind "#" no
/// browser sends, so that it is in no server's log.
void AddAddress(const APIRequest& request, Json::Value& link) {
  if (JsonHelper::hasMember(link, "link")) {
    link["url"] = request.GetSharingURL("") + "#" + JsonHelper::asString(link["link"]);
  }
}

void Answer(APIResponse* response, SharingLink::Result result, const Json::Value& data) {
  if (result == SharingLink::LINK_OK) {
    response->SetSuccess(data);
  } else if (result == SharingLink::LINK_BAD_TERMS) {
    response->SetError(QELO::WEBAPI_ERR_BAD_REQUEST,
                       share::faultAt("", "terms",
                                      "the terms do not go together, or a text of theirs is too "
                                      "long or holds control characters"));
  } else {
    response->SetError(ErrorOf(result));
  }
}

/// Whether a link of the caller's is of files; one that is not known is of none.
bool IsOfFiles(const APIRequest& request, long long id) {
  Json::Value links;
  if (SharingLink::List(request, links) == SharingLink::LINK_OK) {
    for (const Json::Value& link : links) {
      if (JsonHelper::member(link, "id") == Json::Value(Json::Int64{id})) {
        return JsonHelper::member(link, "project") == Json::Value(kFilesProject);
      }
    }
  }
  return false;
}

void Create(APIRequest* request, APIResponse* response) {
  Json::Value terms = TermsOf(*request);
  terms["project"] = request->GetParam("project");
  if (terms["project"] == Json::Value(kFilesProject) &&
      !share::checkFilesTerms(*request, true, terms, response)) {
    return;
  }
  Json::Value link;
  const SharingLink::Result result = SharingLink::Create(*request, terms, link);
  if (result == SharingLink::LINK_OK) {
    AddAddress(*request, link);
  }
  Answer(response, result, link);
}

void List(APIRequest* request, APIResponse* response) {
  Json::Value data(Json::objectValue);
  const SharingLink::Result result = SharingLink::List(*request, data["links"]);
  Answer(response, result, data);
}

void Change(APIRequest* request, APIResponse* response) {
  const auto id = request->GetAndCheckIntegral<long long>("id");
  if (id.IsInvalid()) {
    response->SetError(QELO::WEBAPI_ERR_BAD_REQUEST);
    return;
  }
  Json::Value terms = TermsOf(*request);
  if (request->HasParam("renew")) {
    terms["renew"] = request->GetParam("renew");
  }
  const bool mayMatter =
      JsonHelper::hasMember(terms, "path") || JsonHelper::hasMember(terms, "protect");
  if (mayMatter && IsOfFiles(*request, id.Get()) &&
      !share::checkFilesTerms(*request, false, terms, response)) {
    return;
  }
  Json::Value link;
  const SharingLink::Result result = SharingLink::Change(*request, id.Get(), terms, link);
  if (result == SharingLink::LINK_OK) {
    AddAddress(*request, link);
  }
  Answer(response, result, link);
}

void Remove(APIRequest* request, APIResponse* response) {
  const auto id = request->GetAndCheckIntegral<long long>("id");
  if (id.IsInvalid()) {
    response->SetError(QELO::WEBAPI_ERR_BAD_REQUEST);
    return;
  }
  Answer(response, SharingLink::Remove(*request, id.Get()), Json::Value());
}

/// The address of a link as a picture, for a telephone's camera.
void Qr(APIRequest* request, APIResponse* response) {
  Json::Value link;
  const SharingLink::Result result =
      SharingLink::Find(*request, JsonHelper::asString(request->GetParam("link")), link);
  if (result != SharingLink::LINK_OK) {
    response->SetError(ErrorOf(result));
    return;
  }
  AddAddress(*request, link);
  Json::Value data(Json::objectValue);
  std::string svg;
  if (!share::drawQrCode(JsonHelper::asString(link["url"]), svg)) {
    response->SetError(kTooLong);
    return;
  }
  data["id"] = link["id"];
  data["url"] = link["url"];
  data["svg"] = svg;
  response->SetSuccess(data);
}

void AddSessionCookie(const APIRequest& request, APIResponse* response, const std::string& sid) {
  const bool isSecure = request.GetURLProto("") == "https";
  if (!response->AddCookie(kCookie, sid, "/", 0, "", isSecure, true)) {
    return;
  }
  Json::Value& cookies = response->Serialize()["setCookie"];
  Json::Value& cookie = cookies[cookies.size() - 1];
  cookie = JsonHelper::asString(cookie) + "; samesite=strict";
}

void Open(APIRequest* request, APIResponse* response) {
  // The check before it finds nobody logged in and says so in a header, which is no news.
  response->Serialize()["headers"].removeMember("x-request-error");
  Json::Value visit;
  const std::string id = JsonHelper::asString(request->GetParam("link"));
  const std::string password = request->HasParam("password")
                                   ? JsonHelper::asString(TypedText(request->GetParam("password")))
                                   : "";
  const SharingLink::Result result = SharingLink::Open(*request, id, password, visit);
  if (result == SharingLink::LINK_OK) {
    AddSessionCookie(*request, response, JsonHelper::asString(visit["sid"]));
  }
  Answer(response, result, visit);
  if (result == SharingLink::LINK_WAIT) {
    Json::Value errors(Json::objectValue);
    errors["retry_after"] = visit["retryAfter"];
    response->SetHeader("Retry-After", JsonHelper::asString(visit["retryAfter"]));
    response->SetError(kTooManyAttempts, errors);
  }
}

/// The API runs for callers who are not logged in, for the sake of visitors. The other methods stop
/// here, with the error that the permission check has set. A visitor by a link is none of its
/// owner's makers: links are not made by links.
int CheckOwner(APIRequest* request, APIResponse* response) {
  if (request->IsAuthorized() && !request->IsSharing()) {
    return 1;
  }
  if (response->GetError() == QELO::WEBAPI_ERR_NONE) {
    response->SetError(QELO::WEBAPI_ERR_NO_PERMISSION);
  }
  return 0;
}

QELO::_tag_API_TABLE table[] = {
    {kApi, 1, "create", Create},    {kApi, 1, "list", List}, {kApi, 1, "change", Change},
    {kApi, 1, "remove", Remove},    {kApi, 1, "qr", Qr},     {kApi, 1, "open", Open},
    {nullptr, 0, nullptr, nullptr},
};

QELO::_tag_API_CHECK_TABLE checkTable[] = {
    {kApi, 1, "create", CheckOwner, {nullptr, nullptr}},
    {kApi, 1, "list", CheckOwner, {nullptr, nullptr}},
    {kApi, 1, "change", CheckOwner, {nullptr, nullptr}},
    {kApi, 1, "remove", CheckOwner, {nullptr, nullptr}},
    {kApi, 1, "qr", CheckOwner, {nullptr, nullptr}},
    {nullptr, 0, nullptr, nullptr, {nullptr, nullptr}},
};

}  // namespace

extern "C" WEBAPI_API QELO::_tag_API_TABLE* GetAPITable() {
  return table;
}
extern "C" WEBAPI_API QELO::_tag_API_CHECK_TABLE* GetAPICheckTable() {
  return checkTable;
}
