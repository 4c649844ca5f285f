#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <vector>

#include "platform/base/Paths.h"
#include "tests/support/SyslogCapture.h"
#include "tests/unit/platform/tasks/Fixture.h"

namespace fs = std::filesystem;
using namespace QELO;
using ARDO::Task;
using ARDO::TaskMgr;
using ARDO::TaskUtil;

namespace {

/// What every operation answers when the store cannot be used, and that it says why.
class TaskStore : public TaskTest {
 protected:
  void SetUp() override {
    TaskTest::SetUp();
    id_ = NewTask("alice");
  }

  void ExpectRefused(const std::string& reason) {
    SyslogCapture::Clear();
    Task task("alice", id_);
    EXPECT_FALSE(task.reload());
    EXPECT_EQ(SyslogCapture::Count("TaskModule.cpp:"), 1);
    EXPECT_EQ(SyslogCapture::Count("cannot use the task store " + Store(geteuid()) + " [" + reason),
              1)
        << (SyslogCapture::Messages().empty() ? "" : SyslogCapture::Messages()[0].text);
    EXPECT_TRUE(task.getProperty("body").isNull());
    EXPECT_FALSE(task.setProperty("body", Number(2)));
    EXPECT_FALSE(task.finish(false));
    EXPECT_FALSE(task.remove());
    EXPECT_FALSE(task.setCreatePid(getpid()));
    EXPECT_FALSE(task.waitForDataReady("body", 0));
    EXPECT_FALSE(TaskUtil::checkTaskExists("alice", id_));
    EXPECT_EQ(TaskMgr("alice").getAllTaskId(nullptr).size(), 0U);
    EXPECT_EQ(NewTask("alice"), "");
  }

  static void Overwrite(const std::string& file, const std::string& text) {
    std::ofstream(Store(geteuid(), file), std::ios::trunc) << text;
  }
  /// Makes the next operation open the store anew, as another process's first one would.
  static void CloseStore() {
    EXPECT_EQ(InChild([] { return 0; }), 0);
  }

  static void RemoveCompanions() {
    fs::remove(Store(geteuid(), "tasks.db-wal"));
    fs::remove(Store(geteuid(), "tasks.db-shm"));
  }

  std::string id_;
};

TEST_F(TaskStore, StandsInADirectoryOfItsUserAlone) {
  const struct stat directory = Status("var/lib/webapi/tasks/" + std::to_string(geteuid()));
  EXPECT_EQ(directory.st_mode, S_IFDIR | 0700U);
  EXPECT_EQ(directory.st_uid, geteuid());
  for (const auto& entry : fs::directory_iterator(Store(geteuid()))) {
    struct stat info {};
    ASSERT_EQ(lstat(entry.path().c_str(), &info), 0);
    EXPECT_EQ(info.st_mode, S_IFREG | 0600U) << entry;
    EXPECT_EQ(entry.path().filename().string().rfind("tasks.db", 0), 0U) << entry;
  }
}

TEST_F(TaskStore, IsInWalMode) {
  EXPECT_EQ(Sql("PRAGMA journal_mode"), "wal");
}

TEST_F(TaskStore, ParentIsMadeOnFirstUseWhateverTheUmask) {
  for (const mode_t mask : {0U, 022U, 077U}) {
    fs::remove_all(Path("var/lib/webapi"));
    const mode_t former = umask(mask);
    const std::string id = NewTask("alice");
    umask(former);
    EXPECT_TRUE(TaskUtil::checkTaskExists("alice", id)) << mask;
    EXPECT_EQ(Status("var/lib/webapi").st_mode, S_IFDIR | 0711U);
    EXPECT_EQ(Status("var/lib/webapi/tasks").st_mode, S_IFDIR | 01733U);
    EXPECT_EQ(CountFiles("var/lib/webapi"), 1);
  }
}

TEST_F(TaskStore, ThatIsTakenAwayIsMadeAnew) {
  fs::remove_all(Store(geteuid()));
  EXPECT_FALSE(TaskUtil::checkTaskExists("alice", id_));
  const std::string id = NewTask("alice");
  EXPECT_TRUE(TaskUtil::checkTaskExists("alice", id));
  EXPECT_FALSE(TaskUtil::checkTaskExists("alice", id_));
}

TEST_F(TaskStore, ThatIsPutBackIsUsedAgain) {
  fs::rename(Store(geteuid()), Path("var/away"));
  EXPECT_FALSE(TaskUtil::checkTaskExists("alice", id_));
  EXPECT_TRUE(TaskUtil::checkTaskExists("alice", NewTask("alice")));
  fs::remove_all(Store(geteuid()));
  fs::rename(Path("var/away"), Store(geteuid()));
  EXPECT_TRUE(TaskUtil::checkTaskExists("alice", id_));
}

TEST_F(TaskStore, PathMayHoldSymbolicLinksAboveTheStores) {
  fs::rename(Path("var/lib"), Path("var/elsewhere"));
  fs::create_directory_symlink(Path("var/elsewhere"), Path("var/lib"));
  EXPECT_TRUE(TaskUtil::checkTaskExists("alice", id_));
}

TEST_F(TaskStore, KeepsItsDescriptorsFromOtherPrograms) {
  EXPECT_TRUE(TaskUtil::checkTaskExists("alice", id_));
  int ours = 0;
  DIR* open = opendir("/proc/self/fd");
  while (const dirent* entry = readdir(open)) {
    std::error_code error;
    const fs::path target = fs::read_symlink(fs::path("/proc/self/fd") / entry->d_name, error);
    if (target.string().rfind(Store(geteuid()), 0) == 0) {
      ++ours;
      EXPECT_NE(fcntl(std::stoi(entry->d_name), F_GETFD) & FD_CLOEXEC, 0) << target;
    }
  }
  closedir(open);
  EXPECT_GE(ours, 2);
}

TEST_F(TaskStore, DirectoryThatOthersMayEnterIsRefused) {
  ASSERT_EQ(chmod(Store(geteuid()).c_str(), 0710), 0);
  fs::rename(Store(geteuid(), "tasks.db"), Store(geteuid(), "moved"));
  ExpectRefused("the directory is not the user's alone");
}

TEST_F(TaskStore, DirectoryThatIsALinkIsRefused) {
  fs::rename(Store(geteuid()), Path("var/away"));
  fs::create_directory_symlink(Path("var/away"), Store(geteuid()));
  fs::rename(Path("var/away/tasks.db"), Path("var/away/moved"));
  ExpectRefused("Not a directory");
}

TEST_F(TaskStore, ParentWhereOthersMayRemoveIsRefused) {
  ASSERT_EQ(chmod(Paths::kTaskDir, 0733), 0);
  fs::rename(Store(geteuid(), "tasks.db"), Store(geteuid(), "moved"));
  ExpectRefused("others may change the parent directory");
}

TEST_F(TaskStore, FileThatOthersMayReadIsRefused) {
  fs::copy_file(Store(geteuid(), "tasks.db"), Store(geteuid(), "copy"));
  fs::rename(Store(geteuid(), "copy"), Store(geteuid(), "tasks.db"));
  ASSERT_EQ(chmod(Store(geteuid(), "tasks.db").c_str(), 0640), 0);
  ExpectRefused("the file is not the user's alone");
}

TEST_F(TaskStore, FileThatIsALinkIsRefused) {
  fs::rename(Store(geteuid(), "tasks.db"), Store(geteuid(), "real"));
  fs::create_symlink("real", Store(geteuid(), "tasks.db"));
  ExpectRefused("the file is not the user's alone");
}

TEST_F(TaskStore, FileThatIsNoDatabaseIsRefused) {
  fs::remove(Store(geteuid(), "tasks.db"));
  RemoveCompanions();
  Overwrite("tasks.db", std::string(5000, 'x'));
  ASSERT_EQ(chmod(Store(geteuid(), "tasks.db").c_str(), 0600), 0);
  ExpectRefused("file is not a database");
}

TEST_F(TaskStore, FileThatIsEmptyIsRefused) {
  fs::remove(Store(geteuid(), "tasks.db"));
  RemoveCompanions();
  Overwrite("tasks.db", "");
  ASSERT_EQ(chmod(Store(geteuid(), "tasks.db").c_str(), 0600), 0);
  ExpectRefused("the file holds other tables than ours");
}

TEST_F(TaskStore, DatabaseWithAnotherTableIsRefused) {
  Sql("CREATE TABLE other(x)");
  CloseStore();
  ExpectRefused("the file holds other tables than ours");
}

TEST_F(TaskStore, DatabaseWithATriggerIsRefused) {
  Sql("CREATE TRIGGER t AFTER UPDATE ON tasks BEGIN DELETE FROM properties; END");
  CloseStore();
  ExpectRefused("the file holds other tables than ours");
}

TEST_F(TaskStore, TriggerThatComesLaterDoesNotRun) {
  EXPECT_TRUE(TaskUtil::checkTaskExists("alice", id_));
  Sql("CREATE TRIGGER t AFTER UPDATE ON tasks BEGIN DELETE FROM properties; END");
  EXPECT_TRUE(Task("alice", id_).setProperty("more", 1));
  EXPECT_EQ(Sql("SELECT count(*) FROM properties"), "2");
}

TEST_F(TaskStore, DatabaseWithAMissingIndexIsRefused) {
  Sql("DROP INDEX tasks_running");
  CloseStore();
  ExpectRefused("the file holds other tables than ours");
}

/// As a store was before its tables had a version.
constexpr char kOldTables[] = "ALTER TABLE tasks DROP COLUMN changed; PRAGMA user_version=0";

TEST_F(TaskStore, OfAnotherVersionIsSetAsideAndUsedAnew) {
  for (const char* change : {kOldTables, "PRAGMA user_version=2; CREATE TABLE more(x)"}) {
    const std::string old = NewTask("alice");
    const std::string records = Sql("SELECT count(*) FROM tasks");
    Sql(change);
    CloseStore();
    SyslogCapture::Clear();
    const std::string id = NewTask("alice");
    EXPECT_TRUE(TaskUtil::checkTaskExists("alice", id)) << change;
    EXPECT_FALSE(TaskUtil::checkTaskExists("alice", old));
    EXPECT_EQ(TaskMgr("alice").getAllTaskId(nullptr).size(), 1U);
    EXPECT_EQ(SyslogCapture::Count("TaskModule.cpp:"), 1);
    EXPECT_EQ(SyslogCapture::Count("another version made the task records " + Store(geteuid()) +
                                   "/tasks.db, which are kept as tasks.db.old"),
              1);
    fs::rename(Store(geteuid(), "tasks.db"), Store(geteuid(), "new.db"));
    for (const char* companion : {"", "-wal", "-shm"}) {
      const std::string kept = Store(geteuid(), "tasks.db.old") + companion;
      if (fs::exists(kept)) {
        fs::copy_file(kept, Store(geteuid(), "tasks.db") + companion,
                      fs::copy_options::overwrite_existing);
      }
    }
    EXPECT_EQ(Sql("SELECT count(*) FROM tasks"), records) << "what it holds is kept";
    RemoveCompanions();
    fs::rename(Store(geteuid(), "new.db"), Store(geteuid(), "tasks.db"));
    fs::remove_all(Store(geteuid()));
  }
}

TEST_F(TaskStore, OfAnotherVersionIsNoStoreToAReader) {
  Sql(kOldTables);
  CloseStore();
  SyslogCapture::Clear();
  EXPECT_FALSE(TaskUtil::checkTaskExists("alice", id_));
  EXPECT_EQ(TaskMgr("alice").getAllTaskId(nullptr).size(), 0U);
  EXPECT_EQ(SyslogCapture::Count("another version made"), 1);
  EXPECT_EQ(SyslogCapture::Count("cannot use the task store"), 0);
  EXPECT_FALSE(fs::exists(Store(geteuid(), "tasks.db")));
}

TEST_F(TaskStore, OfAnotherVersionIsSetAsideOnceByManyWhoNeedIt) {
  Sql(kOldTables);
  CloseStore();
  constexpr int kProcesses = 12;
  std::vector<pid_t> children;
  for (int i = 0; i < kProcesses; ++i) {
    const pid_t child = fork();
    if (child == 0) {
      _exit(NewTask("alice").empty() ? 1 : 0);
    }
    children.push_back(child);
  }
  for (const pid_t child : children) {
    int status = -1;
    EXPECT_EQ(waitpid(child, &status, 0), child);
    EXPECT_EQ(status, 0);
  }
  EXPECT_EQ(TaskMgr("alice").getAllTaskId(nullptr).size(), 12U);
}

TEST_F(TaskStore, OfAnotherVersionStaysWhenItCannotBeSetAside) {
  Sql(kOldTables);
  CloseStore();
  fs::create_directory(Store(geteuid(), "tasks.db.old"));
  ExpectRefused("Is a directory");
  EXPECT_TRUE(fs::exists(Store(geteuid(), "tasks.db")));
}

// Bytes are changed everywhere in turn: whatever is hit, every operation ends, and what it says of
// the damage is logged.
TEST_F(TaskStore, DamageAnywhereInTheFileCrashesNothing) {
  for (int i = 0; i < 40; ++i) {
    NewTask("alice", "d_");
  }
  Sql("PRAGMA wal_checkpoint(TRUNCATE)");
  std::ifstream file(Store(geteuid(), "tasks.db"), std::ios::binary);
  const std::string whole((std::istreambuf_iterator<char>(file)), std::istreambuf_iterator<char>());
  ASSERT_GT(whole.size(), 8192U);
  int survived = 0;
  for (size_t at = 0; at < whole.size(); at += 509) {
    std::string damaged = whole;
    for (size_t i = at; i < at + 64 && i < damaged.size(); ++i) {
      damaged[i] = static_cast<char>(damaged[i] ^ static_cast<char>(0xa5 + i));
    }
    survived += InChild([&] {
                  fs::remove(Store(geteuid(), "tasks.db"));
                  RemoveCompanions();
                  Overwrite("tasks.db", damaged);
                  chmod(Store(geteuid(), "tasks.db").c_str(), 0600);
                  Task task("alice", id_);
                  task.getProperty("body");
                  task.setProperty("body", Number(2));
                  TaskMgr("alice").getAllTaskId("d_");
                  NewTask("alice");
                  task.finish(true);
                  return 7;
                }) == 7;
  }
  EXPECT_EQ(survived, static_cast<int>((whole.size() + 508) / 509));
}

TEST_F(TaskStore, FileThatIsCutOffIsRefused) {
  for (int i = 0; i < 40; ++i) {
    NewTask("alice");
  }
  Sql("PRAGMA wal_checkpoint(TRUNCATE)");
  const std::string path = Store(geteuid(), "tasks.db");
  fs::copy_file(path, path + ".copy");
  ASSERT_EQ(chmod((path + ".copy").c_str(), 0600), 0);
  fs::resize_file(path + ".copy", 8192);
  fs::rename(path + ".copy", path);
  RemoveCompanions();
  ExpectRefused("database disk image is malformed");
}

TEST_F(TaskStore, WithoutTheModuleIsRefused) {
  EXPECT_EQ(InChild([&] {
              fs::remove(Path("modules/tasks.so"));
              const bool there = TaskUtil::checkTaskExists("alice", id_);
              return !there && SyslogCapture::Count("refused to load") > 0 ? 0 : 1;
            }),
            0);
}

}  // namespace
