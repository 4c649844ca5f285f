#include "tests/unit/transfer/upload/ScarceHost.h"

#include <dlfcn.h>
#include <sys/statvfs.h>

#include <cerrno>
#include <cstdlib>
#include <new>

namespace {

ScarceHost* current = nullptr;
constexpr unsigned long kFragment = 1;  ///< bytes, so that a test can say each number

}  // namespace

ScarceHost::ScarceHost() {
  current = this;
}

ScarceHost::~ScarceHost() {
  current = nullptr;
}

// These take the place of the C and C++ libraries' for the whole test program.
extern "C" __attribute__((visibility("default"))) int statvfs64(const char* path,
                                                                struct statvfs64* info) noexcept {
  if (current == nullptr) {
    using Function = int (*)(const char*, struct statvfs64*);
    return reinterpret_cast<Function>(dlsym(RTLD_NEXT, "statvfs64"))(path, info);
  }
  const auto found = current->freeBytes.find(path);
  if (found == current->freeBytes.end()) {
    errno = ENOENT;
    return -1;
  }
  *info = {};
  info->f_bsize = 4096;
  info->f_frsize = kFragment;
  info->f_bfree = found->second;
  return 0;
}

/// Nothing else here asks for memory in this way.
void* operator new(size_t size, const std::nothrow_t&) noexcept {
  if (current != nullptr && current->hashesLeft >= 0) {
    if (current->hashesLeft == 0) {
      return nullptr;
    }
    --current->hashesLeft;
  }
  try {
    return operator new(size);
  } catch (const std::bad_alloc&) {
    return nullptr;
  }
}
