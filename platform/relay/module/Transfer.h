#pragma once

#include <curl/curl.h>

#include <chrono>
#include <cstdint>
#include <memory>
#include <string>

#include "platform/relay/RelayCall.h"

namespace QELO::Platform {

/// One call on its way: its request goes out, its answer comes in.
class Transfer {
 public:
  /// @param call  outlives the transfer, and receives answer, error and reason
  explicit Transfer(RelayCall& call) : call_(call) {}
  Transfer(const Transfer&) = delete;
  Transfer& operator=(const Transfer&) = delete;

  /// @return false when the call failed right away
  bool Prepare();
  CURL* Handle() const { return handle_.get(); }
  /// The descriptor that an upload waits for; -1: none.
  int WaitsFor() const { return isPaused_ ? call_.upload : -1; }
  /// More of the upload may be there.
  void Continue();
  /// @return false when it took too long, which the call then says
  bool IsInTime();
  void Finish(CURLcode result);

 private:
  using Clock = std::chrono::steady_clock;

  static size_t TakeAnswer(char* data, size_t, size_t count, void* object);
  static size_t GiveUpload(char* buffer, size_t, size_t room, void* object);
  bool AddHeader(const char* header);
  bool SetHeaders();
  bool SetOptions();
  bool SetSecurity();
  void Fail(CredRequestError error, const std::string& reason);

  struct Free {
    void operator()(CURL* handle) const { curl_easy_cleanup(handle); }
    void operator()(curl_slist* list) const { curl_slist_free_all(list); }
  };

  RelayCall& call_;
  std::unique_ptr<curl_slist, Free> headers_;
  std::unique_ptr<CURL, Free> handle_;
  char message_[CURL_ERROR_SIZE] = "";
  bool isPaused_ = false;
  bool hasNoMemory_ = false;                ///< for the answer
  int64_t sent_ = 0;                        ///< bytes of the body, as far as they were given
  curl_off_t uploaded_ = 0;                 ///< bytes that have left, when last looked at
  Clock::time_point moved_ = Clock::now();  ///< when the last of them did
};

}  // namespace QELO::Platform
