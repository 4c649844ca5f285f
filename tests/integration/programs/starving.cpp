// Preloaded into a program: from its setsid() on, which a request begins with, there is no memory
// left.

#include <sys/syscall.h>
#include <unistd.h>

#include <cstddef>

static bool starving = false;

extern "C" {

void* __libc_malloc(size_t size);

__attribute__((visibility("default"))) pid_t setsid() noexcept {
  starving = true;
  return static_cast<pid_t>(syscall(SYS_setsid));
}

__attribute__((visibility("default"))) void* malloc(size_t size) noexcept {
  return starving ? nullptr : __libc_malloc(size);
}

}  // extern "C"
