#include "webapi/runner/UsageCounter.h"

#include <sys/wait.h>

#include <ctime>

#include "tests/unit/runner/RunnerFixture.h"

namespace QELO {
namespace {

class UsageCounting : public RunnerTest {
 protected:
  Json::Value Counters(const std::string& file) {
    Json::Value value;
    JsonHelper::fromFile((directory / "spool" / file).string(), value);
    return value;
  }
  UsageCounter counter{(std::filesystem::current_path() / "spool").string()};

  void SetUp() override {
    RunnerTest::SetUp();
    counter = UsageCounter((directory / "spool").string());
  }
};

TEST_F(UsageCounting, FirstCallMakesTheMemberAndTheSecondRaisesIt) {
  const time_t before = time(nullptr);
  EXPECT_TRUE(counter.Increase("QELO.A.B.C.D", "get", 2));
  const Json::Value first = Counters("QELO.A.B.C.json")["QELO.A.B.C.D_2_get"];
  EXPECT_EQ(first["count"], Json::Value(1));
  EXPECT_GE(first["ctime"].asInt64(), before);
  EXPECT_LE(first["ctime"].asInt64(), time(nullptr));
  EXPECT_TRUE(counter.Increase("QELO.A.B.C.D", "get", 2));
  const Json::Value second = Counters("QELO.A.B.C.json")["QELO.A.B.C.D_2_get"];
  EXPECT_EQ(second["count"], Json::Value(2));
  EXPECT_EQ(second["ctime"], first["ctime"]);
}

TEST_F(UsageCounting, FamilyIsTheFirstFourComponents) {
  counter.Increase("QELO.A.B.C.D", "x", 1);
  counter.Increase("QELO.A.B.C.E", "x", 1);
  EXPECT_EQ(Counters("QELO.A.B.C.json").size(), 2u);
  counter.Increase("QELO.A.B", "x", 1);
  EXPECT_EQ(Counters("QELO.A.B.json").size(), 1u);
  counter.Increase("Plain", "x", 1);
  EXPECT_EQ(Counters("Plain.json").size(), 1u);
}

TEST_F(UsageCounting, DirectoryIsMadeAndStampedOnce) {
  counter.Increase("QELO.A.B", "x", 1);
  counter.Increase("QELO.A.B", "x", 1);
  const std::string spool = (directory / "spool").string();
  const auto made = std::count(platform->calls.begin(), platform->calls.end(),
                               "QELOFSMkdirP(" + spool + ", 0, 0, -1, -1, 384)");
  const auto stamped = std::count(platform->calls.begin(), platform->calls.end(),
                                  "QLIBCFileTouch(" + spool + "/.timestamp)");
  EXPECT_EQ(made, 1);
  EXPECT_EQ(stamped, 1);
  EXPECT_TRUE(std::filesystem::exists(spool + "/.timestamp"));
}

TEST_F(UsageCounting, DirectoryThatCannotBeMadeIsTriedAgain) {
  platform->mkdirResult = -1;
  EXPECT_FALSE(counter.Increase("QELO.A.B", "x", 1));
  platform->mkdirResult = 0;
  EXPECT_TRUE(counter.Increase("QELO.A.B", "x", 1));
}

TEST_F(UsageCounting, LockIsAskedForTwoSecondsAndItsRefusalLosesTheCountSilently) {
  counter.Increase("QELO.A.B", "x", 1);
  EXPECT_EQ(std::count(platform->calls.begin(), platform->calls.end(),
                       "QLIBCFileLockTimeByFile(" + (directory / "spool").string() +
                           "/QELO.A.B.json.lock, 1, 2)"),
            1);
  platform->lockResult = -1;
  EXPECT_FALSE(counter.Increase("QELO.A.B", "x", 1));
  EXPECT_EQ(Counters("QELO.A.B.json")["QELO.A.B_1_x"]["count"], Json::Value(1));
  EXPECT_TRUE(SyslogCapture::Messages().empty());
}

TEST_F(UsageCounting, CorruptFileIsReplaced) {
  for (const char* text : {"[1, 2]", "{\"cut", ""}) {
    Write("spool/QELO.A.B.json", text);
    EXPECT_TRUE(counter.Increase("QELO.A.B", "x", 1));
    EXPECT_EQ(Counters("QELO.A.B.json").getMemberNames(), std::vector<std::string>{"QELO.A.B_1_x"});
  }
}

TEST_F(UsageCounting, CorruptMemberIsReplacedAndOthersAreKept) {
  Write("spool/QELO.A.B.json", R"({"QELO.A.B_1_x": [], "other": {"count": 9}})");
  EXPECT_TRUE(counter.Increase("QELO.A.B", "x", 1));
  EXPECT_EQ(Counters("QELO.A.B.json")["QELO.A.B_1_x"]["count"], Json::Value(1));
  EXPECT_EQ(Counters("QELO.A.B.json")["other"]["count"], Json::Value(9));
}

TEST_F(UsageCounting, CountsBeyond32Bits) {
  Write("spool/QELO.A.B.json", R"({"QELO.A.B_1_x": {"count": 4294967296, "ctime": 5}})");
  EXPECT_TRUE(counter.Increase("QELO.A.B", "x", 1));
  EXPECT_EQ(Counters("QELO.A.B.json")["QELO.A.B_1_x"]["count"].asInt64(), 4294967297);
}

TEST_F(UsageCounting, ManyProcessesLoseNoCount) {
  constexpr int kProcesses = 8;
  constexpr int kCounts = 50;
  for (int i = 0; i < kProcesses; ++i) {
    if (fork() == 0) {
      for (int n = 0; n < kCounts; ++n) {
        counter.Increase("QELO.A.B", "x", 1);
      }
      _exit(0);
    }
  }
  for (int i = 0; i < kProcesses; ++i) {
    wait(nullptr);
  }
  EXPECT_EQ(Counters("QELO.A.B.json")["QELO.A.B_1_x"]["count"], Json::Value(kProcesses * kCounts));
}

/// Whether the runner counts a call: only in a child, since the switch is read once a process.
class CountedCalls : public RunnerTest {
 protected:
  bool IsCounted(const std::string& attributes, const Json::Value& count = Json::Value(),
                 bool attribute = true) {
    std::filesystem::remove_all(Paths::kCounterDir);
    const pid_t child = fork();
    if (child == 0) {
      Json::Value description = Description("state", attributes);
      if (!count.isNull()) {
        description["count"] = count;
      }
      WriteDescription(description);
      MakeRequest("QELO.Test.Call", 1, "run");
      TestRunner tested;
      tested.Request()->SetAttr("_collector_count_webapi", attribute);
      tested.Process(request.get(), response.get());
      tested.Process(request.get(), response.get());
      const auto reads = std::count(
          platform->calls.begin(), platform->calls.end(),
          "QLIBCFileCheckKeyValue(" + std::string(Paths::kSystemInfo) + ", enable_data_collect)");
      _exit(reads <= 1 ? 0 : 1);
    }
    int status = -1;
    waitpid(child, &status, 0);
    EXPECT_EQ(status, 0);
    Json::Value counters;
    JsonHelper::fromFile(std::string(Paths::kCounterDir) + "/QELO.Test.Call.json", counters);
    const Json::Value& written = JsonHelper::member(counters, "QELO.Test.Call_1_run");
    EXPECT_TRUE(written.isNull() || written["count"] == Json::Value(2));
    return std::filesystem::exists(Paths::kCounterDir);
  }
};

TEST_F(CountedCalls, OnlyWhenCollectionIsEnabled) {
  EXPECT_FALSE(IsCounted("{}"));
  platform->settings["enable_data_collect"] = "no";
  EXPECT_FALSE(IsCounted("{}"));
  platform->settings["enable_data_collect"] = "yes";
  EXPECT_TRUE(IsCounted("{}"));
}

TEST_F(CountedCalls, NotForOtherRunnersTimeoutMethodsOrUncountedApis) {
  platform->settings["enable_data_collect"] = "yes";
  EXPECT_FALSE(IsCounted("{}", Json::Value(), false));
  EXPECT_FALSE(IsCounted(R"({"allowTimeout": true})"));
  EXPECT_FALSE(IsCounted("{}", false));
  EXPECT_TRUE(IsCounted("{}", true));
}

}  // namespace
}  // namespace QELO
