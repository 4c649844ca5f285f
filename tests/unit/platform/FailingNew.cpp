#include "tests/unit/platform/FailingNew.h"

#include <cstdint>
#include <cstdlib>
#include <new>

namespace {

size_t mostBytes = SIZE_MAX;

}  // namespace

FailingNew::FailingNew(size_t most) {
  mostBytes = most;
}

FailingNew::~FailingNew() {
  mostBytes = SIZE_MAX;
}

void* operator new(size_t size, const std::nothrow_t&) noexcept {
  return size <= mostBytes ? malloc(size != 0 ? size : 1) : nullptr;
}

void* operator new(size_t size) {
  void* memory = operator new(size, std::nothrow);
  if (memory == nullptr) {
    throw std::bad_alloc();
  }
  return memory;
}

void operator delete(void* memory) noexcept {
  free(memory);
}

void operator delete(void* memory, size_t) noexcept {
  free(memory);
}

void operator delete(void* memory, const std::nothrow_t&) noexcept {
  free(memory);
}
