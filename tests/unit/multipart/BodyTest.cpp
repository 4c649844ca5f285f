// The body of a request on pipes and files.

#include "platform/multipart/Body.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include "webapi/base/UniqueFd.h"
#include "webapi/platform/Upload.h"

namespace QELO::Platform {
namespace {

using std::chrono::milliseconds;

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
  Body body(out.Get(), 10, milliseconds(1000));
  Send("1234");
  EXPECT_EQ(body.Read(buffer, sizeof buffer), 4);
  EXPECT_EQ(body.Received(), 4U);
  Send("567890more");
  EXPECT_EQ(body.Read(buffer, sizeof buffer), 6);
  EXPECT_EQ(body.Read(buffer, sizeof buffer), 0);
  EXPECT_EQ(body.Received(), body.Length());
}

TEST_F(BodyOnAPipe, ClientThatSendsNothingIsGivenUp) {
  Body body(out.Get(), 10, milliseconds(10));
  EXPECT_EQ(body.Read(buffer, sizeof buffer), QELO_UPLOAD_BROKEN_OFF);
}

TEST_F(BodyOnAPipe, EarlyEndIsABreak) {
  Body body(out.Get(), 10, milliseconds(1000));
  Send("1234");
  in = UniqueFd();
  EXPECT_EQ(body.Read(buffer, sizeof buffer), 4);
  EXPECT_EQ(body.Read(buffer, sizeof buffer), QELO_UPLOAD_BROKEN_OFF);
}

TEST_F(BodyOnAPipe, WaitsAlsoWhereReadingDoesNot) {
  ASSERT_EQ(fcntl(out.Get(), F_SETFL, O_NONBLOCK), 0);
  Body body(out.Get(), 10, milliseconds(10));
  EXPECT_EQ(body.Read(buffer, sizeof buffer), QELO_UPLOAD_BROKEN_OFF);
  Send("1");
  EXPECT_EQ(body.Read(buffer, sizeof buffer), 1);
}

TEST(Body, OfADescriptorThatIsClosedCannotBeRead) {
  Body body(-1, 10, milliseconds(10));
  char buffer[10];
  EXPECT_EQ(body.Read(buffer, sizeof buffer), QELO_UPLOAD_BROKEN_OFF);
  Body empty(-1, 0, milliseconds(10));
  EXPECT_EQ(empty.Read(buffer, sizeof buffer), 0);
}

}  // namespace
}  // namespace QELO::Platform
