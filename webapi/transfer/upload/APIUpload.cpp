#include "webapi/APIUpload.h"

#include "webapi/transfer/upload/APIUploadPrivate.h"

namespace QELO {

APIUpload::APIUpload(APIRequest* request)
    : private_(std::make_unique<APIUploadPrivate>(this, request)) {}

APIUpload::~APIUpload() = default;

void APIUpload::SetUploadCallback(void (*callback)(unsigned long long, unsigned long long)) {
  private_->SetCallback(callback);
}

int APIUpload::GetUploadAll(Json::Value& params, Json::Value* tmpFiles) {
  return private_->GetUploadAll(params, tmpFiles);
}

int APIUpload::GetUploadParam(Json::Value& params) {
  return private_->GetUploadParam(params);
}

int APIUpload::GetUploadFile(Json::Value& params) {
  return private_->GetUploadFile(params);
}

long long APIUpload::ReadBody(char* buffer, unsigned long long size) {
  return QeloCgiReadBody(buffer, size);
}

bool APIUpload::HasFile() const {
  return private_->HasFile();
}

std::string APIUpload::GetFileField() const {
  return private_->Field();
}

std::string APIUpload::GetFileName() const {
  return private_->FileName();
}

Json::Value APIUpload::GetSlice() const {
  return private_->Slice();
}

Json::Value APIUpload::GetFiles() const {
  return private_->Files();
}

}  // namespace QELO
