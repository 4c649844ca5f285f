#include "platform/multipart/Upload.h"

#include <algorithm>
#include <cerrno>

#include "platform/multipart/Limits.h"

namespace QELO::Platform {
namespace {

int resultOf(int error) {
  return error == ENOSPC || error == EDQUOT || error == EFBIG ? QELO_UPLOAD_NO_SPACE
                                                              : QELO_UPLOAD_NO_FILE;
}

}  // namespace

Upload::Upload(const Body& body, std::string_view contentType) : body_(body) {
  const std::string boundary = boundaryOf(contentType);
  if (boundary.empty()) {
    result_ = QELO_UPLOAD_MALFORMED;
    return;
  }
  reader_.emplace(boundary, [this](char* buffer, size_t size) { return Receive(buffer, size); });
}

int64_t Upload::Receive(char* buffer, size_t size) {
  const int64_t count = body_.Read(buffer, size);
  hasBroken_ = hasBroken_ || count < 0;
  if (count > 0 && progress_ != nullptr) {
    progress_(body_.Received(), body_.Length());
  }
  return count;
}

uint64_t Upload::Position() const {
  return isEnd_ || !reader_ ? body_.Length() : reader_->Position();
}

int Upload::Fail(int result) {
  result_ = result;
  hasFile_ = false;
  kept_.clear();
  files_.clear();
  return result;
}

int Upload::ReadField(std::string& value) {
  if (++fieldCount_ > UploadLimits::kFields) {
    return QELO_UPLOAD_TOO_LARGE;
  }
  const size_t room = UploadLimits::kFieldBytes - std::min(fieldBytes_, UploadLimits::kFieldBytes);
  const int fault = reader_->ReadContent([&](std::string_view bytes) {
    if (part_.field.size() + value.size() + bytes.size() > room) {
      return static_cast<int>(QELO_UPLOAD_TOO_LARGE);
    }
    value += bytes;
    return 0;
  });
  fieldBytes_ += part_.field.size() + value.size();
  // The hashes hold texts that end at their first NUL: what stands behind it would pass unseen.
  const bool hasNul = value.find('\0') != std::string::npos;
  return fault == 0 && hasNul ? QELO_UPLOAD_MALFORMED : fault;
}

int Upload::ReadFields(const TakeField& take) {
  for (const auto& [name, value] : std::exchange(kept_, {})) {
    if (!take(name, value)) {
      return Fail(QELO_UPLOAD_NO_MEMORY);
    }
  }
  while (result_ == QELO_UPLOAD_DONE && !hasFile_ && !isEnd_) {
    int fault = reader_->Next(part_, isEnd_);
    hasFile_ = fault == 0 && !isEnd_ && !part_.fileName.empty();
    if (fault == 0 && !isEnd_ && !hasFile_) {
      std::string value;
      fault = ReadField(value);
      if (fault == 0 && !take(part_.field, value)) {
        fault = QELO_UPLOAD_NO_MEMORY;
      }
    }
    if (fault != 0) {
      Fail(fault);
    }
  }
  return result_;
}

int Upload::KeepFields(const TakeField& take) {
  std::vector<std::pair<std::string, std::string>> read;
  const int result = ReadFields([&](const std::string& name, const std::string& value) {
    read.emplace_back(name, value);
    return take(name, value);
  });
  if (result == QELO_UPLOAD_DONE) {
    kept_ = std::move(read);
  }
  return result;
}

int Upload::OpenFolder(const char* directory) {
  if (folder_ != nullptr && folder_->Path() == directory) {
    return 0;
  }
  auto folder = std::make_shared<TemporaryFolder>();
  if (!folder->Open(directory)) {
    return QELO_UPLOAD_NO_FILE;
  }
  folder->Sweep();
  folder_ = std::move(folder);
  return 0;
}

int Upload::ReadFile(const char* directory, const std::optional<FileOwner>& owner, bool keep,
                     std::string& path) {
  if (result_ != QELO_UPLOAD_DONE || !hasFile_) {
    return result_;
  }
  if (files_.size() >= UploadLimits::kFiles) {
    return Fail(QELO_UPLOAD_TOO_LARGE);
  }
  if (const int fault = OpenFolder(directory); fault != 0) {
    return Fail(fault);
  }
  std::unique_ptr<TemporaryFile> file = TemporaryFile::Create(folder_, owner);
  if (file == nullptr) {
    return Fail(resultOf(errno));
  }
  const int fault = reader_->ReadContent(
      [&](std::string_view bytes) { return file->Write(bytes) ? 0 : resultOf(errno); });
  if (fault != 0) {
    return Fail(fault);
  }
  if (keep && !file->Keep()) {
    return Fail(resultOf(errno));
  }
  path = file->Path();
  files_.push_back(std::move(file));
  hasFile_ = false;
  return result_;
}

int Upload::ReadInto(const PartReader::Sink& sink) {
  if (result_ != QELO_UPLOAD_DONE || !hasFile_) {
    return result_;
  }
  hasFile_ = false;
  const int fault = reader_->ReadContent(sink);
  return fault != 0 ? Fail(fault) : result_;
}

int Upload::KeepFiles(std::vector<std::string>& paths) {
  for (const std::unique_ptr<TemporaryFile>& file : files_) {
    if (file->Path().empty() && !file->Keep()) {
      return Fail(resultOf(errno));
    }
    paths.push_back(file->Path());
  }
  return result_;
}

}  // namespace QELO::Platform
