#include "webapi/APIDownload.h"

#include "webapi/APIResponse.h"
#include "webapi/transfer/download/APIDownloadPrivate.h"

namespace QELO {

APIDownload::APIDownload() : APIDownload(nullptr) {}

APIDownload::APIDownload(APIResponse* response)
    : private_(std::make_unique<APIDownloadPrivate>(this, response)) {}

APIDownload::~APIDownload() = default;

bool APIDownload::SetHeader(const std::string& name, const std::string& value) {
  return private_->response().SetHeader(name, value);
}

bool APIDownload::SetHeader(const Json::Value& headers) {
  if (headers.type() != Json::objectValue) {
    return true;
  }
  for (auto it = headers.begin(); it != headers.end(); ++it) {
    const char* begin = nullptr;
    const char* end = nullptr;
    const char* nameEnd = nullptr;
    const char* name = it.memberName(&nameEnd);
    if (it->getString(&begin, &end) &&
        !SetHeader(std::string(name, nameEnd), std::string(begin, end))) {
      return false;
    }
  }
  return true;
}

void APIDownload::SetFileName(const std::string& name, bool isInline) {
  private_->SetDisposition(HTTP::FileOutputerHelper::ContentDisposition(name, isInline));
}

void APIDownload::SetMimeType(const std::string& type) {
  private_->SetMimeType(type);
}

void APIDownload::SetMimeTypeFromFileName(const std::string& name) {
  private_->SetMimeType(HTTPFileOutputer::GetMimeType(name));
}

int APIDownload::Output(const std::string& path) {
  return private_->Output(path);
}

int APIDownload::Output(std::FILE* stream) {
  return private_->Output(stream);
}

void APIDownload::SetXSendFileDisabled() {
  HTTP::FileOutputerHelper::SetFastOutputEnabled(false);
}

bool APIDownload::GetXSendFileEnabled() const {
  return HTTP::FileOutputerHelper::IsFastOutputEnabled();
}

}  // namespace QELO
