#include "webapi/transfer/download/APIDownloadPrivate.h"

#include <cerrno>

#include "webapi/APIDownload.h"
#include "webapi/APIResponse.h"
#include "webapi/base/Log.h"
#include "webapi/model/response/HeaderLines.h"
#include "webapi/runner/execution/StandardStreams.h"

namespace QELO {
namespace {

constexpr char kSource[] = "APIDownload.cpp";
/// A stream has no name to take a type from.
constexpr char kTypeOfStreams[] = "application/octet-stream";

static_assert(APIDownload::kNothingSent == HTTPFileOutputer::kNothingSent);
static_assert(APIDownload::kBrokenOff == HTTPFileOutputer::kBrokenOff);

}  // namespace

APIDownloadPrivate::APIDownloadPrivate(APIDownload* owner, APIResponse* response)
    : owner_(owner), response_(response), ownsResponse_(response == nullptr) {
  if (ownsResponse_) {
    response_ = new APIResponse(nullptr);
  }
}

APIDownloadPrivate::~APIDownloadPrivate() {
  if (ownsResponse_) {
    delete response_;
  }
}

bool APIDownloadPrivate::MaySend() {
  if (!StandardStreams::IsOutputShut()) {
    return true;
  }
  WEBAPI_LOG(kSource, "nothing is sent: the method's description lacks allowDownload");
  errno = EPERM;
  return false;
}

void APIDownloadPrivate::PrintHeader() {
  for (const std::string& line : HeaderLines(*response_, kSource)) {
    outputer_.AddHeader(line);
  }
  if (!disposition_.empty()) {
    outputer_.AddHeader("Content-Disposition: " + disposition_);
  }
}

int APIDownloadPrivate::Output(const std::string& path) {
  if (!MaySend()) {
    return HTTPFileOutputer::kNothingSent;
  }
  PrintHeader();
  if (mimeType_.empty()) {
    mimeType_ = HTTPFileOutputer::GetMimeType(path);
  }
  return Finish(outputer_.Output(path, mimeType_));
}

int APIDownloadPrivate::Output(std::FILE* stream) {
  if (!MaySend()) {
    return HTTPFileOutputer::kNothingSent;
  }
  PrintHeader();
  if (mimeType_.empty()) {
    mimeType_ = kTypeOfStreams;
  }
  return Finish(outputer_.Output(stream, "", mimeType_));
}

int APIDownloadPrivate::Finish(int result) {
  // A JSON text would become the end of the file; and without the file it is the only answer, even
  // where the method has turned it off beforehand.
  response_->SetEnableOutput(result == HTTPFileOutputer::kNothingSent);
  return result;
}

}  // namespace QELO
