// The body of a request on pipes and files.

#include "platform/multipart/Body.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <thread>

#include "webapi/base/UniqueFd.h"
#include "webapi/platform/Upload.h"

namespace QELO::Platform {
namespace {

PaceLimits idle(int milliseconds) {
  PaceLimits limits;
  limits.idle = std::chrono::milliseconds(milliseconds);
  return limits;
}

class BodyOnAPipe : public testing::Test {
 protected:
  void SetUp() override {
    int ends[2];
    ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
    out = UniqueFd(ends[0]);
    in = UniqueFd(ends[1]);
  }
  void Send(const std::string& text) const {
    ASSERT_EQ(write(in.Get(), text.data(), text.size()), static_cast<ssize_t>(text.size()));
  }

  UniqueFd out;
  UniqueFd in;
  char buffer[100] = {};
};

TEST_F(BodyOnAPipe, IsReadAsItComesAndNotBeyondItsLength) {
  Body body(out.Get(), 10, idle(1000));
  Send("1234");
  EXPECT_EQ(body.Read(buffer, sizeof buffer), 4);
  EXPECT_EQ(body.Received(), 4U);
  Send("567890more");
  EXPECT_EQ(body.Read(buffer, sizeof buffer), 6);
  EXPECT_EQ(body.Read(buffer, sizeof buffer), 0);
  EXPECT_EQ(body.Received(), body.Length());
}

TEST_F(BodyOnAPipe, ClientThatSendsNothingIsGivenUp) {
  Body body(out.Get(), 10, idle(10));
  EXPECT_EQ(body.Read(buffer, sizeof buffer), QELO_UPLOAD_BROKEN_OFF);
}

TEST_F(BodyOnAPipe, ClientThatIsTooSlowIsGivenUpThoughBytesCome) {
  PaceLimits limits = idle(60'000);
  limits.window = std::chrono::milliseconds(50);
  limits.leastRate = 1'000'000;
  Body body(out.Get(), 1000, limits);
  const std::jthread client([&](const std::stop_token& ended) {
    for (int i = 0; i < 1000 && !ended.stop_requested(); ++i) {
      Send("x");
      std::this_thread::sleep_for(std::chrono::milliseconds(5));
    }
  });
  int64_t count = 0;
  int taken = 0;
  while ((count = body.Read(buffer, 1)) == 1) {
    ++taken;
  }
  EXPECT_EQ(count, QELO_UPLOAD_BROKEN_OFF);
  EXPECT_LT(taken, 20);
}

TEST_F(BodyOnAPipe, LargeOneHasMoreRoomThere) {
  const int usual = fcntl(out.Get(), F_GETPIPE_SZ);
  const Body small(out.Get(), 60'000, idle(10));
  EXPECT_EQ(fcntl(out.Get(), F_GETPIPE_SZ), usual);
  const Body large(out.Get(), 1'000'000, idle(10));
  EXPECT_EQ(fcntl(out.Get(), F_GETPIPE_SZ), 256 << 10);
}

TEST_F(BodyOnAPipe, EarlyEndIsABreak) {
  Body body(out.Get(), 10, idle(1000));
  Send("1234");
  in = UniqueFd();
  EXPECT_EQ(body.Read(buffer, sizeof buffer), 4);
  EXPECT_EQ(body.Read(buffer, sizeof buffer), QELO_UPLOAD_BROKEN_OFF);
}

TEST_F(BodyOnAPipe, WaitsAlsoWhereReadingDoesNot) {
  ASSERT_EQ(fcntl(out.Get(), F_SETFL, O_NONBLOCK), 0);
  Body body(out.Get(), 10, idle(10));
  EXPECT_EQ(body.Read(buffer, sizeof buffer), QELO_UPLOAD_BROKEN_OFF);
  Send("1");
  EXPECT_EQ(body.Read(buffer, sizeof buffer), 1);
}

TEST(Body, OfADescriptorThatIsClosedCannotBeRead) {
  Body body(-1, 10, idle(10));
  char buffer[10];
  EXPECT_EQ(body.Read(buffer, sizeof buffer), QELO_UPLOAD_BROKEN_OFF);
  Body empty(-1, 0, idle(10));
  EXPECT_EQ(empty.Read(buffer, sizeof buffer), 0);
}

}  // namespace
}  // namespace QELO::Platform
