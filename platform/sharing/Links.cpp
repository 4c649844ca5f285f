// What a link's owner may do with it.

#include <time.h>

#include "platform/accounts/AccountDatabase.h"
#include "platform/base/Secrets.h"
#include "platform/sharing/LinkPassword.h"
#include "platform/sharing/LinkStore.h"
#include "platform/sharing/LinkTerms.h"
#include "webapi/JsonHelper.h"
#include "webapi/base/Log.h"
#include "webapi/base/Text.h"
#include "webapi/platform/Sharing.h"

namespace QELO::sharing {
namespace {

using Platform::LinkStore;
using Platform::StoredLink;

constexpr char kSource[] = "Links.cpp";

LinkResult resultOf(const LinkStore& store, LinkStore::Result result) {
  switch (result) {
    case LinkStore::Result::kDone:
      return LINK_DONE;
    case LinkStore::Result::kAbsent:
      return LINK_ABSENT;
    case LinkStore::Result::kTooMany:
      return LINK_TOO_MANY;
    case LinkStore::Result::kUsedUp:
      return LINK_REFUSED;
    default:
      WEBAPI_LOG(kSource, "cannot keep the sharing links [%s]", LogText(store.Error()).c_str());
      return LINK_FAILED;
  }
}

bool findOwner(const std::string& owner, Platform::Account& account) {
  return Platform::findAccount(owner, account) == Platform::Lookup::kFound;
}

/// @param password  null: it stays
bool setPassword(const Json::Value& password, StoredLink& link) {
  if (password.isNull()) {
    return true;
  }
  const std::string text = JsonHelper::asString(password);
  link.password = text.empty() ? "" : Platform::hashLinkPassword(text);
  return text.empty() || !link.password.empty();
}

}  // namespace

LinkResult CreateLink(const std::string& owner, const Json::Value& terms, Json::Value& link) {
  StoredLink made;
  Json::Value password;
  Json::Value others = terms.type() == Json::objectValue ? terms : Json::Value(Json::objectValue);
  const Json::Value project = JsonHelper::member(others, "project");
  others.removeMember("project");
  made.entry.projectName = JsonHelper::asString(project);
  if (project.type() != Json::stringValue || !IsProjectName(made.entry.projectName) ||
      !Platform::takeTerms(others, made, password)) {
    return LINK_BAD_TERMS;
  }
  Platform::Account account;
  const std::string secret = Platform::makeSecret();
  if (!findOwner(owner, account) || secret.empty() || !setPassword(password, made)) {
    return LINK_FAILED;
  }
  const std::unique_ptr<LinkStore> store = Platform::openLinkStore(true);
  if (store == nullptr) {
    return LINK_FAILED;
  }
  made.entry.ownerName = account.name;
  made.entry.ownerUid = account.uid;
  made.created = time(nullptr);
  const LinkResult result = resultOf(*store, store->Add(secret, made));
  if (result == LINK_DONE) {
    link = Platform::toJson(made);
    link["link"] = secret;
  }
  return result;
}

LinkResult ListLinks(const std::string& owner, Json::Value& links) {
  Platform::Account account;
  std::vector<StoredLink> found;
  if (!findOwner(owner, account)) {
    return LINK_FAILED;
  }
  if (Platform::hasLinkStore()) {
    const std::unique_ptr<LinkStore> store = Platform::openLinkStore(false);
    const LinkResult result =
        store != nullptr ? resultOf(*store, store->List(account.uid, found)) : LINK_FAILED;
    if (result != LINK_DONE) {
      return result;
    }
  }
  links = Json::Value(Json::arrayValue);
  for (const StoredLink& link : found) {
    if (link.entry.ownerName == account.name) {  // accounts may share an id
      links.append(Platform::toJson(link));
    }
  }
  return LINK_DONE;
}

LinkResult ChangeLink(const std::string& owner, int64_t id, const Json::Value& terms,
                      Json::Value& link) {
  Platform::Account account;
  if (!findOwner(owner, account)) {
    return LINK_FAILED;
  }
  const std::unique_ptr<LinkStore> store =
      Platform::hasLinkStore() ? Platform::openLinkStore(false) : nullptr;
  if (store == nullptr) {
    return Platform::hasLinkStore() ? LINK_FAILED : LINK_ABSENT;
  }
  StoredLink before;
  const LinkResult found = resultOf(*store, store->Get(account.uid, id, before));
  if (found != LINK_DONE || before.entry.ownerName != account.name) {
    return found == LINK_DONE ? LINK_ABSENT : found;
  }
  StoredLink after = before;
  Json::Value password;
  Json::Value others = terms.type() == Json::objectValue ? terms : Json::Value(Json::objectValue);
  const Json::Value renew = JsonHelper::member(others, "renew");
  others.removeMember("renew");
  if ((!renew.isNull() && renew.type() != Json::booleanValue) ||
      !Platform::takeTerms(others, after, password)) {
    return LINK_BAD_TERMS;
  }
  const bool isRenewed = JsonHelper::asBool(renew);
  const std::string secret = isRenewed ? Platform::makeSecret() : "";
  if ((isRenewed && secret.empty()) || !setPassword(password, after)) {
    return LINK_FAILED;
  }
  const bool endVisits =
      isRenewed || !password.isNull() || before.entry.enableMatchIp != after.entry.enableMatchIp;
  const LinkResult result = resultOf(*store, store->Replace(after, secret, endVisits));
  if (result == LINK_DONE) {
    link = Platform::toJson(after);
    if (isRenewed) {
      link["link"] = secret;
    }
  }
  return result;
}

LinkResult RemoveLink(const std::string& owner, int64_t id) {
  Platform::Account account;
  if (!findOwner(owner, account)) {
    return LINK_FAILED;
  }
  if (!Platform::hasLinkStore()) {
    return LINK_ABSENT;
  }
  const std::unique_ptr<LinkStore> store = Platform::openLinkStore(false);
  StoredLink link;
  if (store == nullptr) {
    return LINK_FAILED;
  }
  const LinkResult found = resultOf(*store, store->Get(account.uid, id, link));
  if (found != LINK_DONE || link.entry.ownerName != account.name) {
    return found == LINK_DONE ? LINK_ABSENT : found;
  }
  return resultOf(*store, store->Remove(account.uid, id));
}

LinkResult FindLink(const std::string& owner, const std::string& id, Json::Value& link) {
  Platform::Account account;
  if (!findOwner(owner, account)) {
    return LINK_FAILED;
  }
  if (!Platform::isSecretText(id) || !Platform::hasLinkStore()) {
    return LINK_ABSENT;
  }
  const std::unique_ptr<LinkStore> store = Platform::openLinkStore(false);
  StoredLink found;
  if (store == nullptr) {
    return LINK_FAILED;
  }
  const LinkResult result = resultOf(*store, store->FindLink(id, found));
  const bool isTheirs =
      found.entry.ownerName == account.name && found.entry.ownerUid == account.uid;
  if (result != LINK_DONE || !isTheirs) {
    return result == LINK_DONE ? LINK_ABSENT : result;
  }
  link = Platform::toJson(found);
  link["link"] = id;
  return LINK_DONE;
}

}  // namespace QELO::sharing
