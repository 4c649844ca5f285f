#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "platform/multipart/Body.h"
#include "platform/multipart/PartReader.h"
#include "platform/multipart/TemporaryFile.h"
#include "webapi/platform/Upload.h"

namespace QELO::Platform {

/// The upload of a process: its body, taken apart part after part, and the files made of it, which
/// live as long as this does.
class Upload {
 public:
  /// Takes an ordinary field. @return false without memory
  using TakeField = std::function<bool(const std::string& name, const std::string& value)>;

  /// @param contentType  names the boundary
  Upload(const Body& body, std::string_view contentType);
  Upload(const Upload&) = delete;
  Upload& operator=(const Upload&) = delete;

  /// Reads on to the next file, ordinary fields on the way.
  /// Fields that KeepFields() read come first, once.
  /// @return QELO_UPLOAD_DONE, also at the end; else what failed, now or before
  int ReadFields(const TakeField& take);
  /// ReadFields() that keeps what it hands out for the next one.
  int KeepFields(const TakeField& take);
  /// Receives the file that was found.
  /// @param path  receives its path, when `keep`
  /// @param keep  gives it its name at once; else KeepFiles() does
  int ReadFile(const char* directory, const std::optional<FileOwner>& owner, bool keep,
               std::string& path);
  /// Receives the file that was found into something else.
  int ReadInto(const PartReader::Sink& sink);
  /// Adds a file that was made of it.
  void Adopt(std::unique_ptr<TemporaryFile> file) { files_.push_back(std::move(file)); }
  /// Gives the files that have none their names.
  /// @param paths  receives all files' paths, in the order in which they came
  int KeepFiles(std::vector<std::string>& paths);
  /// Removes all files and leaves the upload at its end, failed.
  int Fail(int result);

  /// The file that was found; null when there is none, at the end of the body.
  const PartHeader* PendingFile() const { return hasFile_ ? &part_ : nullptr; }

  /// Called when bytes have arrived; null: nobody is.
  void SetProgress(QeloCgiUploadProgress progress) { progress_ = progress; }
  uint64_t Length() const { return body_.Length(); }
  uint64_t Position() const;
  int Result() const { return result_; }
  /// Whether all of the body has arrived, or no more of it will.
  bool IsReceived() const { return body_.Received() == body_.Length() || hasBroken_; }

 private:
  int ReadField(std::string& value);
  int OpenFolder(const char* directory);
  int64_t Receive(char* buffer, size_t size);

  Body body_;
  std::optional<PartReader> reader_;
  PartHeader part_;
  bool hasFile_ = false;
  bool isEnd_ = false;
  bool hasBroken_ = false;
  int result_ = QELO_UPLOAD_DONE;
  QeloCgiUploadProgress progress_ = nullptr;
  size_t fieldBytes_ = 0;
  size_t fieldCount_ = 0;
  std::vector<std::pair<std::string, std::string>> kept_;
  std::shared_ptr<const TemporaryFolder> folder_;
  std::vector<std::unique_ptr<TemporaryFile>> files_;
};

}  // namespace QELO::Platform
