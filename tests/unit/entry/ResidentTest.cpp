// An entry in a process that takes in one request after the other.

#include "tests/support/CgiFixture.h"
#include "webapi/base/TakenBody.h"
#include "webapi/runner/road/CallRoad.h"

namespace QELO {
namespace {

/// Leaves each request to somebody else.
class NoRoad : public CallRoad {
 public:
  bool Takes(APIRequest&, const Json::Value&) override { return false; }
  bool Run(APIRequest&, APIResponse&, const Json::Value&) override { return false; }
  void Answer(size_t) override {}
  void Leave() override {}
  bool IsLeft() const override { return true; }
};

class ResidentEntry : public CgiTest {};

TEST_F(ResidentEntry, TakesNothingForTakenOfABodyThatIsAnotherRequests) {
  TakenBodyBytes() = 5;
  NoRoad road;
  TestEntry entry;
  entry.RunBy(road);
  EXPECT_EQ(TakenBodyBytes(), 0);
}

}  // namespace
}  // namespace QELO
