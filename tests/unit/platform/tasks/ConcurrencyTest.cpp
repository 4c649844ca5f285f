#include <fcntl.h>
#include <signal.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <filesystem>
#include <functional>
#include <thread>
#include <vector>

#include "tests/support/Sanitizer.h"
#include "tests/support/SyslogCapture.h"
#include "tests/unit/platform/tasks/Fixture.h"
#include "webapi/JsonHelper.h"

namespace fs = std::filesystem;
using namespace QELO;
using ARDO::Task;
using ARDO::TaskMgr;
using ARDO::TaskUtil;

namespace {

class TaskConcurrency : public TaskTest {
 protected:
  static constexpr int kUpdates = 50;

  /// Starts a child that is the user; it ends with the body's result.
  static pid_t Start(uid_t user, const std::function<int()>& body) {
    const pid_t child = fork();
    if (child == 0) {
      _exit(user == geteuid() || setresuid(user, user, user) == 0 ? body() : 99);
    }
    return child;
  }

  static int StatusOf(pid_t child) {
    int status = 0;
    return waitpid(child, &status, 0) == child && WIFEXITED(status) ? WEXITSTATUS(status) : -1;
  }

  /// One update of two properties that always agree.
  static bool UpdateBoth(Task& task, int n) {
    task.beginUpdate();
    return task.setProperty("first", n) && task.setProperty("second", std::to_string(n)) &&
           task.endUpdate();
  }

  /// What both hold; -1 when there are none, -2 when they differ.
  static int BothOf(const Task& task) {
    const int first = JsonHelper::asInt(task.getProperty("first"), -1);
    const int second = JsonHelper::asInt(task.getProperty("second"), -1);
    return first == second ? first : -2;
  }

  static void ExpectWhole(uid_t user) { EXPECT_EQ(Sql(user, "PRAGMA integrity_check"), "ok"); }
};

TEST_F(TaskConcurrency, TwoHundredTasksOfFourUsersUpdateFiftyTimesEach) {
  constexpr int kTasks = 200;
  const std::vector<uid_t> users = IsRoot() ? std::vector<uid_t>{kSystem, kAdmin, kAlice, kBob}
                                            : std::vector<uid_t>(4, geteuid());
  std::vector<pid_t> children;
  for (int i = 0; i < kTasks; ++i) {
    const uid_t user = users[static_cast<size_t>(i) % users.size()];
    const std::string owner = "owner" + std::to_string(static_cast<size_t>(i) % users.size());
    children.push_back(Start(user, [&] {
      Task task(owner, NewId());
      for (int n = 1; n <= kUpdates; ++n) {
        if (!UpdateBoth(task, n) || BothOf(task) != n) {
          return 1;
        }
      }
      return task.finish(false) ? 0 : 2;
    }));
  }
  for (const pid_t child : children) {
    EXPECT_EQ(StatusOf(child), 0);
  }
  for (size_t i = 0; i < users.size(); ++i) {
    const std::string owner = "owner" + std::to_string(i);
    EXPECT_EQ(As(users[i],
                 [&] {
                   const Json::Value ids = TaskMgr(owner).getAllTaskId(nullptr);
                   for (const Json::Value& id : ids) {
                     const Task task(owner, id.asString());
                     if (BothOf(task) != kUpdates || !task.isFinished()) {
                       return 1;
                     }
                   }
                   return static_cast<int>(ids.size());
                 }),
              50);
    ExpectWhole(users[i]);
  }
}

TEST_F(TaskConcurrency, ReadersNeverSeeHalfAnUpdate) {
  const std::string id = NewTask("alice");
  const pid_t writer = Start(geteuid(), [&] {
    Task task("alice", id);
    for (int n = 0; n < 500; ++n) {
      if (!UpdateBoth(task, n)) {
        return 1;
      }
    }
    return task.finish(false) ? 0 : 2;
  });
  std::vector<pid_t> readers;
  for (int i = 0; i < 4; ++i) {
    readers.push_back(Start(geteuid(), [&] {
      Task task("alice", id);
      int last = -1;
      do {
        if (!task.reload()) {
          return 1;
        }
        const int both = BothOf(task);
        if (both < last) {
          return 2;  // half an update, or an old state
        }
        last = both;
      } while (!task.isFinished());
      return last == 499 ? 0 : 3;
    }));
  }
  EXPECT_EQ(StatusOf(writer), 0);
  for (const pid_t reader : readers) {
    EXPECT_EQ(StatusOf(reader), 0);
  }
}

TEST_F(TaskConcurrency, StoreIsMadeOnceByManyWhoNeedItFirst) {
  std::vector<pid_t> children;
  for (int i = 0; i < 24; ++i) {
    children.push_back(Start(geteuid(), [] { return NewTask("alice").empty() ? 1 : 0; }));
  }
  for (const pid_t child : children) {
    EXPECT_EQ(StatusOf(child), 0);
  }
  EXPECT_EQ(TaskMgr("alice").getAllTaskId(nullptr).size(), 24U);
  for (const auto& entry : fs::directory_iterator(Store(geteuid()))) {
    EXPECT_EQ(entry.path().filename().string().rfind("tasks.db", 0), 0U) << entry;
  }
}

TEST_F(TaskConcurrency, KillAtAnyMomentLeavesRecordsReadableAndRight) {
  const std::string id = NewTask("alice");
  for (int i = 0; i < 60; ++i) {
    int reports[2];
    ASSERT_EQ(pipe2(reports, O_CLOEXEC), 0);
    const pid_t writer = Start(geteuid(), [&] {
      Task task("alice", id);
      task.setCreatePid(getpid());
      for (int n = 1;; ++n) {
        UpdateBoth(task, n);
        if (write(reports[1], &n, sizeof n) < 0) {
          return 1;
        }
        Task passing("alice", NewId("passing_"));
        UpdateBoth(passing, n);
        passing.finish(true);
      }
    });
    close(reports[1]);
    int stored = 0;
    ASSERT_EQ(read(reports[0], &stored, sizeof stored), static_cast<ssize_t>(sizeof stored));
    usleep(static_cast<useconds_t>(i * 137 % 5000));
    ASSERT_EQ(kill(writer, SIGKILL), 0);
    ASSERT_EQ(waitpid(writer, nullptr, 0), writer);
    while (read(reports[0], &stored, sizeof stored) > 0) {
    }
    close(reports[0]);
    const Task task("alice", id);
    EXPECT_GE(BothOf(task), stored)
        << "an update that was reported is lost, or half of one is there";
    EXPECT_LE(BothOf(task), stored + 1);
    EXPECT_TRUE(task.isFinished());
    EXPECT_EQ(task.getCreatePid(), 0);
  }
  ExpectWhole(geteuid());
}

TEST_F(TaskConcurrency, KillDuringTheFirstUseLeavesAUsableStore) {
  for (int i = 0; i < 40; ++i) {
    fs::remove_all(Store(geteuid()));
    const pid_t maker = Start(geteuid(), [] {
      NewTask("alice");
      return 0;
    });
    usleep(static_cast<useconds_t>(i * 100));
    kill(maker, SIGKILL);
    ASSERT_EQ(waitpid(maker, nullptr, 0), maker);
    EXPECT_NE(NewTask("alice"), "") << i;
    ExpectWhole(geteuid());
  }
}

TEST_F(TaskConcurrency, ParentAndChildUseOneTaskAfterAFork) {
  Task task("alice", NewId());
  EXPECT_TRUE(UpdateBoth(task, 0));
  const pid_t child = Start(geteuid(), [&] {
    for (int n = 1; n <= 100; ++n) {
      if (!UpdateBoth(task, n)) {
        return 1;
      }
    }
    return 0;
  });
  for (int n = 1; n <= 100; ++n) {
    EXPECT_TRUE(task.setProperty("parents", n));
  }
  EXPECT_EQ(StatusOf(child), 0);
  EXPECT_TRUE(task.reload());
  EXPECT_EQ(BothOf(task), 100);
  EXPECT_EQ(task.getProperty("parents"), Json::Value(100));
  ExpectWhole(geteuid());
}

TEST_F(TaskConcurrency, ForkLeavesNoDatabaseOpenInTheChild) {
  EXPECT_NE(NewTask("alice"), "");
  EXPECT_EQ(InChild([] {
              for (const auto& entry : fs::directory_iterator("/proc/self/fd")) {
                std::error_code error;
                const fs::path target = fs::read_symlink(entry.path(), error);
                if (target.string().rfind(Store(geteuid()), 0) == 0) {
                  return 1;
                }
              }
              return 0;
            }),
            0);
}

TEST_F(TaskConcurrency, ChildMadeBehindTheLibrarysBackIsRefusedTheConnection) {
  const std::string id = NewTask("alice");
  EXPECT_TRUE(TaskUtil::checkTaskExists("alice", id));
  const pid_t child = _Fork();
  if (child == 0) {
    const bool there = TaskUtil::checkTaskExists("alice", id);
    _exit(!there && SyslogCapture::Count("the connection belongs to a parent process") == 1 ? 0
                                                                                            : 1);
  }
  EXPECT_EQ(StatusOf(child), 0);
  EXPECT_TRUE(TaskUtil::checkTaskExists("alice", id));
}

TEST_F(TaskConcurrency, ThreadsMayUpdateWhileAnotherForks) {
  if (IsSanitized()) {
    GTEST_SKIP() << "the sanitizer's allocator is locked in what is forked beside threads";
  }
  EXPECT_EQ(InChild([] {
              std::atomic<int> failed{0};
              std::atomic<bool> done{false};
              std::vector<std::thread> threads;
              for (int i = 0; i < 3; ++i) {
                threads.emplace_back([&] {
                  Task task("alice", NewId());
                  for (int n = 1; n <= 200; ++n) {
                    failed += UpdateBoth(task, n) && BothOf(task) == n ? 0 : 1;
                  }
                });
              }
              std::thread forker([&] {
                while (!done) {
                  failed +=
                      StatusOf(Start(geteuid(), [] { return NewTask("bob").empty() ? 1 : 0; }));
                }
              });
              for (std::thread& thread : threads) {
                thread.join();
              }
              done = true;
              forker.join();
              return failed == 0 ? 0 : 1;
            }),
            0);
  ExpectWhole(geteuid());
}

Task* handled = nullptr;  // what the signal's handler updates

// A signal's handler may come in the midst of an update. It must not wait for what it interrupted.
// The kernel sends this signal from within the write that a file's largest size does not allow.
TEST_F(TaskConcurrency, SignalHandlerInTheMidstOfAnUpdateIsRefused) {
  EXPECT_EQ(InChild([] {
              Task task("alice", NewTask("alice"));
              Task other("alice", NewTask("alice"));
              handled = &other;
              SyslogCapture::Clear();
              struct sigaction action {};
              action.sa_handler = [](int) { handled->setProperty("stopped", true); };
              sigaction(SIGXFSZ, &action, nullptr);
              const rlimit limit{1, RLIM_INFINITY};
              setrlimit(RLIMIT_FSIZE, &limit);
              const bool stored = task.setProperty("body", Number(2));
              const rlimit unlimited{RLIM_INFINITY, RLIM_INFINITY};
              setrlimit(RLIMIT_FSIZE, &unlimited);
              const bool refused = SyslogCapture::Count("[an operation is under way]") > 0;
              return !stored && refused && !other.hasProperty("stopped") &&
                             NumberOf(task.getProperty("body")) == 1 &&
                             other.setProperty("stopped", true)
                         ? 0
                         : 1;
            }),
            0);
}

// As on a full disk: what does not fit is refused whole, and what was there stays.
TEST_F(TaskConcurrency, UpdateThatCannotBeWrittenIsRefusedWhole) {
  EXPECT_EQ(InChild([] {
              Task task("alice", NewId());
              UpdateBoth(task, 1);
              signal(SIGXFSZ, SIG_IGN);
              SyslogCapture::Clear();
              int last = 1;
              for (rlim_t size = 1; size < 300'000; size += 4096) {
                const rlimit limit{size, RLIM_INFINITY};
                setrlimit(RLIMIT_FSIZE, &limit);
                const bool stored = UpdateBoth(task, last + 1);
                last += stored ? 1 : 0;
                if (BothOf(task) != last) {
                  return 1;
                }
              }
              return last > 1 && SyslogCapture::Count("cannot use the task store") > 0 ? 0 : 2;
            }),
            0);
  ExpectWhole(geteuid());
}

}  // namespace
