#include "tests/unit/batch/polling/Fixture.h"
#include "webapi/platform/Task.h"

namespace QELO {
namespace {

class PollingKeep : public PollingTest {
 protected:
  void SetUp() override {
    PollingTest::SetUp();
    polling = APIPolling::ForUser("alice");
  }

  void Make(bool removeWithEnd, int pid = 0) const {
    Record("alice", "1", R"({"success":true})", pid);
    ARDO::Task("alice", "1").setProperty("auto_remove", removeWithEnd);
  }

  bool IsThere() const { return !tasks->Record("alice", "1").isNull(); }
};

TEST_F(PollingKeep, ForAUserIsWhatTheUserMay) {
  Make(true);
  Record("bob", "1", "{}");
  Record("@administrators", "1", "{}");
  Json::Value status;
  EXPECT_TRUE(polling->Status("alice/1", status));
  EXPECT_FALSE(polling->Status("bob/1", status));
  EXPECT_FALSE(polling->Status("@administrators/1", status));
  platform->isAdmin = 1;
  EXPECT_TRUE(APIPolling::ForUser("alice")->Status("@administrators/1", status));
}

TEST_F(PollingKeep, KeepsARecordUntilItIsReleased) {
  Make(true, Sleeper());
  EXPECT_TRUE(polling->Keep("alice/1"));
  EXPECT_EQ(Property("alice", "1", "auto_remove"), false);
  EXPECT_TRUE(polling->Release("alice/1"));
  EXPECT_EQ(Property("alice", "1", "auto_remove"), true);
  EXPECT_TRUE(IsThere());
}

TEST_F(PollingKeep, ReleasesTheRecordOfEndedWorkAtOnce) {
  Make(true);
  EXPECT_TRUE(polling->Keep("alice/1"));
  ARDO::Task("alice", "1").finish(false);
  EXPECT_TRUE(polling->Release("alice/1"));
  EXPECT_FALSE(IsThere());
}

TEST_F(PollingKeep, OfARecordThatStaysAnywayChangesNothing) {
  Make(false);
  EXPECT_FALSE(polling->Keep("alice/1"));
  EXPECT_EQ(polling->GetError(), 500);
}

TEST_F(PollingKeep, OfAnothersTaskIsRefused) {
  Record("bob", "1", "{}");
  EXPECT_FALSE(polling->Keep("bob/1"));
  EXPECT_EQ(polling->GetError(), 503);
  EXPECT_FALSE(polling->Release("bob/1"));
  EXPECT_FALSE(polling->Keep("alice/none"));
  EXPECT_EQ(polling->GetError(), 508);
}

TEST_F(PollingKeep, EveryErrorHasAText) {
  for (const int code : {500, 501, 502, 503, 504, 505, 506, 507, 508}) {
    EXPECT_NE(APIPolling::ErrorText(code), nullptr) << code;
  }
  EXPECT_EQ(APIPolling::ErrorText(105), nullptr);
}

}  // namespace
}  // namespace QELO
