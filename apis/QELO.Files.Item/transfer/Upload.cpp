// Files in, by a form. The target is looked at before a file is taken in.

#include <webapi/APIUpload.h>
#include <webapi/JsonHelper.h>
#include <webapi/SharingLink.h>
#include <webapi/WebAPIError.h>

#include "calls/Call.h"
#include "calls/ItemJson.h"
#include "calls/Methods.h"
#include "calls/ReadExisting.h"
#include "sharing/Scope.h"
#include "transfer/Placing.h"

namespace files {
namespace {

using QELO::APIRequest;
using QELO::APIResponse;
using QELO::APIUpload;

/// Where the files of one call go.
struct Target {
  VirtualPath path;
  Folder folder;
  Existing existing = Existing::kRefuse;
  std::string name;  ///< of the one file; "": as the client calls it
};

/// Whether a visitor by a sharing link may bring files there: into what is shared, and in nobody's
/// place. The link's check knew the address alone, not the form.
bool mayBring(Call& call, const Target& target) {
  const Json::Value link = QELO::SharingLink::Of(call.Request());
  const std::string shared = QELO::JsonHelper::asString(QELO::JsonHelper::member(link, "path"));
  if (!isWithin(target.path.Text(), shared) || target.existing == Existing::kReplace) {
    call.Response().SetError(QELO::WEBAPI_ERR_SHARING_APPLICATION);
    return false;
  }
  return true;
}

/// @return false when it was refused, which is the answer
bool readTarget(Call& call, Target& target) {
  const auto name = call.Request().GetAndCheckString("name", APIRequest::PARAM_OPTIONAL);
  if (name.IsInvalid() || name.IsReset() || !readExisting(call.Request(), target.existing)) {
    return call.RefuseParameters();
  }
  target.name = name.Get();
  return call.ReadPath("path", target.path) &&
         (!call.Request().IsSharing() || mayBring(call, target)) &&
         call.OpenFolderForChange(target.path, target.folder);
}

/// Whether a file may come to this name. @return false when it was refused, which is the answer
bool mayCome(Call& call, const Target& target, const std::string& name) {
  Item taken;
  if (!isNewName(name)) {
    return call.Refuse(Reason::kBadName, name);
  }
  if (target.folder.Look(name, taken) == Reason::kNone &&
      (target.existing == Existing::kRefuse || taken.IsFolder())) {
    return call.Refuse(Reason::kExists, target.path.Child(name));
  }
  return true;
}

bool endUpload(Call& call, const APIUpload& upload, int result) {
  Json::Value errors = upload.GetSlice();
  if (result == APIUpload::PARTIAL) {
    call.Response().SetSuccess(errors);  // more of the file is to come
    return false;
  }
  errors["upload_err"] = result;
  call.Response().SetError(QELO::WEBAPI_ERR_UPLOAD_FAILED, errors);
  return false;
}

/// Takes in the file that comes next. @return false when it was refused, which is the answer
bool takeFile(Call& call, APIUpload& upload, const Target& target, Json::Value& data) {
  const std::string name = target.name.empty() ? upload.GetFileName() : target.name;
  Json::Value params(Json::objectValue);
  if (!mayCome(call, target, name)) {
    return false;
  }
  if (const int result = upload.GetUploadFile(params); result != APIUpload::DONE) {
    return endUpload(call, upload, result);
  }
  const Json::Value files = upload.GetFiles();
  const std::string temporary =
      QELO::JsonHelper::asString(QELO::JsonHelper::member(files[files.size() - 1], "path"));
  bool isSkipped = false;
  const Reason reason = placeFile(temporary, target.folder, name, target.existing, isSkipped);
  Item item;
  if (reason != Reason::kNone) {
    return call.Refuse(reason, target.path.Child(name));
  }
  if (isSkipped) {
    data["skipped"].append(target.path.Child(name).Text());
  } else if (target.folder.Look(name, item) == Reason::kNone) {
    data["items"].append(jsonOf(target.path, item));
  }
  return true;
}

/// Beside an error stands what has come before it.
void addItems(Call& call, const Json::Value& items) {
  Json::Value errors = call.Response().GetBody()["error"]["errors"];
  if (!items.empty() && (errors.isNull() || errors.isObject())) {
    errors["items"] = items;
    call.Response().SetError(call.Response().GetError(), errors);
  }
}

}  // namespace

void upload(APIRequest* request, APIResponse* response) {
  APIUpload upload(request);
  Json::Value fields(Json::objectValue);
  int result = upload.GetUploadParam(fields);
  Json::Value params(Json::objectValue);
  params["postParam"] = fields;
  request->InitParam(params, false);
  Call call(request, response);
  Target target;
  if (result != APIUpload::DONE) {
    endUpload(call, upload, result);
    return;
  }
  if (!upload.HasFile()) {
    call.RefuseParameters();
    return;
  }
  if (!readTarget(call, target)) {
    return;
  }
  Json::Value data(Json::objectValue);
  data["items"] = Json::Value(Json::arrayValue);
  data["skipped"] = Json::Value(Json::arrayValue);
  for (bool isFirst = true; upload.HasFile(); isFirst = false) {
    if (!isFirst && !target.name.empty()) {
      call.RefuseParameters();  // one name for two files
      addItems(call, data["items"]);
      return;
    }
    if (!takeFile(call, upload, target, data)) {
      addItems(call, data["items"]);
      return;
    }
    if (result = upload.GetUploadParam(fields); result != APIUpload::DONE) {
      endUpload(call, upload, result);
      addItems(call, data["items"]);
      return;
    }
  }
  response->SetSuccess(data);
}

}  // namespace files
