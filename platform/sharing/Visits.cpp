// Opening a link: what it takes, and the session that a visitor gets.

#include <time.h>

#include "platform/base/IpAddress.h"
#include "platform/base/Secrets.h"
#include "platform/sharing/LinkPassword.h"
#include "platform/sharing/LinkState.h"
#include "platform/sharing/LinkStore.h"
#include "webapi/base/Log.h"
#include "webapi/platform/Session.h"
#include "webapi/platform/Sharing.h"

namespace QELO::sharing {
namespace {

using Platform::LinkStore;
using Platform::StoredLink;

constexpr char kSource[] = "Visits.cpp";

LinkResult broken(const LinkStore& store) {
  WEBAPI_LOG(kSource, "cannot open a sharing link [%s]", LogText(store.Error()).c_str());
  return LINK_FAILED;
}

/// Attempts are counted as those of logins are, each link being an account of its own.
LinkResult checkPassword(const StoredLink& link, const std::string& password,
                         const std::string& address, Json::Value& visit) {
  if (link.password.empty()) {
    return LINK_DONE;
  }
  const std::string counted = "sharing link " + std::to_string(link.entry.id);
  const int wait = QeloLoginAttempt(address.c_str(), counted.c_str());
  if (wait != 0) {
    visit = Json::Value(Json::objectValue);
    visit["retryAfter"] = wait;
    return wait > 0 ? LINK_WAIT : LINK_FAILED;
  }
  const bool isText = password.find('\0') == std::string::npos;
  const int right = isText ? Platform::checkLinkPassword(link.password, password) : 0;
  if (right == 1) {
    QeloLoginSucceeded(address.c_str(), counted.c_str());
  }
  return right == 1 ? LINK_DONE : right == 0 ? LINK_WRONG_PASSWORD : LINK_FAILED;
}

/// The usual form, by which the sessions of one client are counted.
std::string plainAddress(const std::string& address) {
  Platform::IpAddress parsed;
  return Platform::IpAddress::Parse(address, parsed) ? parsed.Text() : "";
}

LinkResult makeSession(LinkStore& store, const StoredLink& link, const std::string& address,
                       Json::Value& visit) {
  const int64_t now = time(nullptr);
  const int timeout = Platform::sharingTimeout();
  const std::string sid = Platform::makeSecret();
  if (sid.empty()) {
    return LINK_FAILED;
  }
  switch (store.AddVisit(link, sid, {0, link.entry.ownerUid, plainAddress(address), now + timeout},
                         now)) {
    case LinkStore::Result::kDone:
      break;
    case LinkStore::Result::kUsedUp:
    case LinkStore::Result::kTooMany:
      return LINK_REFUSED;
    default:
      return broken(store);
  }
  visit = Json::Value(Json::objectValue);
  visit["sid"] = sid;
  visit["seconds"] = timeout;
  visit["project"] = link.entry.projectName;
  visit["path"] = link.entry.path;
  visit["upload"] = link.entry.allowUpload;
  return LINK_DONE;
}

}  // namespace

LinkResult OpenLink(const std::string& id, const std::string& password, const std::string& address,
                    Json::Value& visit) {
  if (!Platform::isSecretText(id) || !Platform::hasLinkStore()) {
    return LINK_ABSENT;
  }
  StoredLink link;
  {
    // Not held while the password is hashed, which takes a while.
    const std::unique_ptr<LinkStore> store = Platform::openLinkStore(false);
    if (store == nullptr) {
      return LINK_FAILED;
    }
    const LinkStore::Result found = store->FindLink(id, link);
    if (found != LinkStore::Result::kDone) {
      return found == LinkStore::Result::kAbsent ? LINK_ABSENT : broken(*store);
    }
  }
  if (!Platform::isUsable(link, time(nullptr)) ||
      (link.maxUses != 0 && link.uses >= link.maxUses)) {
    return LINK_REFUSED;
  }
  const LinkResult checked = checkPassword(link, password, address, visit);
  if (checked != LINK_DONE) {
    return checked;
  }
  const std::unique_ptr<LinkStore> store = Platform::openLinkStore(false);
  return store != nullptr ? makeSession(*store, link, address, visit) : LINK_FAILED;
}

}  // namespace QELO::sharing
