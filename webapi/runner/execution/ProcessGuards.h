#pragma once

#include <streambuf>

#include "webapi/runner/execution/ReadAhead.h"

namespace QELO {

/// Puts /dev/null in the place of one standard descriptor, and gives the former one back at the
/// end.
class NullDescriptor {
 public:
  NullDescriptor() = default;
  NullDescriptor(const NullDescriptor&) = delete;
  NullDescriptor& operator=(const NullDescriptor&) = delete;
  ~NullDescriptor();

  /// @param null  /dev/null, which the caller closes unless it is `descriptor` itself
  /// @return false, and the descriptor as it was, when it cannot be kept or replaced
  bool Replace(int descriptor, int null);
  /// Closes the former one, which then is not given back.
  void LetGo();

 private:
  int descriptor_ = -1;
  int former_ = -1;  ///< -1: it was closed before
};

/// Shuts foreign code off from standard input and output, and gives them back at the end.
///
/// Each stream exists three times, and an API library may use any of them: the C++ stream, the C
/// stream and the descriptor. The first two end in the third, which is /dev/null meanwhile; what
/// was written before goes out before, and what was read before stays for who comes after.
class StandardStreams {
 public:
  StandardStreams(bool shutInput, bool shutOutput);
  StandardStreams(const StandardStreams&) = delete;
  StandardStreams& operator=(const StandardStreams&) = delete;
  ~StandardStreams();

  /// Whether all that was to be shut is. Otherwise no foreign code may run.
  bool IsShut() const { return isShut_; }

  /// For a forked child that outlives the request and never returns to the guard's owner: closes
  /// the former descriptors, whose last holder the web server waits for.
  static void LetGo();

 private:
  NullDescriptor input_;
  NullDescriptor output_;
  ReadAhead readAhead_;
  std::streambuf* inputBuffer_ = nullptr;
  std::streambuf* outputBuffer_ = nullptr;
  bool isShut_ = true;
  StandardStreams* outer_;  ///< the guard around this one: calls nest
  static StandardStreams* innermost_;
};

/// Runs at another scheduling priority, and goes back to the former at the end.
class Priority {
 public:
  Priority() = default;
  Priority(const Priority&) = delete;
  Priority& operator=(const Priority&) = delete;
  ~Priority();

  /// @param priority  as setpriority(2); the system is not called when it is the current one
  void Set(int priority);

 private:
  bool changed_ = false;
  int former_ = 0;
};

/// Goes back at the end to the working directory there was at the start.
class WorkingDirectory {
 public:
  WorkingDirectory();
  WorkingDirectory(const WorkingDirectory&) = delete;
  WorkingDirectory& operator=(const WorkingDirectory&) = delete;
  ~WorkingDirectory();

 private:
  int directory_;
};

}  // namespace QELO
