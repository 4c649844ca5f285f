#pragma once

/// While it lives, calls of the C library fail as told, and are counted.
struct FailingLibc {
  FailingLibc();
  ~FailingLibc();

  bool regcompFails = false;
  bool regexecFails = false;
  bool strdupFails = false;
  int compiled = 0;  ///< successful regcomp()
  int freed = 0;     ///< regfree()
};
