#pragma once

#include <atomic>
#include <chrono>
#include <cstdint>

namespace QELO {

/// Since when a worker makes the call that it is at: memory that the worker writes and the server
/// reads once the worker has ended. Foreign code runs in that process, so nothing but figures
/// depends on it.
class CallClock {
 public:
  CallClock();
  CallClock(CallClock&& other) noexcept;
  CallClock(const CallClock&) = delete;
  CallClock& operator=(const CallClock&) = delete;
  CallClock& operator=(CallClock&&) = delete;
  ~CallClock();

  void Begin();
  void End();
  /// Whether a call has begun and not ended.
  bool Runs() const;
  /// How long it has run; 0 when none does.
  std::chrono::milliseconds Time() const;
  /// For the server, once the worker is forked: nobody else gets this memory.
  void KeepFromOthers();

 private:
  std::atomic<int64_t>* since_;  ///< milliseconds of the steady clock; 0: no call. Null: no memory
};

}  // namespace QELO
