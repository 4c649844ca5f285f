#include "tests/unit/entry/output/ScarceMemory.h"

#include <cstdint>
#include <cstdlib>
#include <new>

static std::size_t largest = SIZE_MAX;

ScarceMemory::ScarceMemory(std::size_t limit) {
  largest = limit;
}

ScarceMemory::~ScarceMemory() {
  largest = SIZE_MAX;
}

// These take the place of the run-time library's for the whole test program.

void* operator new(std::size_t size) {
  void* block = size > largest ? nullptr : malloc(size > 0 ? size : 1);
  if (block == nullptr) {
    throw std::bad_alloc();
  }
  return block;
}

void* operator new(std::size_t size, const std::nothrow_t&) noexcept {
  return size > largest ? nullptr : malloc(size > 0 ? size : 1);
}

void operator delete(void* block) noexcept {
  free(block);
}

void operator delete(void* block, std::size_t) noexcept {
  free(block);
}
