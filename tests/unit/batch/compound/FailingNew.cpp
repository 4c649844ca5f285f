#include "tests/unit/batch/compound/FailingNew.h"

#include <new>

int& FailingNew::Left() {
  static int left = -1;
  return left;
}

// Takes the place of the run-time library's for the whole test program.
void* operator new(std::size_t size, const std::nothrow_t&) noexcept {
  if (FailingNew::Left() >= 0 && FailingNew::Left()-- == 0) {
    return nullptr;
  }
  try {
    return ::operator new(size);
  } catch (const std::bad_alloc&) {
    return nullptr;
  }
}
