#include "webapi/runner/counter/UsageCounter.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/syscall.h>
#include <sys/wait.h>

#include <csignal>
#include <ctime>

#include "tests/unit/runner/RunnerFixture.h"

namespace {
bool dieBeforeRename = false;
}  // namespace

// Takes the place of the C library's for the whole test program.
extern "C" __attribute__((visibility("default"))) int renameat(int fromDirectory, const char* from,
                                                               int toDirectory,
                                                               const char* to) noexcept {
  if (dieBeforeRename) {
    raise(SIGKILL);
  }
  return static_cast<int>(syscall(SYS_renameat, fromDirectory, from, toDirectory, to));
}

namespace QELO {
namespace {

class UsageCounting : public RunnerTest {
 protected:
  /// Whether another process could have the lock of the file at once.
  bool IsUnlocked(const std::string& file) {
    const int fd = open((directory / "spool" / (file + ".lock")).c_str(), O_RDWR | O_CLOEXEC);
    const bool unlocked = fd >= 0 && flock(fd, LOCK_EX | LOCK_NB) == 0;
    close(fd);
    return unlocked;
  }
  /// Names in the directory, sorted, without the marker.
  std::vector<std::string> Files() {
    std::vector<std::string> names;
    for (const auto& entry : std::filesystem::directory_iterator(directory / "spool")) {
      if (entry.path().filename() != ".timestamp") {
        names.push_back(entry.path().filename());
      }
    }
    std::sort(names.begin(), names.end());
    return names;
  }
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

TEST_F(UsageCounting, LockIsGivenBackAtOnce) {
  EXPECT_TRUE(counter.Increase("QELO.A.B", "x", 1));
  EXPECT_EQ(platform->calls.back(), "QLIBCFileUnlockByFile()");
  EXPECT_TRUE(IsUnlocked("QELO.A.B.json"));
}

TEST_F(UsageCounting, LockIsGivenBackAfterAFailedWriteWhichLeavesNothing) {
  std::filesystem::create_directories(directory / "spool" / "QELO.A.B.json" / "in the way");
  EXPECT_FALSE(counter.Increase("QELO.A.B", "x", 1));
  EXPECT_TRUE(IsUnlocked("QELO.A.B.json"));
  EXPECT_EQ(Files(), (std::vector<std::string>{"QELO.A.B.json", "QELO.A.B.json.lock"}));
}

TEST_F(UsageCounting, KilledWritersLeaveOneFileThatTheNextReplaces) {
  EXPECT_TRUE(counter.Increase("QELO.A.B", "x", 1));
  for (int i = 0; i < 3; ++i) {
    const pid_t child = fork();
    if (child == 0) {
      dieBeforeRename = true;
      counter.Increase("QELO.A.B", "x", 1);
      _exit(0);
    }
    int status = 0;
    ASSERT_EQ(waitpid(child, &status, 0), child);
    EXPECT_TRUE(WIFSIGNALED(status));
  }
  EXPECT_EQ(Files(),
            (std::vector<std::string>{"QELO.A.B.json", "QELO.A.B.json.lock", "QELO.A.B.json.new"}));
  EXPECT_TRUE(counter.Increase("QELO.A.B", "x", 1));
  EXPECT_EQ(Files(), (std::vector<std::string>{"QELO.A.B.json", "QELO.A.B.json.lock"}));
  EXPECT_EQ(Counters("QELO.A.B.json")["QELO.A.B_1_x"]["count"], Json::Value(2));
}

TEST_F(UsageCounting, LinkInThePlaceOfTheNewFileIsReplacedAndNotFollowed) {
  Write("victim", "untouched");
  std::filesystem::create_directory("spool");
  for (const char* target : {"../victim", "../dangling"}) {
    std::filesystem::create_symlink(target, "spool/QELO.A.B.json.new");
    EXPECT_TRUE(counter.Increase("QELO.A.B", "x", 1));
    EXPECT_EQ(Files(), (std::vector<std::string>{"QELO.A.B.json", "QELO.A.B.json.lock"}));
    EXPECT_TRUE(
        std::filesystem::is_regular_file(std::filesystem::symlink_status("spool/QELO.A.B.json")));
  }
  std::ifstream victim("victim");
  EXPECT_EQ(std::string(std::istreambuf_iterator<char>(victim), {}), "untouched");
  EXPECT_FALSE(std::filesystem::exists("dangling"));
}

TEST_F(UsageCounting, FileKeepsItsPermissions) {
  using std::filesystem::perms;
  EXPECT_TRUE(counter.Increase("QELO.A.B", "x", 1));
  const std::filesystem::path file = directory / "spool" / "QELO.A.B.json";
  EXPECT_EQ(std::filesystem::status(file).permissions(), perms::owner_read | perms::owner_write);
  const perms opened = perms::owner_read | perms::owner_write | perms::group_read;
  std::filesystem::permissions(file, opened);
  EXPECT_TRUE(counter.Increase("QELO.A.B", "x", 1));
  EXPECT_EQ(std::filesystem::status(file).permissions(), opened);
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
      _exit(static_cast<int>(reads));
    }
    int status = -1;
    waitpid(child, &status, 0);
    EXPECT_TRUE(WIFEXITED(status));
    reads_ = WEXITSTATUS(status);
    Json::Value counters;
    JsonHelper::fromFile(std::string(Paths::kCounterDir) + "/QELO.Test.Call.json", counters);
    const Json::Value& written = JsonHelper::member(counters, "QELO.Test.Call_1_run");
    EXPECT_TRUE(written.isNull() || written["count"] == Json::Value(2));
    return std::filesystem::exists(Paths::kCounterDir);
  }

  int reads_ = 0;  ///< of the switch, during the two calls
};

TEST_F(CountedCalls, InAProcessThatLivesOn_GoOnThoughTheDirectoryIsRemoved) {
  platform->settings["enable_data_collect"] = "yes";
  MakeRequest("QELO.Test.Call", 1, "run");
  for (int i = 0; i < 2; ++i) {
    std::filesystem::remove_all(Paths::kCounterDir);
    UsageCounter::CountInResident(*request);
    EXPECT_TRUE(std::filesystem::exists(std::string(Paths::kCounterDir) + "/QELO.Test.Call.json"))
        << i;
  }
}

TEST_F(CountedCalls, OnlyWhenCollectionIsEnabled) {
  EXPECT_FALSE(IsCounted("{}"));
  EXPECT_EQ(reads_, 1);
  platform->settings["enable_data_collect"] = "no";
  EXPECT_FALSE(IsCounted("{}"));
  EXPECT_EQ(reads_, 1);
  platform->settings["enable_data_collect"] = "yes";
  EXPECT_TRUE(IsCounted("{}"));
  EXPECT_EQ(reads_, 1);
}

TEST_F(CountedCalls, NotForOtherRunnersTimeoutMethodsOrUncountedApis) {
  platform->settings["enable_data_collect"] = "yes";
  EXPECT_FALSE(IsCounted("{}", Json::Value(), false));
  EXPECT_EQ(reads_, 0);
  EXPECT_FALSE(IsCounted(R"({"allowTimeout": true})"));
  EXPECT_EQ(reads_, 0);
  EXPECT_FALSE(IsCounted("{}", false));
  EXPECT_EQ(reads_, 0);
  EXPECT_TRUE(IsCounted("{}", true));
  EXPECT_EQ(reads_, 1);
}

TEST_F(CountedCalls, BeforeTheUploadIsTakenAndAfterThePermission) {
  platform->settings["enable_data_collect"] = "yes";
  for (const bool permission : {true, false}) {
    std::filesystem::remove_all(Paths::kCounterDir);
    const pid_t child = fork();
    if (child == 0) {
      WriteDescription(Description("state", R"({"allowUpload": true})"));
      MakeRequest("QELO.Test.Call", 1, "run");
      request->InitEnv(Parse(R"({"CONTENT_TYPE": "multipart/form-data"})"));
      TestRunner tested;
      tested.Request()->SetAttr("_collector_count_webapi", true);
      tested.need = true;
      tested.permission = permission;
      tested.upload = false;
      const bool called = tested.Process(request.get(), response.get());
      const std::string asked = permission ? "need check upload " : "need check skip ";
      _exit(!called && tested.asked == asked ? 0 : 1);
    }
    int status = -1;
    waitpid(child, &status, 0);
    EXPECT_EQ(status, 0);
    EXPECT_EQ(std::filesystem::exists(std::string(Paths::kCounterDir) + "/QELO.Test.Call.json"),
              permission);
  }
}

}  // namespace
}  // namespace QELO
