#include "programs/webapi-server/workers/CallClock.h"

#include <sys/mman.h>

#include <new>
#include <utility>

namespace QELO {
namespace {

using Moment = std::atomic<int64_t>;

int64_t now() {
  using std::chrono::duration_cast;
  return duration_cast<std::chrono::milliseconds>(
             std::chrono::steady_clock::now().time_since_epoch())
      .count();
}

}  // namespace

CallClock::CallClock() : since_(nullptr) {
  void* memory =
      mmap(nullptr, sizeof(Moment), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0);
  if (memory != MAP_FAILED) {
    since_ = new (memory) Moment(0);
  }
}

CallClock::CallClock(CallClock&& other) noexcept : since_(std::exchange(other.since_, nullptr)) {}

CallClock::~CallClock() {
  if (since_ != nullptr) {
    munmap(since_, sizeof(Moment));
  }
}

void CallClock::Begin() {
  if (since_ != nullptr) {
    *since_ = now();
  }
}

void CallClock::End() {
  if (since_ != nullptr) {
    *since_ = 0;
  }
}

bool CallClock::Runs() const {
  return since_ != nullptr && *since_ != 0;
}

std::chrono::milliseconds CallClock::Time() const {
  return std::chrono::milliseconds(Runs() ? now() - *since_ : 0);
}

void CallClock::KeepFromOthers() {
  if (since_ != nullptr) {
    madvise(since_, sizeof(*since_), MADV_DONTFORK);
  }
}

}  // namespace QELO
