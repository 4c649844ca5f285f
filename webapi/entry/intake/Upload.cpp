// The web entry's hook for uploads.

#include <sys/types.h>

#include <string>
#include <utility>

#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/APIUpload.h"
#include "webapi/WebAPIError.h"
#include "webapi/WebEntry.h"
#include "webapi/json/Literal.h"
#include "webapi/platform/Core.h"
#include "webapi/platform/Upload.h"
#include "webapi/runner/CallName.h"
#include "webapi/runner/execution/MethodAccount.h"
#include "webapi/transfer/upload/TemporaryFiles.h"

namespace QELO {
namespace {

constexpr unsigned int kNobody = 0xFFFFFFFF;

/// The files shall belong to whom the method will run as.
void setOwner(APIRequest& request, const Json::Value& attributes) {
  uid_t uid = 0;
  gid_t gid = 0;
  const std::string account = MethodAccount(request, attributes);
  if (!account.empty() && QELOUserGetUGID(account.c_str(), &uid, &gid) == 0) {
    QeloCgiUploadOwnerSet(uid, gid);
  }
}

/// Takes the fields into the request. The call stays the one that was checked, whatever they name.
void takeFields(Json::Value&& params, APIRequest& request) {
  const CallName call(request);
  request.InitParam(std::move(params), false);
  const CallName named(request);
  if (named.api == call.api && named.version == call.version && named.method == call.method) {
    return;
  }
  Json::Value checked(Json::objectValue);
  Json::Value& names = checked[Literal("postParam")];
  names["api"] = call.api;
  names["version"] = call.version;
  names["method"] = call.method;
  request.InitParam(std::move(checked), false);
}

/// What became of an upload that the method is not called for: a failure, or a slice of a file that
/// more of is to come.
void answerUnfinished(int result, const APIUpload& upload, APIResponse& response) {
  Json::Value told = upload.GetSlice();
  if (result == APIUpload::PARTIAL) {
    response.SetSuccess(told);
    return;
  }
  told["upload_err"] = result;  // an object, also where there was no slice
  response.SetError(WEBAPI_ERR_UPLOAD_FAILED, told);
}

/// A file in slices is put together for one caller alone.
void setCaller(const APIRequest& request) {
  if (!request.IsSliceUploadRequest()) {
    return;
  }
  const unsigned int uid = request.GetLoginUID();
  if (uid != kNobody) {
    QeloCgiUploadCallerSet(uid);
  }
}

}  // namespace

bool WebEntry::HandleUpload(APIRequest* request, APIResponse* response) {
  if (request == nullptr || response == nullptr) {
    return false;
  }
  hasUpload_ = true;
  setCaller(*request);
  if (GetMethodAttr(request, "deferUpload")) {
    return true;
  }
  setOwner(*request,
           GetMethod(request->GetAPIClass(), request->GetAPIVersion(), request->GetAPIMethod()));
  Json::Value params(Json::objectValue);
  Json::Value& fields = params[Literal("postParam")];
  fields = Json::Value(Json::objectValue);
  APIUpload upload(request);
  const int result = upload.GetUploadAll(fields, &temporaryFiles_);
  if (result != APIUpload::DONE) {
    answerUnfinished(result, upload, *response);
    return false;
  }
  takeFields(std::move(params), *request);
  return true;
}

void WebEntry::RemoveUpload() {
  if (!hasUpload_) {
    return;
  }
  hasUpload_ = false;
  for (const Json::Value& file : APIUpload(Request()).GetFiles()) {
    temporaryFiles_.append(file["path"]);
  }
  RemoveTemporaryFiles(temporaryFiles_);
  if (Request()->IsSliceUploadRequest()) {
    QeloCgiUploadCallerSet(kNobody);
  }
}

}  // namespace QELO
