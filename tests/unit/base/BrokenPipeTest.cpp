#include "webapi/base/BrokenPipe.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <cerrno>

namespace QELO {
namespace {

void ignore(int) {}

TEST(BrokenPipe, FailsAWriteAndGivesTheSignalBackAsItWas) {
  struct sigaction mine {};
  struct sigaction former {};
  mine.sa_handler = ignore;
  mine.sa_flags = static_cast<int>(SA_RESETHAND | SA_RESTART);
  ASSERT_EQ(sigaction(SIGPIPE, &mine, &former), 0);
  int ends[2];
  ASSERT_EQ(pipe(ends), 0);
  close(ends[0]);
  {
    const BrokenPipe tolerated;
    EXPECT_EQ(write(ends[1], "x", 1), -1);
    EXPECT_EQ(errno, EPIPE);
  }
  close(ends[1]);
  struct sigaction found {};
  ASSERT_EQ(sigaction(SIGPIPE, &former, &found), 0);
  EXPECT_EQ(found.sa_handler, ignore);
  // A handler that raises its signal anew counts on the first of them.
  EXPECT_TRUE((found.sa_flags & static_cast<int>(SA_RESETHAND)) != 0);
  EXPECT_TRUE((found.sa_flags & SA_RESTART) != 0);
}

}  // namespace
}  // namespace QELO
