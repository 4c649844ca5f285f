#include "tests/unit/batch/polling/Fixture.h"

namespace QELO {
namespace {

class PollingStatus : public PollingTest {
 protected:
  /// @return the error, 0 for success
  template <typename Id>
  int Status(const Id& id) {
    return polling->Status(id, out) ? 0 : polling->GetError();
  }

  Json::Value out;
};

TEST_F(PollingStatus, WithoutRequestIs502) {
  Record("alice", "1", "{}");
  polling->SetRequest(nullptr);
  EXPECT_EQ(Status(std::string("alice/1")), 502);
  EXPECT_EQ(Status(Json::Value(Json::arrayValue)), 502);
  EXPECT_EQ(SyslogCapture::Count("unknown request"), 2);
}

TEST_F(PollingStatus, OfEmptyIdIs502) {
  EXPECT_EQ(Status(std::string()), 502);
  EXPECT_EQ(Status(""), 502);
  EXPECT_FALSE(polling->Status(static_cast<const char*>(nullptr), out));
  EXPECT_EQ(SyslogCapture::Count("bad parameters"), 3);
}

TEST_F(PollingStatus, OfIdWithoutSlashIs503) {
  EXPECT_EQ(Status("alice"), 503);
  EXPECT_EQ(SyslogCapture::Count("Invalid task id[alice]"), 1);
}

TEST_F(PollingStatus, OfIdWithALineBreakStaysOneLineOfTheLog) {
  EXPECT_EQ(Status("alice/x]\nkernel: all is lost"), 508);
  EXPECT_EQ(SyslogCapture::Count("No such task id[alice/x]?kernel: all is lost]"), 1);
}

TEST_F(PollingStatus, OfIdThatEndsInASlashIsAMissingTask) {
  EXPECT_EQ(Status("alice/"), 508);
  EXPECT_EQ(SyslogCapture::Count("No such task id[alice/]"), 1);
}

TEST_F(PollingStatus, OfAnotherUsersTaskIs503) {
  Record("bob", "1", R"({"success":true})");
  EXPECT_EQ(Status("bob/1"), 503);
  EXPECT_EQ(SyslogCapture::Count("Invalid task id[bob/1]"), 1);
  EXPECT_EQ(SyslogCapture::Count("Invalid task id"), 2) << "the owner is refused first";
  EXPECT_TRUE(out.isNull());
}

TEST_F(PollingStatus, OfAnotherUsersMissingTaskIs503) {
  EXPECT_EQ(Status("bob/none"), 503) << "who may not ask must not learn that there is none";
}

TEST_F(PollingStatus, OfNamelessOwnerIs503ForWhoIsNotLoggedIn) {
  Login("", false);
  Record("", "1", R"({"success":true})");
  EXPECT_EQ(Status("/1"), 503);
}

TEST_F(PollingStatus, OfTheAdministratorsTaskIs503ForOthers) {
  Record("@administrators", "1", R"({"success":true})");
  EXPECT_EQ(Status("@administrators/1"), 503);
  EXPECT_EQ(SyslogCapture::Count("Permission denied"), 1);
}

TEST_F(PollingStatus, OfTheAdministratorsTaskIsGrantedToAnAdministrator) {
  Login("admin", true);
  Record("@administrators", "1", R"({"success":true})");
  EXPECT_EQ(Status("@administrators/1"), 0);
}

TEST_F(PollingStatus, OfAnotherUsersTaskIs503ForAnAdministratorToo) {
  Login("admin", true);
  Record("alice", "1", R"({"success":true})");
  EXPECT_EQ(Status("alice/1"), 503);
}

TEST_F(PollingStatus, OfEverybodysTaskIsGrantedToAnyUser) {
  Record("@users", "1", R"({"success":true})");
  EXPECT_EQ(Status("@users/1"), 0);
}

TEST_F(PollingStatus, OfMissingTaskIs508) {
  EXPECT_EQ(Status("alice/none"), 508);
  EXPECT_EQ(SyslogCapture::Count("No such task id[alice/none]"), 1);
}

TEST_F(PollingStatus, OfATaskWhoseStoreIsBusyIs504) {
  Record("alice", "1", R"({"success":true})");
  tasks->busy = true;
  EXPECT_EQ(Status("alice/1"), 504);
  EXPECT_EQ(SyslogCapture::Count("task id[alice/1] cannot be read now"), 1);
  EXPECT_EQ(Status(Parse(R"(["alice/1", "bob/1"])")), 0);
  EXPECT_EQ(Text(out), R"({"alice/1":{"busy":true},"bob/1":{}})");
  EXPECT_EQ(polling->Wait("alice/1", "", 0, out) ? 0 : polling->GetError(), 504);
  EXPECT_EQ(polling->Stop("alice/1", true) ? 0 : polling->GetError(), 504);
  tasks->busy = false;
  EXPECT_EQ(Status("alice/1"), 0);
}

TEST_F(PollingStatus, OfATaskThatRemovesItselfMeanwhileIs508) {
  Record("alice", "1", R"({"success":true})");
  RemoveMeanwhile("checkTaskExists", "1");
  EXPECT_EQ(Status("alice/1"), 508);
  EXPECT_EQ(SyslogCapture::Count("No such task id[alice/1]"), 1);
  EXPECT_TRUE(out.isNull());
}

TEST_F(PollingStatus, OfAListMapsATaskThatRemovesItselfMeanwhileToAnEmptyObject) {
  Record("alice", "1", R"({"success":true})");
  RemoveMeanwhile("checkTaskExists", "1");
  ASSERT_EQ(Status(Parse(R"(["alice/1"])")), 0);
  EXPECT_EQ(Text(out), R"({"alice/1":{}})");
}

TEST_F(PollingStatus, SplitsAtTheFirstSlash) {
  Record("alice", "a/b", R"({"success":true})");
  EXPECT_EQ(Status("alice/a/b"), 0);
}

TEST_F(PollingStatus, IsTheBodyAndTheTasksState) {
  Record("alice", "1", R"({"success":true,"data":{"done":3}})");
  ASSERT_EQ(Status("alice/1"), 0);
  EXPECT_EQ(Text(out), R"({"auto_remove":false,"data":{"done":3},"finish":false,)"
                       R"("info":{"api":"QELO.Test.Task"},"success":true})");
}

TEST_F(PollingStatus, OfAFailedTaskHasItsError) {
  Record("alice", "1", R"({"success":false,"error":{"code":400}})");
  ASSERT_EQ(Status("alice/1"), 0);
  EXPECT_EQ(out["error"]["code"], 400);
  EXPECT_EQ(out["success"], false);
}

TEST_F(PollingStatus, BeforeTheFirstResultHasNoBody) {
  tasks->Put("alice", "1", Parse(R"({"properties":{"auto_remove":true}})"));
  ASSERT_EQ(Status("alice/1"), 0);
  EXPECT_EQ(Text(out), R"({"auto_remove":true,"finish":false})");
}

TEST_F(PollingStatus, OfATaskWhoseProcessIsGoneIsFinished) {
  const pid_t gone = Fork([] {});
  EndOf(gone);
  Record("alice", "1", R"({"success":true})", gone);
  ASSERT_EQ(Status("alice/1"), 0);
  EXPECT_EQ(out["finish"], true);
}

TEST_F(PollingStatus, OfAListHasEachId) {
  Record("alice", "1", R"({"success":true,"data":1})");
  Record("@users", "2", R"({"success":true,"data":2})");
  ASSERT_EQ(Status(Parse(R"(["@users/2","alice/1"])")), 0);
  EXPECT_EQ(out.size(), 2U);
  EXPECT_EQ(out["alice/1"]["data"], 1);
  EXPECT_EQ(out["@users/2"]["data"], 2);
  EXPECT_EQ(out["@users/2"]["finish"], false);
}

TEST_F(PollingStatus, OfAListMapsForeignMalformedAndMissingIdsToEmptyObjects) {
  Record("alice", "1", R"({"success":true})");
  Record("bob", "1", R"({"success":true})");
  ASSERT_EQ(Status(Parse(R"(["alice/1","bob/1","alice","alice/none",{"a":1},7])")), 0);
  EXPECT_EQ(out["alice/1"]["success"], true);
  for (const char* id : {"bob/1", "alice", "alice/none", "", "7"}) {
    ASSERT_TRUE(out.isMember(id)) << id;
    EXPECT_EQ(Text(out[id]), "{}") << id;
  }
  EXPECT_EQ(SyslogCapture::Count("Invalid task id[bob/1]"), 1);
  EXPECT_EQ(SyslogCapture::Count("Invalid task id[alice]"), 1);
  EXPECT_EQ(SyslogCapture::Count("No such task"), 0);
}

TEST_F(PollingStatus, OfAnEmptyListIsAnEmptyObject) {
  out = "before";
  ASSERT_EQ(Status(Json::Value(Json::arrayValue)), 0);
  EXPECT_EQ(Text(out), "{}");
}

TEST_F(PollingStatus, OfNoListIs502) {
  EXPECT_EQ(Status(Json::Value("alice/1")), 502);
  EXPECT_EQ(Status(Json::Value()), 502);
  EXPECT_EQ(Status(Json::Value(Json::objectValue)), 502);
  EXPECT_EQ(SyslogCapture::Count("bad parameters"), 3);
}

}  // namespace
}  // namespace QELO
