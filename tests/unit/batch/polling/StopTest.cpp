#include <linux/filter.h>
#include <linux/seccomp.h>
#include <sys/prctl.h>
#include <sys/syscall.h>

#include <cstddef>
#include <filesystem>
#include <iterator>

#include "tests/unit/batch/polling/Fixture.h"

namespace QELO {
namespace {

class PollingStop : public PollingTest {
 protected:
  /// @return the error, 0 for success
  int Stop(const std::string& id, bool remove = false) {
    return polling->Stop(id, remove) ? 0 : polling->GetError();
  }
};

TEST_F(PollingStop, WithoutRequestIs502) {
  polling->SetRequest(nullptr);
  EXPECT_EQ(Stop("alice/1"), 502);
  EXPECT_EQ(SyslogCapture::Count("unknown request"), 1);
}

TEST_F(PollingStop, OfIdWithoutSlashIs502) {
  EXPECT_EQ(Stop("alice"), 502);
  EXPECT_EQ(Stop(""), 502);
  EXPECT_EQ(SyslogCapture::Count("Invalid task id[alice]"), 1);
}

TEST_F(PollingStop, OfAnotherUsersTaskIs503AndLeavesItRunning) {
  const pid_t worker = Sleeper();
  Record("bob", "1", R"({"success":true})", worker);
  EXPECT_EQ(Stop("bob/1", true), 503);
  EXPECT_EQ(waitpid(worker, nullptr, WNOHANG), 0);
  EXPECT_FALSE(tasks->Record("bob", "1").isMember("finished"));
}

TEST_F(PollingStop, OfTheAdministratorsTaskIs503ForOthers) {
  Record("@administrators", "1", R"({"success":true})");
  EXPECT_EQ(Stop("@administrators/1"), 503);
}

TEST_F(PollingStop, OfMissingTaskIs508) {
  EXPECT_EQ(Stop("alice/none"), 508);
  EXPECT_EQ(SyslogCapture::Count("No such task id[alice/none]"), 1);
}

TEST_F(PollingStop, EndsTheProcessAndTheTask) {
  const pid_t worker = Sleeper();
  Record("alice", "1", R"({"success":true,"data":3})", worker);
  EXPECT_EQ(Stop("alice/1"), 0);
  EXPECT_EQ(EndOf(worker), SIGTERM);
  const Json::Value record = tasks->Record("alice", "1");
  EXPECT_EQ(record["finished"], true);
  EXPECT_EQ(record["properties"]["body"]["data"], 3);
}

TEST_F(PollingStop, WithRemoveRemovesTheRecord) {
  const pid_t worker = Sleeper();
  Record("alice", "1", R"({"success":true})", worker);
  EXPECT_EQ(Stop("alice/1", true), 0);
  EXPECT_EQ(EndOf(worker), SIGTERM);
  EXPECT_TRUE(tasks->Record("alice", "1").isNull());
}

TEST_F(PollingStop, OfATaskWhoseProcessIsGoneStillFinishesIt) {
  const pid_t gone = Fork([] {});
  EndOf(gone);
  Record("alice", "1", R"({"success":true})", gone);
  EXPECT_EQ(Stop("alice/1"), 0);
  EXPECT_EQ(tasks->Record("alice", "1")["finished"], true);
}

TEST_F(PollingStop, OfATaskWithoutProcessFinishesIt) {
  Record("alice", "1", R"({"success":true})");
  EXPECT_EQ(Stop("alice/1"), 0);
  EXPECT_EQ(tasks->Record("alice", "1")["finished"], true);
  EXPECT_EQ(SyslogCapture::Count("invalid process id"), 0);
}

TEST_F(PollingStop, OfEverybodysTaskIsGrantedToAnyUser) {
  Record("@users", "1", R"({"success":true})");
  EXPECT_EQ(Stop("@users/1"), 0);
}

TEST_F(PollingStop, ThatCannotSignalIs506AndChangesNothing) {
  // To an ordinary user the first process is such a one.
  const bool isRoot = geteuid() == 0;
  const pid_t worker = isRoot ? Sleeper() : 1;
  Record("alice", "1", R"({"success":true})", worker);
  const std::filesystem::path records(tasks->directory);
  for (const auto& path : {records.parent_path(), records, records / "alice%2F1"}) {
    std::filesystem::permissions(path, std::filesystem::perms::all);
  }
  ASSERT_TRUE(!isRoot || setresuid(65534, 65534, 0) == 0);
  ASSERT_NE(geteuid(), 0U);
  const int result = Stop("alice/1");
  ASSERT_TRUE(!isRoot || setresuid(0, 0, 0) == 0);
  EXPECT_EQ(result, 506);
  EXPECT_EQ(SyslogCapture::Count("send SIGTERM to task id[alice/1] fail"), 1);
  EXPECT_EQ(SyslogCapture::Count("Failed to kill " + std::to_string(worker) +
                                 ", reason=Operation not permitted(1)"),
            1);
  EXPECT_FALSE(tasks->Record("alice", "1").isMember("finished"));
}

TEST_F(PollingStop, ThatCannotStoreTheEndIs501) {
  Record("alice", "1", R"({"success":true})");
  tasks->finish = false;
  EXPECT_EQ(Stop("alice/1"), 501);
  EXPECT_EQ(SyslogCapture::Count("set task id[alice/1] to finish fail"), 1);
}

TEST_F(PollingStop, KillOfAProcessIdBelowOneIsRefused) {
  const APIPollingPrivate own(request.get(), nullptr);
  EXPECT_FALSE(own.DoKill(0));
  EXPECT_FALSE(own.DoKill(-1)) << "that would be every process";
  EXPECT_EQ(SyslogCapture::Count("invalid process id"), 2);
}

TEST_F(PollingStop, OfATaskThatRemovesItselfMeanwhileIs508) {
  Record("alice", "1", R"({"success":true})");
  RemoveMeanwhile("checkTaskExists", "1");
  EXPECT_EQ(Stop("alice/1"), 508);
  EXPECT_EQ(SyslogCapture::Count("No such task id[alice/1]"), 1);
}

TEST_F(PollingStop, OfATaskWhoseProcessIsGoneButStillToldFinishesIt) {
  const pid_t gone = Fork([] {});
  EndOf(gone);
  Record("alice", "1", R"({"success":true})", gone);
  tasks->tellDead = true;
  EXPECT_EQ(Stop("alice/1"), 0);
  EXPECT_EQ(tasks->Record("alice", "1")["finished"], true);
  EXPECT_TRUE(SyslogCapture::Messages().empty());
}

TEST_F(PollingStop, OfATaskWhoseProcessRecordsItselfMeanwhileEndsThat) {
  for (const bool remove : {false, true}) {
    const pid_t worker = Sleeper();
    Record("alice", "1", R"({"success":true})");
    Meanwhile("getCreatePid", [=, this] { Record("alice", "1", R"({"success":true})", worker); });
    EXPECT_EQ(Stop("alice/1", remove), 0);
    EXPECT_EQ(EndOf(worker), SIGTERM);
    const Json::Value record = tasks->Record("alice", "1");
    EXPECT_TRUE(remove ? record.isNull() : record["finished"] == true) << record;
  }
}

TEST_F(PollingStop, LooksWhetherItIsTheTasksProcessOnceMoreWhenItHoldsIt) {
  const pid_t worker = Sleeper();
  Record("alice", "1", R"({"success":true})", worker);
  int looks = 0;
  tasks->meanwhile = [&](const std::string& operation) { looks += operation == "getCreatePid"; };
  EXPECT_EQ(Stop("alice/1"), 0);
  EXPECT_GE(looks, 2);
  EXPECT_EQ(EndOf(worker), SIGTERM);
}

TEST_F(PollingStop, KillOfANumberThatIsAnothersByNowSignalsNobody) {
  const pid_t worker = Sleeper();
  EXPECT_TRUE(APIPollingPrivate(request.get(), nullptr).DoKill(worker, [] { return false; }));
  usleep(50000);
  EXPECT_EQ(waitpid(worker, nullptr, WNOHANG), 0);
}

TEST_F(PollingStop, KillOfAProcessThatEndsWhenItIsHeldSucceeds) {
  const pid_t worker = Sleeper();
  EXPECT_TRUE(APIPollingPrivate(request.get(), nullptr).DoKill(worker, [worker] {
    kill(worker, SIGKILL);
    return EndOf(worker) == SIGKILL;
  }));
  EXPECT_TRUE(SyslogCapture::Messages().empty());
}

/// Makes the system call an unknown one for this process and its children, for good.
bool forget(unsigned call) {
  sock_filter program[] = {
      BPF_STMT(BPF_LD | BPF_W | BPF_ABS, offsetof(seccomp_data, nr)),
      BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, call, 0, 1),
      BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ERRNO | ENOSYS),
      BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ALLOW),
  };
  const sock_fprog filter{std::size(program), program};
  return prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) == 0 &&
         prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, &filter) == 0;
}

TEST_F(PollingStop, KillWorksOnAKernelThatHoldsNoProcesses) {
  for (const unsigned call : {SYS_pidfd_open, SYS_pidfd_send_signal}) {
    const pid_t worker = Sleeper();
    const pid_t killer = Fork([&] {
      const APIPollingPrivate own(request.get(), nullptr);
      _exit(forget(call) && own.DoKill(worker) && SyslogCapture::Messages().empty() ? 0 : 1);
    });
    int status = -1;
    EXPECT_EQ(waitpid(killer, &status, 0), killer);
    EXPECT_EQ(status, 0) << call;
    EXPECT_EQ(EndOf(worker), SIGTERM);
  }
}

TEST_F(PollingStop, KillOfAProcessThatIsGoneSucceeds) {
  const pid_t gone = Fork([] {});
  EndOf(gone);
  EXPECT_TRUE(APIPollingPrivate(request.get(), nullptr).DoKill(gone));
  EXPECT_TRUE(SyslogCapture::Messages().empty());
}

}  // namespace
}  // namespace QELO
