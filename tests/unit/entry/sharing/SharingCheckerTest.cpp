// SharingChecker: the application's check alone, for a request of its own.

#include "tests/unit/entry/sharing/Fixture.h"

namespace QELO {
namespace {

class SharingCheckerRun : public Links {
 protected:
  void SetUp() override {
    Links::SetUp();
    Install("link_checks");
    platform->sharingEntry = sharing::record::Entry(link);
  }
  /// What Run() answers; "print" when it printed something.
  static std::string Run(const std::string& query) {
    Get(query);
    bool allowed = false;
    const CgiAnswer printed = Printed([&] {
      LinkEntry<SharingChecker> checker;
      allowed = checker.Run(Json::Value());
    });
    return printed.text.empty() ? (allowed ? "yes" : "no") : "print";
  }
};

constexpr char kEcho[] = "api=QELO.Test.Good&version=1&method=echo&_sharing_id=S";

TEST_F(SharingCheckerRun, AnswersWhatTheCheckSays) {
  EXPECT_EQ(Run(std::string(kEcho) + "&check=allow"), "yes");
  EXPECT_EQ(Run(std::string(kEcho) + "&check=refuse"), "no");
}

TEST_F(SharingCheckerRun, AsksTheApplicationAlone) {
  platform->sharingAuthorized = -2;
  EXPECT_EQ(Run(std::string(kEcho) + "&check=allow"), "yes");
  EXPECT_EQ(Calls("QeloSharingIsAuthorized"), 0);
}

TEST_F(SharingCheckerRun, RefusesARequestThatCannotBeRead) {
  EXPECT_EQ(Run(std::string(kEcho) + "&_sid=" + std::string(5000, 'x')), "no");
  EXPECT_EQ(SyslogCapture::Count("sharing check"), 0);
}

TEST_F(SharingCheckerRun, RefusesWithoutALink) {
  platform->sharingEntry.reset();
  EXPECT_EQ(Run("api=QELO.Test.Good&version=1&method=echo"), "no");
}

}  // namespace
}  // namespace QELO
