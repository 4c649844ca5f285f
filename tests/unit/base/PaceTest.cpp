// How long the other end of a pipe is waited for.

#include "webapi/base/Pace.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <poll.h>
#include <unistd.h>

#include <thread>

#include "webapi/base/UniqueFd.h"

namespace QELO {
namespace {

using std::chrono::milliseconds;
using Clock = std::chrono::steady_clock;

constexpr milliseconds kLong{60'000};

class PaceOnAPipe : public testing::Test {
 protected:
  void SetUp() override {
    int ends[2];
    ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
    out = UniqueFd(ends[0]);
    in = UniqueFd(ends[1]);
  }

  /// Takes bytes that come one by one, until the pace is lost. @return how many came
  int TakeTrickle(Pace& pace, milliseconds apart, int most) {
    int count = 0;
    std::jthread client([&](const std::stop_token& ended) {
      for (int i = 0; i < most && !ended.stop_requested(); ++i) {
        std::this_thread::sleep_for(apart);
        if (write(in.Get(), "x", 1) != 1) {
          return;
        }
      }
    });
    char byte = 0;
    while (count < most && pace.Await(out.Get(), POLLIN) > 0 && read(out.Get(), &byte, 1) == 1) {
      pace.Add(1);
      ++count;
    }
    return count;
  }

  UniqueFd out;
  UniqueFd in;
};

TEST_F(PaceOnAPipe, NothingAtAllIsWaitedForUntilTheIdleLimit) {
  Pace pace({milliseconds(30), kLong, 1, kLong});
  const Clock::time_point start = Clock::now();
  EXPECT_EQ(pace.Await(out.Get(), POLLIN), 0);
  EXPECT_GE(Clock::now() - start, milliseconds(30));
}

TEST_F(PaceOnAPipe, TrickleIsTooSlowThoughEachByteComesInTime) {
  Pace pace({kLong, milliseconds(200), 1'000'000, kLong});
  EXPECT_LT(TakeTrickle(pace, milliseconds(10), 1000), 21);
  EXPECT_EQ(pace.Await(out.Get(), POLLIN), 0);  // for good
}

TEST_F(PaceOnAPipe, TrickleAtTheLeastRateGoesOn) {
  Pace pace({kLong, milliseconds(400), 10, kLong});  // four bytes in each window
  EXPECT_EQ(TakeTrickle(pace, milliseconds(10), 60), 60);
}

TEST_F(PaceOnAPipe, AnyRateIsGoodWithoutALeastOne) {
  Pace pace({kLong, milliseconds(20), 0, milliseconds(0)});
  EXPECT_EQ(TakeTrickle(pace, milliseconds(10), 10), 10);
}

TEST_F(PaceOnAPipe, WaitingHasAnEndHoweverFastItGoes) {
  Pace pace({kLong, kLong, 0, milliseconds(100)});
  EXPECT_LT(TakeTrickle(pace, milliseconds(10), 1000), 11);
}

TEST_F(PaceOnAPipe, TimeThatIsOursDoesNotCount) {
  Pace pace({milliseconds(20), milliseconds(20), 1000, milliseconds(20)});
  ASSERT_EQ(write(in.Get(), "1", 1), 1);
  std::this_thread::sleep_for(milliseconds(50));
  EXPECT_GT(pace.Await(out.Get(), POLLIN), 0);
}

TEST_F(PaceOnAPipe, PeerThatIsGoneIsReady) {
  in = UniqueFd();
  Pace pace({kLong, kLong, 1, kLong});
  EXPECT_GT(pace.Await(out.Get(), POLLIN), 0);
}

}  // namespace
}  // namespace QELO
