#include <algorithm>
#include <deque>
#include <vector>

#include "platform/relay/module/Transfer.h"
#include "webapi/Export.h"

namespace QELO::Platform {
namespace {

constexpr int kLookAgainMs = 500;  ///< how late a time-out may be noticed

/// All calls on their way.
class Transfers {
 public:
  Transfers() : multi_(curl_multi_init()) {}
  Transfers(const Transfers&) = delete;
  Transfers& operator=(const Transfers&) = delete;
  ~Transfers() {
    for (Transfer* transfer : running_) {
      curl_multi_remove_handle(multi_, transfer->Handle());
    }
    all_.clear();
    curl_multi_cleanup(multi_);
  }

  bool IsGood() const { return multi_ != nullptr; }

  void Add(RelayCall& call) {
    Transfer& transfer = all_.emplace_back(call);
    if (!transfer.Prepare()) {
      return;
    }
    if (curl_multi_add_handle(multi_, transfer.Handle()) == CURLM_OK) {
      running_.push_back(&transfer);
    } else {
      transfer.Finish(CURLE_FAILED_INIT);
    }
  }

  void Run() {
    while (!running_.empty()) {
      int count = 0;
      if (curl_multi_perform(multi_, &count) != CURLM_OK) {
        FailAll();
        return;
      }
      TakeFinished();
      DropLate();
      if (!running_.empty()) {
        Wait();
      }
    }
  }

 private:
  void Wait() {
    std::vector<curl_waitfd> uploads;
    for (const Transfer* transfer : running_) {
      if (transfer->WaitsFor() >= 0) {
        uploads.push_back({transfer->WaitsFor(), CURL_WAIT_POLLIN, 0});
      }
    }
    curl_multi_poll(multi_, uploads.data(), static_cast<unsigned>(uploads.size()), kLookAgainMs,
                    nullptr);
    for (Transfer* transfer : running_) {
      transfer->Continue();
    }
  }

  void TakeFinished() {
    int left = 0;
    while (const CURLMsg* message = curl_multi_info_read(multi_, &left)) {
      char* pointer = nullptr;
      const CURLcode result = message->data.result;
      curl_easy_getinfo(message->easy_handle, CURLINFO_PRIVATE, &pointer);
      auto* transfer = reinterpret_cast<Transfer*>(pointer);
      transfer->Finish(result);
      Remove(transfer);
    }
  }

  void DropLate() {
    const std::vector<Transfer*> running = running_;
    for (Transfer* transfer : running) {
      if (!transfer->IsInTime()) {
        Remove(transfer);
      }
    }
  }

  void FailAll() {
    const std::vector<Transfer*> running = running_;
    for (Transfer* transfer : running) {
      transfer->Finish(CURLE_FAILED_INIT);
      Remove(transfer);
    }
  }

  void Remove(Transfer* transfer) {
    curl_multi_remove_handle(multi_, transfer->Handle());
    running_.erase(std::find(running_.begin(), running_.end(), transfer));
  }

  CURLM* multi_;
  std::deque<Transfer> all_;
  std::vector<Transfer*> running_;
};

}  // namespace
}  // namespace QELO::Platform

using namespace QELO::Platform;

extern "C" WEBAPI_API void webapiRelayRun(std::vector<RelayCall>* calls) {
  const bool isReady = curl_global_init(CURL_GLOBAL_DEFAULT) == CURLE_OK;
  Transfers transfers;
  for (RelayCall& call : *calls) {
    if (isReady && transfers.IsGood()) {
      transfers.Add(call);
    } else {
      call.error = QELO::CRED_REQUEST_NO_TRANSPORT;
      call.reason = "the transport cannot be started";
    }
  }
  transfers.Run();
}
