// The children of a compound request: lost, too many, with answers of all sizes, and what they do
// after their answer.

#include <sys/resource.h>

#include <algorithm>
#include <map>

#include "tests/unit/batch/compound/Fixture.h"

namespace QELO {
namespace {

/// What a child may come to and leave no answer.
constexpr const char* kLosses[] = {"killed",  "ended",  "hangsUp", "rubbish",
                                   "nothing", "scalar", "cut",     "aborted"};

Json::Value manyEntries(const Json::Value& entry, unsigned count) {
  Json::Value list(Json::arrayValue);
  for (unsigned i = 0; i < count; ++i) {
    list.append(entry);
    list[i]["index"] = i;
  }
  return list;
}

class CompoundChild : public CompoundTest {
 protected:
  static Json::Value Losing(const char* method) {
    return Entry(method, 1, "{}", "QELO.Test.Losing");
  }

  /// How many results there are of each code.
  static std::map<int, int> Codes(const Json::Value& result) {
    std::map<int, int> codes;
    for (const Json::Value& entry : result) {
      ++codes[Code(entry)];
    }
    return codes;
  }

  /// Loads description and library before the process gives up rights or descriptors.
  void Load() {
    Prepare(List({}));
    RunCompound(List({Entry("echo", 2), Entry("request", 1, "{}", "QELO.Entry.Request")}));
  }
};

TEST_F(CompoundChild, LostInParallelCostsItsOwnEntryAndShows117) {
  for (const char* loss : kLosses) {
    const int before = Logged("read compound json failed");
    const Json::Value result =
        RunCompound(List({Entry("echo"), Losing(loss), Entry("echo")}), kParallel);
    ASSERT_EQ(result.size(), 3u) << loss;
    EXPECT_EQ(Code(result[0]), 0) << loss;
    Json::Value lost = Parse(R"({"api": "QELO.Test.Losing", "version": 1, "success": false,
                                 "error": {"code": 117}})");
    lost["method"] = loss;
    EXPECT_EQ(result[1], lost) << loss;
    EXPECT_EQ(Code(result[2]), 0) << loss;
    EXPECT_TRUE(HasFail()) << loss;
    EXPECT_TRUE(succeeded) << loss;
    EXPECT_EQ(Logged("read compound json failed"), before + 1) << loss;
  }
}

TEST_F(CompoundChild, LostInSequenceCostsItsOwnEntryAndShowsNull) {
  for (const char* loss : kLosses) {
    const int before = Logged("read compound json failed");
    const Json::Value result = RunCompound(List({Entry("echo"), Losing(loss), Entry("echo")}));
    ASSERT_EQ(result.size(), 3u) << loss;
    EXPECT_EQ(Code(result[0]), 0) << loss;
    EXPECT_TRUE(result[1].isNull()) << loss;
    EXPECT_EQ(Code(result[2]), 0) << loss;
    EXPECT_TRUE(HasFail()) << loss;
    EXPECT_EQ(Logged("read compound json failed"), before + 1) << loss;
  }
}

TEST_F(CompoundChild, LostLastInSequenceShowsNull) {
  const Json::Value result = RunCompound(List({Entry("echo"), Losing("killed")}));
  ASSERT_EQ(result.size(), 2u);
  EXPECT_TRUE(result[1].isNull());
  EXPECT_TRUE(HasFail());
}

TEST_F(CompoundChild, LostStopsTheOthersWhenAsked) {
  const Json::Value result = RunCompound(List({Losing("killed"), Entry("echo", 2)}), kStop);
  EXPECT_TRUE(result[0].isNull());
  EXPECT_EQ(Code(result[1]), 112);
}

// Failures to make one

TEST_F(CompoundChild, FailedForkIs117) {
  platform->forkResult = -1;
  for (const char* more : {"{}", kParallel}) {
    SyslogCapture::Clear();
    const Json::Value result = RunCompound(List({Entry("echo"), Entry("echo")}), more);
    EXPECT_EQ(result[0], Parse(R"({"api": "QELO.Test.Entries", "version": 1, "method": "echo",
      "success": false, "error": {"code": 117}})"));
    EXPECT_EQ(Code(result[1]), 117);
    EXPECT_TRUE(HasFail());
    EXPECT_TRUE(succeeded);
    EXPECT_EQ(SyslogCapture::Count("CompoundHandler.cpp:"), more == kParallel ? 4 : 2);
    EXPECT_EQ(SyslogCapture::Count("fork Fail"), 2);
  }
}

TEST_F(CompoundChild, ForkThatStartsToFailGivesTheRest117) {
  platform->forksLeft = 3;
  const Json::Value result = RunCompound(manyEntries(Entry("echo"), 10), kParallel);
  for (unsigned i = 0; i < 10; ++i) {
    EXPECT_EQ(Code(result[i]), i < 3 ? 0 : 117) << i;
  }
  EXPECT_TRUE(HasFail());
}

TEST_F(CompoundChild, LimitOfProcessesGivesTheRest117) {
  if (geteuid() != 0) {
    GTEST_SKIP() << "needs root, to become a user without other processes";
  }
  Load();
  const int status = inChild([&] {
    ASSERT_TRUE(becomeOrdinary());
    const rlimit limit{6, 6};
    ASSERT_EQ(setrlimit(RLIMIT_NPROC, &limit), 0);
    const Json::Value entry = Entry("slow", 1, R"({"ms": 200})");
    std::map<int, int> codes = Codes(RunCompound(manyEntries(entry, 20), kParallel));
    EXPECT_EQ(codes[0], 5);  // the process itself counts
    EXPECT_EQ(codes[117], 15);
    EXPECT_TRUE(HasFail());
    EXPECT_GE(SyslogCapture::Count("fork Fail"), 15);
  });
  EXPECT_EQ(status, 0);
}

TEST_F(CompoundChild, LimitOfDescriptorsGivesTheRest117) {
  Load();
  const int status = inChild([&] {
    const rlimit limit{40, 40};
    ASSERT_EQ(setrlimit(RLIMIT_NOFILE, &limit), 0);
    const size_t before = openDescriptors().size();
    std::map<int, int> codes = Codes(RunCompound(manyEntries(Entry("echo"), 60), kParallel));
    EXPECT_GE(codes[0], 20);
    EXPECT_GE(codes[117], 20);
    EXPECT_EQ(codes[0] + codes[117], 60);
    EXPECT_GE(SyslogCapture::Count("Pipe init failed"), 20);
    EXPECT_EQ(SyslogCapture::Count("Pipe init failed"), SyslogCapture::Count("pipe init Fail"));
    EXPECT_EQ(openDescriptors().size(), before);
    EXPECT_EQ(Codes(RunCompound(List({Entry("echo"), Entry("echo")}), kParallel))[0], 2);
  });
  EXPECT_EQ(status, 0);
}

TEST_F(CompoundChild, FiveHundredInParallelAllAnswer) {
  platform->compoundEntriesAnonymous = 500;
  const Json::Value result = RunCompound(manyEntries(Entry("echo"), 500), kParallel);
  ASSERT_EQ(result.size(), 500u);
  for (unsigned i = 0; i < 500; ++i) {
    EXPECT_EQ(result[i]["data"]["index"].asUInt(), i);
  }
  EXPECT_FALSE(HasFail());
}

TEST_F(CompoundChild, NoDescriptorStaysOpenInTheParent) {
  Load();
  const size_t before = openDescriptors().size();
  for (const char* more : {"{}", kParallel}) {
    RunCompound(manyEntries(Entry("echo"), 5), more);
    RunCompound(List({Losing("killed"), Losing("rubbish"), Entry("upload")}), more);
    platform->forksLeft = 1;
    RunCompound(manyEntries(Entry("echo"), 3), more);
    platform->forksLeft = -1;
    EXPECT_EQ(openDescriptors().size(), before);
  }
}

TEST_F(CompoundChild, HoldsNoEndOfAnotherChildsPipe) {
  // Each child sees the descriptors there were before, its own pipe and nothing else.
  Load();
  struct Showing : TestRunner {
    bool NeedPermission(APIRequest* request) override {
      Json::Value params;
      params["postParam"]["count"] = static_cast<int>(openDescriptors().size());
      request->InitParam(params, false);
      return false;
    }
  };
  runner = std::make_unique<Showing>();
  const Json::Value result = RunCompound(manyEntries(Entry("echo"), 20), kParallel);
  for (unsigned i = 1; i < 20; ++i) {
    EXPECT_EQ(result[i]["data"]["count"], result[0]["data"]["count"]) << i;
  }
}

// Large answers

TEST_F(CompoundChild, FourMebibytesArriveWholeInBothModes) {
  if (geteuid() != 0) {
    GTEST_SKIP() << "an ordinary user's pipes are limited by the system";
  }
  for (const char* more : {"{}", kParallel}) {
    const Json::Value result = RunCompound(
        List({Entry("large", 1, R"({"size": 4194304})"), Entry("large", 2, R"({"size": 4194304})"),
              Entry("large", 1, R"({"size": 100000})")}),
        more);
    EXPECT_EQ(result[0]["data"].asString(), std::string(4194304, 'x'));
    EXPECT_EQ(result[1]["data"].asString(), std::string(4194304, 'x'));
    EXPECT_EQ(result[2]["data"].asString(), std::string(100000, 'x'));
    EXPECT_FALSE(HasFail());
  }
}

TEST_F(CompoundChild, OrdinaryUsersAnswerBeyondTheSystemsLimitIs117) {
  if (geteuid() == 0) {
    Load();
  }
  const int status = inChild([&] {
    ASSERT_TRUE(becomeOrdinary());
    long limit = 0;
    std::ifstream("/proc/sys/fs/pipe-max-size") >> limit;
    Json::Value beyond = Entry("large");
    beyond["size"] = Json::Int64(limit);
    Json::Value within = Entry("large");
    within["size"] = Json::Int64(limit * 3 / 4);
    for (const char* more : {"{}", kParallel}) {
      const double start = Seconds();
      const Json::Value result = RunCompound(List({beyond, within, Entry("echo")}), more);
      EXPECT_LT(Seconds() - start, 5);
      EXPECT_EQ(result[0], Parse(R"({"api": "QELO.Test.Entries", "version": 1, "method": "large",
        "success": false, "error": {"code": 117}})"));
      EXPECT_EQ(result[1]["data"].asString().size(), static_cast<size_t>(limit * 3 / 4));
      EXPECT_EQ(Code(result[2]), 0);
      EXPECT_TRUE(HasFail());
    }
    while (wait(nullptr) > 0) {
    }
    EXPECT_EQ(Logged("write json failed"), 2);
  });
  EXPECT_EQ(status, 0);
}

// Callbacks

class CompoundCallback : public CompoundChild {
 protected:
  Json::Value Later(int version) const {
    Json::Value entry = Entry("later", version);
    entry["file"] = trace_.string();
    return entry;
  }

  /// How many callbacks have run.
  int Ran() const {
    std::ifstream file(trace_);
    const std::string text(std::istreambuf_iterator<char>(file), {});
    return static_cast<int>(std::count(text.begin(), text.end(), '\n'));
  }

  bool RanWithin(double seconds, int count) const {
    const double end = Seconds() + seconds;
    while (Ran() < count && Seconds() < end) {
      usleep(10000);
    }
    return Ran() == count;
  }

 private:
  std::filesystem::path trace_ =
      std::filesystem::temp_directory_path() / ("callbacks." + std::to_string(getpid()));

 protected:
  void TearDown() override {
    std::filesystem::remove(trace_);
    CompoundChild::TearDown();
  }
};

TEST_F(CompoundCallback, OfAnEntryInProcessBecomesTheOuterOnes) {
  RunCompound(List({Later(2), Later(2), Entry("echo")}));
  EXPECT_EQ(response->GetCallbackFuncs()->size(), 1u);
  EXPECT_EQ(Ran(), 0);
}

TEST_F(CompoundCallback, OfAChildStaysTheChilds) {
  const int status = inChild([&] {
    RunCompound(List({Later(1)}));
    EXPECT_TRUE(response->GetCallbackFuncs()->empty());
    usleep(1500000);
    EXPECT_EQ(Ran(), 0);  // the parent still runs
  });
  EXPECT_EQ(status, 0);
  EXPECT_TRUE(RanWithin(10, 1));
}

TEST_F(CompoundCallback, OfAParallelChildRunsAfterTheParentsEnd) {
  const int status = inChild([&] {
    RunCompound(List({Later(1), Later(2), Entry("echo")}), kParallel);
    EXPECT_EQ(Codes(Data()["result"])[0], 3);
  });
  EXPECT_EQ(status, 0);
  EXPECT_EQ(Ran(), 0);
  EXPECT_TRUE(RanWithin(10, 2));
}

TEST_F(CompoundCallback, OfAnEntryInProcessIsNotRunByLaterChildrenToo) {
  const int status = inChild([&] {
    RunCompound(List({Later(2), Entry("echo"), Entry("echo")}));
    EXPECT_TRUE(runner->HandleCallback(response.get()));
  });
  EXPECT_EQ(status, 0);
  EXPECT_TRUE(RanWithin(10, 1));
  usleep(500000);
  EXPECT_EQ(Ran(), 1);
}

TEST_F(CompoundCallback, OfAChildThatGaveUpRootStillWaitsForTheParent) {
  if (geteuid() != 0) {
    GTEST_SKIP() << "needs root";
  }
  struct GivingUp : TestRunner {
    bool NeedPermission(APIRequest*) override { return !becomeOrdinary(); }
  };
  runner = std::make_unique<GivingUp>();
  const int status = inChild([&] {
    RunCompound(List({Later(1)}));
    EXPECT_EQ(Codes(Data()["result"])[0], 1);
    usleep(1500000);
    EXPECT_EQ(Ran(), 0);
  });
  EXPECT_EQ(status, 0);
  EXPECT_TRUE(RanWithin(10, 1));
}

TEST_F(CompoundCallback, OfAChildDoesNotHoldTheStandardDescriptors) {
  // Whoever reads our output sees its end with the parent's, not with the callback's.
  Json::Value entry = Later(1);
  entry["ms"] = 3000;
  for (const char* more : {"{}", kParallel}) {
    int ends[2];
    ASSERT_EQ(pipe(ends), 0);
    fflush(nullptr);
    const pid_t child = fork();
    if (child == 0) {
      for (int fd = 0; fd < 3; ++fd) {
        dup2(ends[1], fd);
      }
      close(ends[0]);
      close(ends[1]);
      RunCompound(List({entry}), more);
      _exit(0);
    }
    close(ends[1]);
    waitForEnd(child);
    const double ended = Seconds();
    char buffer[64];
    while (read(ends[0], buffer, sizeof buffer) > 0) {
    }
    EXPECT_LT(Seconds() - ended, 0.1);
    close(ends[0]);
  }
  EXPECT_TRUE(RanWithin(15, 2));
}

}  // namespace
}  // namespace QELO
