#pragma once

namespace QELO {

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

}  // namespace QELO
