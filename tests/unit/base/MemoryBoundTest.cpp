#include "webapi/base/MemoryBound.h"

#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>

#include "tests/support/Sanitizer.h"

namespace QELO {
namespace {

constexpr size_t kBound = 128 << 20;

rlimit limit() {
  rlimit now{};
  getrlimit(RLIMIT_AS, &now);
  return now;
}

bool canAllocate(size_t bytes) {
  void* volatile memory = malloc(bytes);
  free(memory);
  return memory != nullptr;
}

/// Runs a piece in a child, whose limits are its own. @return its exit status
template <typename Piece>
int inChild(Piece piece) {
  const pid_t child = fork();
  if (child == 0) {
    _exit(piece() ? 0 : 1);
  }
  int status = -1;
  waitpid(child, &status, 0);
  return status;
}

class MemoryBoundTest : public testing::Test {
 protected:
  void SetUp() override {
    if (IsSanitized()) {
      GTEST_SKIP() << "the sanitizer uses more than any bound";
    }
  }
};

TEST_F(MemoryBoundTest, AllocationsBeyondItFailUntilItIsLifted) {
  EXPECT_EQ(inChild([] {
              MemoryBound::Set(kBound);
              const bool isBound = canAllocate(kBound / 2) && !canAllocate(2 * kBound);
              MemoryBound::Lift();
              return isBound && canAllocate(2 * kBound);
            }),
            0);
}

TEST_F(MemoryBoundTest, LiftingGivesTheFormerLimitsBack) {
  EXPECT_EQ(inChild([] {
              const rlimit former{2 * kBound, 3 * kBound};
              setrlimit(RLIMIT_AS, &former);
              MemoryBound::Set(kBound);
              MemoryBound::Set(kBound / 2);
              const rlimit bound = limit();
              MemoryBound::Lift();
              MemoryBound::Lift();
              const rlimit after = limit();
              return bound.rlim_cur > kBound && bound.rlim_cur < kBound + kBound / 2 &&
                     bound.rlim_max == 3 * kBound && after.rlim_cur == 2 * kBound &&
                     after.rlim_max == 3 * kBound;
            }),
            0);
}

TEST_F(MemoryBoundTest, WhatWasMeasuredBeforehandIsWhatItIsBeyond) {
  EXPECT_EQ(inChild([] {
              MemoryBound::Measure();
              void* volatile memory = malloc(kBound);
              MemoryBound::Set(2 * kBound);
              const bool isBound = canAllocate(kBound / 2) && !canAllocate(kBound + kBound / 2);
              MemoryBound::Lift();
              return memory != nullptr && isBound;
            }),
            0);
}

TEST_F(MemoryBoundTest, LowerLimitStays) {
  EXPECT_EQ(inChild([] {
              const rlimit lower{kBound / 2, kBound / 2};
              setrlimit(RLIMIT_AS, &lower);
              MemoryBound::Set(kBound);
              const rlimit bound = limit();
              MemoryBound::Lift();
              return bound.rlim_cur == kBound / 2 && limit().rlim_cur == kBound / 2;
            }),
            0);
}

TEST_F(MemoryBoundTest, LiftingWithoutABoundChangesNothing) {
  const rlimit before = limit();
  MemoryBound::Lift();
  EXPECT_EQ(limit().rlim_cur, before.rlim_cur);
}

}  // namespace
}  // namespace QELO
