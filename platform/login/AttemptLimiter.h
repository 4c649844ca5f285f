#pragma once

#include <cstdint>
#include <string>

#include "platform/settings/Settings.h"
#include "webapi/base/UniqueFd.h"

namespace QELO::Platform {

/// Counts login attempts per address and account, and per address, in windows of time that start
/// with the first attempt. IPv6 addresses of one network of 64 bits count as one address, and so do
/// all texts that are no address.
///
/// The counts are files, one for an address and one for an address and account; one lock guards
/// them all.
class LoginLimiter {
 public:
  /// Longer accounts, in bytes, are counted under their address alone.
  static constexpr size_t kLongestAccount = 64;
  /// Seconds to wait for the lock.
  static constexpr int kLockWait = 2;

  LoginLimiter();

  /// @return 0 after counting the attempt; the seconds until the next one may go on, and then this
  ///         one is not counted; -1 when it cannot be counted, which is logged
  int Attempt(const std::string& address, const std::string& account);
  /// Clears the account's count and takes one attempt off the address's.
  void Succeeded(const std::string& address, const std::string& account);

 private:
  struct Count {
    int64_t start = 0;  ///< of the window, seconds since the epoch
    int64_t attempts = 0;
  };

  /// Takes the lock, and the time, which no count kept so far can be ahead of.
  UniqueFd Lock();
  bool Read(const std::string& file, Count& count) const;
  bool Write(const std::string& file, const Count& count) const;
  int Wait(const Count& count, int limit) const;

  int window_;       ///< seconds
  int perAccount_;   ///< attempts in a window
  int perAddress_;   ///< likewise
  int64_t now_ = 0;  ///< seconds since the epoch
  UniqueFd dir_;
};

}  // namespace QELO::Platform
