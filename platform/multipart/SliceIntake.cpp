#include "platform/multipart/SliceIntake.h"

#include <strings.h>

#include <cstdlib>
#include <string_view>

namespace QELO::Platform {
namespace {

std::string_view header(const char* name) {
  const char* value = getenv(name);
  return value != nullptr ? value : "";
}

}  // namespace

bool SliceIntake::IsAsked() {
  const char* type = getenv("HTTP_X_TYPE_NAME");
  return type != nullptr && strcasecmp(type, "SLICEUPLOAD") == 0 &&
         !(header("HTTP_X_UPLOAD_ID").empty() && header("HTTP_X_FILE_SIZE").empty() &&
           header("HTTP_X_SLICE_OFFSET").empty());
}

void SliceIntake::SetCaller(std::optional<uid_t> caller) {
  Reset();
  caller_ = caller;
}

void SliceIntake::Reset() {
  file_.reset();
  said_.reset();
  received_ = 0;
  fault_ = 0;
  hasAdded_ = false;
}

int SliceIntake::Open() {
  if (file_ != nullptr || fault_ != 0) {
    return fault_;
  }
  said_ = caller_ ? readSlice() : std::nullopt;
  fault_ = said_ ? PartialFile::Open(*caller_, *said_, file_)
                 : static_cast<int>(QELO_UPLOAD_WRONG_SLICE);
  received_ = file_ != nullptr ? file_->Received() : 0;
  return fault_;
}

int SliceIntake::Add(Upload& upload, const char* directory, const std::optional<FileOwner>& owner,
                     std::unique_ptr<TemporaryFile>& whole) {
  int fault = hasAdded_ ? static_cast<int>(QELO_UPLOAD_MALFORMED) : Open();  // two in one body
  fault = fault == 0 ? file_->GoOn(said_->offset, directory) : fault;
  if (fault != 0) {
    return upload.Fail(fault);
  }
  hasAdded_ = true;
  upload.ReadInto([this](std::string_view bytes) { return file_->Write(bytes); });
  received_ = file_->Received();
  if (upload.Result() == QELO_UPLOAD_DONE && file_->IsWhole()) {
    whole = file_->Finish(owner);
    return whole != nullptr ? upload.Result() : upload.Fail(QELO_UPLOAD_NO_FILE);
  }
  return upload.Result();
}

}  // namespace QELO::Platform
