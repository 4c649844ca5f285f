#pragma once

#include "webapi/runner/execution/StreamState.h"

namespace QELO {

/// Keeps the C++ library's eight standard streams over foreign code, narrow and wide ones.
class CppStreams {
 public:
  /// Flushes the output streams.
  CppStreams();

  /// Makes the streams' buffers the former ones and flushes them, to wherever the C streams and
  /// descriptors lead by now.
  void RestoreBuffers();
  /// Makes the streams what they were.
  void Restore();

 private:
  template <typename Call>
  void ForAll(Call call);
  void Flush() const;

  bool isSynchronised_;  ///< with the C streams
  StreamState<char> input_, output_, error_, log_;
  StreamState<wchar_t> wideInput_, wideOutput_, wideError_, wideLog_;
};

}  // namespace QELO
