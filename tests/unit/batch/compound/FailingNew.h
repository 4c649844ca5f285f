#pragma once

/// The allocations that are asked not to throw can be made to fail.
struct FailingNew {
  /// How many more succeed before one fails; below 0: none fails.
  static int& Left();
};
