#pragma once

namespace files {

/// Whether somebody asked a background task to stop. The work looks between two items and two
/// pieces of a file, so that it ends with nothing half done under a name that clients see.
class Stop {
 public:
  /// From now on a request to end is kept to be asked for.
  static void Watch();
  static bool IsAsked();
};

}  // namespace files
