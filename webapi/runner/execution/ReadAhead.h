#pragma once

#include <fstream>
#include <memory>
#include <string>

namespace QELO {

/// Hides what the process has read ahead of its standard input's descriptor, and gives it back.
///
/// A stream hands out what is in its buffer whatever its descriptor is by then, so a method that
/// may not read would take it away from whom it belongs to. A CGI process has read nothing ahead.
class ReadAhead {
 public:
  ReadAhead() = default;
  ReadAhead(const ReadAhead&) = delete;
  ReadAhead& operator=(const ReadAhead&) = delete;

  /// Leaves the C stream with an empty buffer, and the C++ stream, when it has one of its own, with
  /// nothing to read.
  void Hide();
  /// Fills the C stream's buffer as it was. The C++ stream's buffer is its owner's to put back.
  void GiveBack();

 private:
  std::string text_;
  std::unique_ptr<std::filebuf> nothing_;  ///< of no file
};

}  // namespace QELO
