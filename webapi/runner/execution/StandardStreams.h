#pragma once

#include <optional>

#include "webapi/runner/execution/CStream.h"
#include "webapi/runner/execution/CppStreams.h"
#include "webapi/runner/execution/NullDescriptor.h"
#include "webapi/runner/execution/ReadAhead.h"

namespace QELO {

/// Shuts foreign code off from standard input and output, and gives them back at the end, whatever
/// it did to them.
///
/// Each stream exists three times, and an API library may use any of them: the C++ stream, the C
/// stream and the descriptor. The first two end in the third, which is /dev/null meanwhile; what
/// was written before goes out before, and what was read before stays for who comes after. A
/// descriptor that cannot be given back, since foreign code has closed what was kept of it, is
/// logged.
class StandardStreams {
 public:
  StandardStreams(bool shutInput, bool shutOutput);
  StandardStreams(const StandardStreams&) = delete;
  StandardStreams& operator=(const StandardStreams&) = delete;
  ~StandardStreams();

  /// Whether all that was to be shut is. Otherwise no foreign code may run.
  bool IsShut() const { return isShut_; }

  /// Whether standard output is shut off from whoever runs now.
  static bool IsOutputShut();

  /// For a forked child that outlives the request and never returns to the guard's owner: closes
  /// the former descriptors, whose last holder the web server waits for.
  static void LetGo();

 private:
  void Shut();

  const bool shutsInput_;
  const bool shutsOutput_;
  CppStreams cppStreams_;
  ReadAhead readAhead_;
  std::optional<CStream> cInput_;
  std::optional<CStream> cOutput_;
  NullDescriptor input_;
  NullDescriptor output_;
  bool isShut_ = true;
  StandardStreams* outer_;  ///< the guard around this one: calls nest
  static StandardStreams* innermost_;
};

}  // namespace QELO
