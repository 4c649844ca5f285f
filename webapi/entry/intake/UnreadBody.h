#pragma once

#include <chrono>
#include <cstdint>

#include "webapi/base/FileIdentity.h"
#include "webapi/base/TakenBody.h"

namespace QELO {

/// What a client still sends of a body that nobody reads. A web server that passes it on meanwhile
/// loses the answer when the program ends before it has taken all, so the rest is dropped.
class UnreadBody {
 public:
  /// Most bytes that are dropped. Whoever sends more may lose the answer.
  static constexpr int64_t kMostDropped = int64_t{1} << 30;
  /// How long the client may send nothing before the rest is given up, and how long dropping lasts
  /// at most: what web servers give a client that they are done with.
  static constexpr std::chrono::milliseconds kIdleLimit{2000};
  static constexpr std::chrono::milliseconds kTimeLimit{30000};

  /// @param descriptor  standard input as the web server gave it
  /// @param length      bytes announced; 0: none; below 0: a body of unknown length, to its end
  /// A descriptor that is neither pipe nor socket has nobody at its other end who waits.
  UnreadBody(int descriptor, int64_t length);

  /// The body that the CGI variables announce, on standard input.
  static UnreadBody OfRequest();

  /// Whether there may be more. Not when the descriptor leads elsewhere by now: the body has been
  /// taken, or foreign code has closed it.
  bool IsOpen() const { return Left() > 0 && body_.IsAt(descriptor_); }
  int Descriptor() const { return descriptor_; }

  /// Drops what has come. REQUIRES: IsOpen(), and that reading does not wait
  void DropSome();
  /// Drops the rest, within the limits.
  void Drop();

 private:
  /// Most bytes that may still be dropped.
  int64_t Left() const { return left_ - (TakenBodyBytes() - taken_); }

  int descriptor_;
  FileIdentity body_;
  int64_t left_;  ///< but for what others have taken since
  int64_t taken_ = TakenBodyBytes();
};

}  // namespace QELO
