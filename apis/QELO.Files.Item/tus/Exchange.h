#pragma once

#include <cstdint>
#include <string>

#include "calls/Call.h"
#include "tus/Upload.h"

namespace files {

/// One request of the protocol for resumable uploads, tus 1.0, and its answer.
class Exchange {
 public:
  static constexpr uint64_t kLargest = uint64_t{1} << 44;  ///< bytes of an upload: 16 TiB
  static constexpr size_t kLongestMetadata = 8192;         ///< bytes of the header

  Exchange(QELO::APIRequest* request, QELO::APIResponse* response);

  /// Answers the request.
  void Serve();

 private:
  void Options();
  void Create();
  void Head();
  void Patch();
  void Delete();

  /// The upload that the request names, with its data where it is not finished. @return false when
  /// there is none, which is the answer
  bool Find(UploadState& state, UploadData& data);
  /// Takes back what was written and is known not to be what was sent.
  bool Settle(UploadState& state, const UploadData& data);
  /// Receives the body. @return false when it failed, which is the answer
  bool Receive(const UploadState& state, const UploadData& data, uint64_t& length);
  bool ReceiveChecked(UploadState& state, const UploadData& data, uint64_t& length);
  /// Gives a whole upload its name. @return false when it cannot have it, which is the answer
  bool Finish(UploadState& state, const UploadData& data);

  std::string Header(const char* name) const;
  std::string Location() const;
  void TellState(const UploadState& state, uint64_t offset, time_t lastChange);
  /// Answers with a status of HTTP alone.
  void Answer(const char* status);
  /// An error of HTTP and of the API at once. @return false
  bool Refuse(const char* status, Reason reason, const std::string& path);
  bool Refuse(Reason reason, const std::string& path);

  Call call_;
  UploadStore store_;
  bool hasStore_;
  std::string id_;  ///< of the upload; as the client has sent it
};

}  // namespace files
