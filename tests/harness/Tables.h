#pragma once

#include <sys/types.h>

namespace QELO {

/// While it lives, the methods of the test program's API table are called through here, so that
/// what they run as is seen.
class Tables {
 public:
  /// How the last method ran.
  struct Seen {
    bool isCalled;
    uid_t uid;
    gid_t gid;
  };

  Tables();
  Tables(const Tables&) = delete;
  Tables& operator=(const Tables&) = delete;
  ~Tables();

  static Seen& Run();
};

}  // namespace QELO
