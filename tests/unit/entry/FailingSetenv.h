#pragma once

/// While it lives, setenv() of one variable fails for want of memory.
class FailingSetenv {
 public:
  explicit FailingSetenv(const char* name);
  ~FailingSetenv();
};
