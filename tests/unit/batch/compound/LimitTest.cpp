// How much one compound request may make the host do.

#include <fcntl.h>
#include <signal.h>

#include "tests/unit/batch/compound/Fixture.h"

namespace QELO {
namespace {

constexpr char kOuter[] = "QELO.Entry.Request";

class CompoundLimit : public CompoundTest {
 protected:
  void SetUp() override {
    CompoundTest::SetUp();
    platform->compoundEntries = 6;
    platform->compoundEntriesAnonymous = 3;
  }

  static Json::Value Entries(unsigned count, const Json::Value& entry = Entry("echo", 2)) {
    Json::Value list(Json::arrayValue);
    for (unsigned i = 0; i < count; ++i) {
      list.append(entry);
    }
    return list;
  }

  static Json::Value Nested(const Json::Value& compound) {
    Json::Value entry = Entry("request", 1, "{}", kOuter);
    entry["compound"] = compound;
    return entry;
  }

  void Login() {
    Json::Value session;
    session["username"] = "alice";
    session["isAuthorized"] = true;
    request->InitSession(session);
  }

  /// Runs as somebody who is logged in, or as nobody.
  Json::Value Run(const Json::Value& compound, bool isLoggedIn, const char* more = "{}") {
    Prepare(compound, more);
    if (isLoggedIn) {
      Login();
    }
    succeeded = CompoundHandler(request.get(), response.get(), runner.get()).Process();
    return Data()["result"];
  }

  void ExpectRefused() {
    EXPECT_FALSE(succeeded);
    EXPECT_EQ(response->GetError(), 110);
    EXPECT_EQ(response->GetBody()["error"]["errors"], "too many compound entries.");
    EXPECT_EQ(Logged("too many compound entries"), 1);
    ftruncate(SyslogCapture::Copy(), 0);
  }
};

TEST_F(CompoundLimit, HoldsForEveryLevelTogetherBeforeAnythingRuns) {
  const Json::Value wide = Entries(7);
  const Json::Value deep = List({Nested(List({Nested(List({Nested(Entries(4))}))}))});
  const Json::Value spread = List({Nested(Entries(2)), Nested(Entries(3))});
  platform->forksLeft = 0;
  for (const char* more : {"{}", kParallel}) {
    for (const Json::Value& compound : {wide, deep, spread}) {
      Run(compound, true, more);
      ExpectRefused();
    }
  }
  EXPECT_EQ(Logged("fork Fail"), 0);
}

TEST_F(CompoundLimit, IsReachedByAsManyAsItSays) {
  for (const char* more : {"{}", kParallel}) {
    for (const Json::Value& compound :
         {Entries(6), List({Nested(List({Nested(List({Nested(Entries(3))}))}))}),
          List({Nested(Entries(2)), Nested(Entries(2))})}) {
      const Json::Value result = Run(compound, true, more);
      EXPECT_TRUE(succeeded);
      EXPECT_FALSE(HasFail());
      EXPECT_EQ(result.size(), compound.size());
    }
  }
}

TEST_F(CompoundLimit, IsLowerForWhoIsNotLoggedIn) {
  EXPECT_EQ(Run(Entries(3), false).size(), 3u);
  Run(Entries(4), false);
  ExpectRefused();
  Run(List({Nested(Entries(3))}), false, kParallel);
  ExpectRefused();
}

TEST_F(CompoundLimit, CountsListsOfEntriesThatNameNoCompoundRequest) {
  Json::Value entry = Entry("echo", 2);
  entry["compound"] = Entries(6);
  Run(List({entry}), true);
  ExpectRefused();
}

TEST_F(CompoundLimit, OfAnInnerRequestIsWhatWasCounted) {
  // As when the list could not be seen before: the runner hands an entry's request on.
  Prepare(Entries(1));
  request->Serialize()["private"]["compoundEntries"] = 0;
  Login();
  succeeded = CompoundHandler(request.get(), response.get(), runner.get()).Process();
  ExpectRefused();
}

// A client who has gone

class CompoundClient : public CompoundTest {
 protected:
  /// Runs with a standard output whose reader has gone, or whose end somebody keeps.
  int RunIntoPipe(bool hasReader, bool isAnswer, unsigned expected) {
    return inChild([&] {
      int ends[2];
      ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
      const int former = dup(STDOUT_FILENO);
      dup2(ends[1], STDOUT_FILENO);
      close(ends[1]);
      if (!hasReader) {
        close(ends[0]);
      }
      Prepare(List({Entry("echo", 2), Entry("echo"), Entry("echo", 2)}));
      request->SetAttr("_answers_on_output", isAnswer);
      CompoundHandler(request.get(), response.get(), runner.get()).Process();
      dup2(former, STDOUT_FILENO);
      EXPECT_EQ(Data()["result"].size(), expected);
      EXPECT_EQ(HasFail(), expected == 0);
    });
  }
};

TEST_F(CompoundClient, WhoHasGoneGetsNoFurtherEntries) {
  EXPECT_EQ(RunIntoPipe(false, true, 0), 0);
  EXPECT_EQ(Logged("nobody reads the answer, 3 entries are left out"), 1);
}

TEST_F(CompoundClient, WhoIsThereGetsAll) {
  EXPECT_EQ(RunIntoPipe(true, true, 3), 0);
  EXPECT_EQ(Logged("nobody reads"), 0);
}

TEST_F(CompoundClient, OfACallFromCodeDoesNotReadTheOutput) {
  EXPECT_EQ(RunIntoPipe(false, false, 3), 0);
}

TEST_F(CompoundClient, OfAParentWhoHasGoneGetsNoFurtherEntriesEither) {
  const Json::Value slow = Entry("slow", 2, R"({"ms": 100})");
  Json::Value inner = Entry("request", 1, "{}", "QELO.Entry.Request");
  for (unsigned i = 0; i < 100; ++i) {
    inner["compound"].append(slow);
  }
  const pid_t parent = fork();
  if (parent == 0) {
    RunCompound(List({inner}));
    _exit(0);
  }
  usleep(300'000);
  EXPECT_EQ(kill(parent, SIGKILL), 0);
  for (int i = 0; i < 300 && Logged("nobody reads the answer") == 0; ++i) {
    usleep(10'000);
  }
  EXPECT_EQ(Logged("nobody reads the answer"), 1);
}

// What a child has of the processes above its parent

class CompoundLevels : public CompoundTest {
 protected:
  static Json::Value Nested(const Json::Value& entry) {
    Json::Value outer = Entry("request", 1, "{}", kOuter);
    outer["compound"] = List({entry});
    return outer;
  }

  /// The answer of a nested request's only entry.
  static Json::Value InnerOf(const Json::Value& result) { return result["data"]["result"][0]; }
};

TEST_F(CompoundLevels, ChildrenHoldNoPipeOfTheLevelsAbove) {
  for (const char* more : {"{}", kParallel}) {
    const Json::Value plain = Entry("descriptors");
    const Json::Value result =
        RunCompound(List({plain, Nested(plain), Nested(Nested(plain))}), more);
    const int count = result[0]["data"].asInt();
    EXPECT_GT(count, 0);
    EXPECT_EQ(InnerOf(result[1])["data"], count);
    EXPECT_EQ(InnerOf(InnerOf(result[2]))["data"], count);
  }
}

TEST_F(CompoundLevels, ChildThatLivesOnDoesNotHoldUpTheLevelsAbove) {
  Json::Value orphan = Entry("orphaned", 1, R"({"ms": 4000})", "QELO.Test.Losing");
  const double start = Seconds();
  const Json::Value result = RunCompound(List({Nested(orphan), Entry("echo", 2)}));
  EXPECT_LT(Seconds() - start, 3);
  EXPECT_TRUE(result[0].isNull());
  EXPECT_EQ(Code(result[1]), 0);
}

}  // namespace
}  // namespace QELO
