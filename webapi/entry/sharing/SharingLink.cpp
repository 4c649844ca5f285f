#include "webapi/SharingLink.h"

#include <syslog.h>

#include <iterator>

#include "webapi/APIRequest.h"
#include "webapi/base/LogText.h"
#include "webapi/entry/permission/LoginOrigin.h"
#include "webapi/platform/Sharing.h"

namespace QELO {
namespace {

constexpr char kSource[] = "SharingLink.cpp";
/// Why a link was not opened; none for what is no refusal.
constexpr const char* kReasons[] = {"",
                                    "there is no such link",
                                    "",
                                    "",
                                    "it has expired, is used up or not its owner's to use",
                                    "wrong password",
                                    "too many attempts",
                                    "the links cannot be looked up",
                                    "not sent by POST",
                                    "sent for another site's page"};

SharingLink::Result resultOf(sharing::LinkResult result) {
  static_assert(static_cast<int>(SharingLink::LINK_FAILED) == sharing::LINK_FAILED);
  static_assert(static_cast<int>(SharingLink::LINK_REFUSED) == sharing::LINK_REFUSED);
  return static_cast<SharingLink::Result>(result);
}

void tell(SharingLink::Result result, const std::string& client) {
  const std::string address = client.empty() ? "unknown" : client;
  if (result == SharingLink::LINK_OK) {
    syslog(LOG_AUTH | LOG_INFO, "%s:%d sharing link opened from %s", kSource, __LINE__,
           LogText(address).c_str());
  } else if (result < static_cast<int>(std::size(kReasons))) {
    syslog(LOG_AUTH | LOG_NOTICE, "%s:%d sharing link not opened from %s: %s", kSource, __LINE__,
           LogText(address).c_str(), LogText(kReasons[result]).c_str());
  }
}

}  // namespace

SharingLink::Result SharingLink::Create(const APIRequest& request, const Json::Value& terms,
                                        Json::Value& link) {
  return resultOf(sharing::CreateLink(request.GetLoginUserName(), terms, link));
}

SharingLink::Result SharingLink::List(const APIRequest& request, Json::Value& links) {
  return resultOf(sharing::ListLinks(request.GetLoginUserName(), links));
}

SharingLink::Result SharingLink::Change(const APIRequest& request, int64_t id,
                                        const Json::Value& terms, Json::Value& link) {
  return resultOf(sharing::ChangeLink(request.GetLoginUserName(), id, terms, link));
}

SharingLink::Result SharingLink::Remove(const APIRequest& request, int64_t id) {
  return resultOf(sharing::RemoveLink(request.GetLoginUserName(), id));
}

SharingLink::Result SharingLink::Find(const APIRequest& request, const std::string& id,
                                      Json::Value& link) {
  return resultOf(sharing::FindLink(request.GetLoginUserName(), id, link));
}

SharingLink::Result SharingLink::Open(const APIRequest& request, const std::string& id,
                                      const std::string& password, Json::Value& visit) {
  const std::string address = request.GetRemoteIP();
  const Result result = !isPost(request) ? LINK_NOT_POST
                        : comesFromAnotherSite(request)
                            ? LINK_OTHER_SITE
                            : resultOf(sharing::OpenLink(id, password, address, visit));
  tell(result, address);
  return result;
}

Json::Value SharingLink::Of(const APIRequest& request) {
  const sharing::record::Entry entry = request.GetSharingEntry();
  if (entry.get_id() == 0) {
    return Json::Value();
  }
  Json::Value link(Json::objectValue);
  link["project"] = entry.get_project_name();
  link["path"] = entry.get_path();
  link["upload"] = entry.get_allow_upload();
  link["owner"] = entry.get_owner_name();
  return link;
}

}  // namespace QELO
