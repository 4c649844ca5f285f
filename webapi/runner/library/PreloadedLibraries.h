#pragma once

#include <string>

namespace QELO {

/// API libraries that a long-lived process has loaded before it forks those that serve requests.
///
/// What is loaded is a private copy in memory, so that a library may be replaced, or even be
/// overwritten in place, while the process lives; and a copy counts only while the file is the one
/// that was copied.
class PreloadedLibraries {
 public:
  /// Longest library in bytes that is copied, and most copies that a process makes; one that was
  /// replaced stays in memory.
  static constexpr size_t kLargest = size_t{64} << 20;
  static constexpr size_t kMostCopies = 256;

  /// Loads a library. It is loaded by a forked process first: one that cannot be, or that ends the
  /// process when it is loaded, costs nobody anything. One that is written at this moment is left
  /// to a later time.
  /// @param path  as descriptions name it, with a "/"
  /// @return false, with the reason logged, when it was not loaded
  static bool Load(const std::string& path);

  /// Loads those anew whose file is another by now.
  static void Refresh();

  /// The handle of a library, for one caller of a process, who gives it to Close(); null when there
  /// is none that is what the file is now.
  static void* Find(const std::string& path);

  /// Runs the destructors of a library that Find() gave, as dlclose() would, and leaves it in
  /// memory: taking it out costs a tenth of a call, and a process that was forked for one request
  /// is about to end.
  /// @return false, and nothing is done, when it is another
  static bool Close(void* handle);
};

}  // namespace QELO
