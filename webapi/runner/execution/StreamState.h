#pragma once

#include <ext/stdio_sync_filebuf.h>

#include <cstdio>
#include <ios>
#include <ostream>
#include <streambuf>

namespace QELO {

/// Keeps what foreign code may leave in one of the C++ library's standard streams and what would
/// outlive it: a buffer, a tied stream, errors that throw.
template <typename Char>
class StreamState {
 public:
  /// Errors do not throw from now on, as foreign code expects.
  explicit StreamState(std::basic_ios<Char>& stream)
      : stream_(stream),
        buffer_(stream.rdbuf()),
        tied_(stream.tie()),
        throwing_(stream.exceptions()),
        errors_(stream.rdstate()) {
    if (throwing_ != std::ios_base::goodbit) {
      stream.exceptions(std::ios_base::goodbit);
    }
  }
  StreamState(const StreamState&) = delete;
  StreamState& operator=(const StreamState&) = delete;

  /// Puts the former buffer and the tied stream back, and forgets errors: the stream can be flushed
  /// then. A foreign buffer is not flushed, since it may be gone already.
  void RestoreBuffer() {
    if (stream_.exceptions() != std::ios_base::goodbit) {
      stream_.exceptions(std::ios_base::goodbit);
    }
    stream_.tie(tied_);
    if (stream_.rdbuf() != buffer_ || stream_.rdstate() != std::ios_base::goodbit) {
      stream_.rdbuf(buffer_);
    }
  }

  /// Puts the rest back, too.
  void Restore() {
    RestoreBuffer();
    if (stream_.rdstate() != errors_) {
      stream_.clear(errors_);
    }
    if (throwing_ != std::ios_base::goodbit && (errors_ & throwing_) == std::ios_base::goodbit) {
      stream_.exceptions(throwing_);
    }
  }

  /// From now on the former buffer is one that writes and reads through a C stream. The former is
  /// no more once the C++ streams have been taken off the C streams.
  void TakeBufferOf(std::FILE* file) {
    buffer_ = new __gnu_cxx::stdio_sync_filebuf<Char>(file);  // lives as long as the stream
  }

 private:
  std::basic_ios<Char>& stream_;
  std::basic_streambuf<Char>* buffer_;
  std::basic_ostream<Char>* const tied_;
  const std::ios_base::iostate throwing_;
  const std::ios_base::iostate errors_;
};

}  // namespace QELO
