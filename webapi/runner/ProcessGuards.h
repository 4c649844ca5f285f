#pragma once

#include <cstdio>
#include <streambuf>

namespace QELO {

/// Shuts foreign code off from standard input and output, and gives them back at the end.
///
/// Each stream exists three times, and an API library may use any of them: the C++ stream, the C
/// stream and the descriptor. All three lead to /dev/null meanwhile. What was written before goes
/// out before; what was read ahead stays unread.
class StandardStreams {
 public:
  StandardStreams(bool shutInput, bool shutOutput);
  StandardStreams(const StandardStreams&) = delete;
  StandardStreams& operator=(const StandardStreams&) = delete;
  ~StandardStreams();

  /// For a forked child that outlives the request and never returns to the guard's owner: closes
  /// the former descriptors, whose last holder the web server waits for.
  static void LetGo();

 private:
  void ShutInput();
  void ShutOutput();
  void GiveBackInput();
  void GiveBackOutput();

  /// Nothing to read, and nothing kept of what is written: what /dev/null is to a stream.
  class NullBuffer : public std::streambuf {
   protected:
    int_type overflow(int_type c) override { return traits_type::not_eof(c); }
    std::streamsize xsputn(const char*, std::streamsize count) override { return count; }
  };

  NullBuffer null_;
  std::streambuf* inputBuffer_ = nullptr;
  std::streambuf* outputBuffer_ = nullptr;
  std::FILE* inputFile_ = nullptr;
  int inputDescriptor_ = -1;
  int outputDescriptor_ = -1;
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
