#include "calls/Call.h"

#include <webapi/JsonHelper.h>
#include <webapi/WebAPIError.h>

namespace files {
namespace {

using QELO::APIRequest;

/// The member of the description that names the configuration.
constexpr char kSharesMember[] = "shares";

constexpr size_t kShownPath = 1024;  ///< bytes of a refused path that the answer repeats

}  // namespace

Json::Value errorsOf(Reason reason, const std::string& path) {
  Json::Value errors(Json::objectValue);
  errors["path"] = QELO::JsonHelper::repairUtf8(path.substr(0, kShownPath));
  errors["reason"] = wordOf(reason);
  return errors;
}

Call::Call(QELO::APIRequest* request, QELO::APIResponse* response)
    : request_(request),
      response_(response),
      shares_(QELO::JsonHelper::asString(request->GetAPIInfo(kSharesMember)),
              request->GetLoginUserName(), request->IsAdmin()) {}

bool Call::ReadPath(const char* name, VirtualPath& path) {
  const auto text = request_->GetAndCheckString(name);
  return text.IsInvalid() || text.IsReset() ? RefuseParameters() : Parse(text.Get(), path);
}

bool Call::ReadPaths(const char* name, std::vector<VirtualPath>& paths) {
  const auto texts = request_->GetAndCheckUnitArray(name);
  if (texts.IsInvalid() || texts.Get().empty()) {
    return RefuseParameters();
  }
  if (texts.Get().size() > kMostPaths) {
    return Refuse(Reason::kTooMany, "/");
  }
  for (const Json::Value& text : texts.Get()) {
    VirtualPath path;
    if (!text.isString()) {
      return RefuseParameters();
    }
    if (!Parse(text.asString(), path)) {
      return false;
    }
    paths.push_back(path);
  }
  return true;
}

bool Call::Parse(const std::string& text, VirtualPath& path) {
  const Reason reason = VirtualPath::Parse(text, path);
  return reason == Reason::kNone || Refuse(reason, text);
}

bool Call::OpenFolder(const VirtualPath& path, Folder& folder) {
  return Open(path, path, folder);
}

bool Call::Open(const VirtualPath& path, const VirtualPath& asked, Folder& folder) {
  const Share* share = path.IsRoot() ? nullptr : shares_.Find(path.Share());
  if (share == nullptr) {
    return Refuse(Reason::kNoShare, asked);
  }
  Folder root;
  Reason reason = Folder::OpenShare(*share, root);
  if (reason == Reason::kNone) {
    reason = root.Enter(path.Below(), folder);
  }
  return reason == Reason::kNone || Refuse(reason, asked);
}

bool Call::Locate(const VirtualPath& path, Located& located) {
  if (!Open(path.IsShare() ? path : path.Parent(), path, located.parent)) {
    return false;
  }
  located.path = path;
  located.name = path.IsShare() ? "" : path.Name();
  return true;
}

bool Call::IsChangeable(const VirtualPath& path) {
  const Share* share = shares_.Find(path.Share());
  return share == nullptr || !share->isReadOnly || Refuse(Reason::kReadOnly, path);
}

bool Call::LocateForChange(const VirtualPath& path, Located& located) {
  if (path.IsRoot() || path.IsShare()) {
    return Refuse(Reason::kShareItself, path);
  }
  return IsChangeable(path) && Locate(path, located);
}

bool Call::OpenFolderForChange(const VirtualPath& path, Folder& folder) {
  return IsChangeable(path) && OpenFolder(path, folder);
}

bool Call::Refuse(Reason reason, const std::string& path) {
  response_->SetError(static_cast<int>(reason), errorsOf(reason, path));
  return false;
}

bool Call::RefuseParameters() {
  response_->SetError(QELO::WEBAPI_ERR_BAD_REQUEST);
  return false;
}

}  // namespace files
