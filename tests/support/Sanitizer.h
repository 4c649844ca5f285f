#pragma once

/// There when the program is linked for the sanitizer.
extern "C" void __asan_init() __attribute__((weak));

/// Whether the sanitizers watch the program: tests are compiled once, whichever they are linked
/// for.
inline bool IsSanitized() {
  return __asan_init != nullptr;
}
