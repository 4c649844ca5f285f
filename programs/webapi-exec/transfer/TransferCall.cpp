#include "programs/webapi-exec/transfer/TransferCall.h"

#include <unistd.h>

#include <utility>

#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/APIUpload.h"
#include "webapi/JsonHelper.h"
#include "webapi/WebAPIError.h"

namespace QELO::ExecProgram {

TransferCall::TransferCall(const ExecParam& param, OutputFile& file, bool isSeen)
    : ExecHandler(param), file_(file), progress_(isSeen) {}

void TransferCall::OutputBegins(const std::string& head) {
  file_.Begin(head);
  progress_.Begin(file_.Done(), file_.Total());
}

void TransferCall::OutputGrows(size_t bytes) {
  progress_.Add(bytes);
}

bool TransferCall::HandleUpload(APIRunner& runner, APIRequest* request, APIResponse* response) {
  uploaded_ = request;
  if (runner.GetMethodAttr(request, "deferUpload")) {
    return true;  // the method reads it itself
  }
  Json::Value params(Json::objectValue);
  params["postParam"] = Json::Value(Json::objectValue);
  const int result = APIUpload(request).GetUploadAll(params["postParam"], nullptr);
  if (result != APIUpload::DONE) {
    Json::Value errors = APIUpload(request).GetSlice();
    errors["upload_err"] = result;
    response->SetError(WEBAPI_ERR_UPLOAD_FAILED, errors);
    return false;
  }
  request->InitParam(std::move(params), false);
  return true;
}

void TransferCall::CallEnded() {
  if (uploaded_ == nullptr) {
    return;
  }
  const Json::Value files = APIUpload(uploaded_).GetFiles();
  for (const Json::Value& file : files) {
    unlink(JsonHelper::asString(JsonHelper::member(file, "path")).c_str());
  }
}

}  // namespace QELO::ExecProgram
