#pragma once

#include "platform/fileoutput/Content.h"
#include "platform/fileoutput/Head.h"

namespace QELO::Platform {

/// The road on which the web server sends a file itself.
///
/// Only whole files, below the directories of a setting, that everybody may read who may enter
/// those: the server opens the file anew, with rights of its own.
class FastRoad {
 public:
  static void SetEnabled(bool enabled) { isEnabled_ = enabled; }
  static bool IsEnabled();
  /// Adds the line that has the server send the file.
  /// @return false, and `head` unchanged, when this process must send it
  static bool Take(const Content& content, Head& head);

 private:
  static bool isEnabled_;
};

}  // namespace QELO::Platform
