#include "calls/Call.h"

#include <webapi/JsonHelper.h>
#include <webapi/WebAPIError.h>

namespace files {
namespace {

using QELO::APIRequest;

/// The member of the description that names the configuration.
constexpr char kSharesMember[] = "shares";
/// The member of the description that names the directory of the libraries beside this one.
constexpr char kLibrariesMember[] = "libraries";

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

std::string Call::LibraryDirectory() const {
  return QELO::JsonHelper::asString(request_->GetAPIInfo(kLibrariesMember));
}

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
  const Reason reason = openFolder(shares_, path, folder);
  return reason == Reason::kNone || Refuse(reason, path);
}

bool Call::Locate(const VirtualPath& path, Located& located) {
  const Reason reason = locate(shares_, path, located);
  return reason == Reason::kNone || Refuse(reason, path);
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
