#pragma once

#include <cstdio>

namespace QELO {

/// Keeps one standard C stream usable over foreign code, which may close it, open it anew, turn it
/// wide, give it a buffer of a library that is unloaded later, or put another in its place.
class CStream {
 public:
  /// @param stream      stdin or stdout, with nothing pending in its buffer
  /// @param descriptor  the stream's own
  CStream(std::FILE*& stream, int descriptor);
  CStream(const CStream&) = delete;
  CStream& operator=(const CStream&) = delete;

  /// Makes the stream what it was, if it is not. What is pending in it is dropped.
  /// REQUIRES: the descriptor leads to /dev/null, or foreign code has closed it; it leads there
  /// afterwards
  void Restore();

 private:
  std::FILE*& stream_;
  std::FILE* const former_;
  const int descriptor_;
  const bool wasOpen_;
  char state_[sizeof(std::FILE)];  ///< whatever foreign code does to a stream changes a byte
};

}  // namespace QELO
