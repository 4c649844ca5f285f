#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <filesystem>

#include "platform/base/Paths.h"
#include "tests/support/SyslogCapture.h"
#include "tests/unit/platform/tasks/Fixture.h"
#include "webapi/JsonHelper.h"

namespace fs = std::filesystem;
using namespace QELO;
using ARDO::Task;
using ARDO::TaskMgr;
using ARDO::TaskUtil;

namespace {

class TaskUsers : public TaskUserTest {
 protected:
  static std::string MadeBy(uid_t user, const std::string& owner) {
    return TextFrom(user, [&] { return NewTask(owner); });
  }
  /// What the user's processes see of the owner's tasks.
  static std::string ListAs(uid_t user, const std::string& owner) {
    return TextFrom(user,
                    [&] { return JsonHelper::toString(TaskMgr(owner).getAllTaskId(nullptr)); });
  }
  static bool SeenBy(uid_t user, const std::string& owner, const std::string& id) {
    return As(user, [&] { return TaskUtil::checkTaskExists(owner, id) ? 1 : 0; }) == 1;
  }
  static std::string Ids(std::initializer_list<std::string> ids) {
    Json::Value list(Json::arrayValue);
    for (const std::string& id : ids) {
      list.append(id);
    }
    return JsonHelper::toString(list);
  }
};

TEST_F(TaskUsers, IdNamesTheUserWhoseProcessMadeIt) {
  const std::string id = MadeBy(kAlice, "alice");
  EXPECT_EQ(id.substr(id.rfind('.')), ".1002");
  struct stat info {};
  ASSERT_EQ(lstat(Store(kAlice).c_str(), &info), 0);
  EXPECT_EQ(info.st_uid, kAlice);
}

TEST_F(TaskUsers, RecordIsForItsUserAndRootAlone) {
  const std::string id = MadeBy(kAlice, "alice");
  EXPECT_TRUE(SeenBy(kAlice, "alice", id));
  EXPECT_TRUE(SeenBy(0, "alice", id));
  EXPECT_FALSE(SeenBy(kBob, "alice", id));
  EXPECT_FALSE(SeenBy(kSystem, "alice", id));
  EXPECT_EQ(As(kBob,
               [&] {
                 Task task("alice", id);
                 return task.setProperty("body", Number(2)) || task.finish(true) || task.remove() ||
                                task.setCreatePid(getpid()) || task.waitForDataReady("body", 1)
                            ? 1
                            : 0;
               }),
            0);
  EXPECT_EQ(NumberOf(Task("alice", id).getProperty("body")), 1);
}

TEST_F(TaskUsers, RecordOfRootsIsNotForItsOwnersProcesses) {
  const std::string id = NewTask("alice");
  EXPECT_FALSE(SeenBy(kAlice, "alice", id));
  EXPECT_EQ(ListAs(kAlice, "alice"), "[]");
}

TEST_F(TaskUsers, IdThatIsMadeToNameAnotherStoreNamesNothing) {
  const std::string id = MadeBy(kAlice, "alice");
  const std::string stem = id.substr(0, id.rfind('.'));
  EXPECT_FALSE(SeenBy(kBob, "alice", stem + ".1003"));
  EXPECT_FALSE(SeenBy(0, "alice", stem + ".1003"));
  EXPECT_FALSE(SeenBy(0, "alice", stem + ".0"));
  EXPECT_EQ(As(kBob, [&] { return Task("alice", stem + ".1002").setProperty("x", 1) ? 1 : 0; }), 0);
}

TEST_F(TaskUsers, EffectiveUserIsTheOneThatCounts) {
  const std::string id = MadeBy(kAlice, "alice");
  EXPECT_EQ(InChild([&] {
              if (seteuid(kBob) != 0) {
                return 2;
              }
              const bool bobs = TaskUtil::checkTaskExists("alice", id);
              if (seteuid(0) != 0 || seteuid(kAlice) != 0) {
                return 3;
              }
              const bool alices = TaskUtil::checkTaskExists("alice", id);
              return !bobs && alices ? 0 : 1;
            }),
            0);
}

TEST_F(TaskUsers, OnesWhoDroppedRootNoLongerReachWhatTheyMadeAsRoot) {
  EXPECT_EQ(InChild([&] {
              Task task("alice", NewTask("alice"));
              if (!task.reload() || setresuid(kAlice, kAlice, kAlice) != 0) {
                return 2;
              }
              return task.reload() || task.setProperty("body", Number(2)) ? 1 : 0;
            }),
            0);
}

TEST_F(TaskUsers, RootsListTakesInEveryStoreByAge) {
  const std::string first = MadeBy(kAlice, "alice");
  usleep(5'000);
  const std::string second = NewTask("alice");
  usleep(5'000);
  const std::string third = MadeBy(kSystem, "alice");
  EXPECT_EQ(ListAs(0, "alice"), Ids({first, second, third}));
  EXPECT_EQ(ListAs(kAlice, "alice"), Ids({first}));
  EXPECT_EQ(ListAs(kBob, "alice"), "[]");
}

TEST_F(TaskUsers, RootReadsChangesAndEndsARecordInAUsersStore) {
  const std::string id = MadeBy(kAlice, "alice");
  Task task("alice", id);
  EXPECT_EQ(NumberOf(task.getProperty("body")), 1);
  EXPECT_TRUE(task.setProperty("body", Number(2)));
  EXPECT_EQ(
      TextFrom(kAlice, [&] { return JsonHelper::toString(Task("alice", id).getProperty("body")); }),
      R"({"n":2})");
  EXPECT_TRUE(task.finish(false));
  EXPECT_EQ(As(kAlice, [&] { return Task("alice", id).isFinished() ? 1 : 0; }), 1);
  EXPECT_TRUE(task.finish(true));
  EXPECT_FALSE(SeenBy(kAlice, "alice", id));
}

TEST_F(TaskUsers, RootWakesWhenTheUserSetsAProperty) {
  const std::string id = MadeBy(kAlice, "alice");
  Task task("alice", id);
  EXPECT_TRUE(task.reload());
  const pid_t child = fork();
  if (child == 0) {
    usleep(50'000);
    _exit(setresuid(kAlice, kAlice, kAlice) == 0 && Task("alice", id).setProperty("x", 1) ? 0 : 1);
  }
  EXPECT_TRUE(task.waitForDataReady("x", 1000));
  EXPECT_EQ(waitpid(child, nullptr, 0), child);
}

// What root leaves behind in a user's store must not lock the user out.
TEST_F(TaskUsers, RootLeavesTheUserAllFiles) {
  const std::string id = MadeBy(kAlice, "alice");
  fs::remove(Store(kAlice, "tasks.db-wal"));
  fs::remove(Store(kAlice, "tasks.db-shm"));
  Sql(kAlice, "PRAGMA user_version");
  fs::remove(Store(kAlice, "tasks.db-wal"));
  fs::remove(Store(kAlice, "tasks.db-shm"));
  Task("alice", id).setProperty("body", Number(2));
  int files = 0;
  for (const auto& entry : fs::directory_iterator(Store(kAlice))) {
    struct stat info {};
    ASSERT_EQ(lstat(entry.path().c_str(), &info), 0);
    EXPECT_EQ(info.st_uid, kAlice) << entry;
    ++files;
  }
  EXPECT_EQ(files, 3);
}

TEST_F(TaskUsers, RootHasItsOwnRightsBackAfterwards) {
  const std::string id = MadeBy(kAlice, "alice");
  EXPECT_TRUE(Task("alice", id).reload());
  fs::create_directory(Path("var/alices"));
  ASSERT_EQ(chown(Path("var/alices").c_str(), kAlice, kAlice), 0);
  Write("var/alices/new", "x");
  EXPECT_EQ(Status("var/alices/new").st_uid, 0U);
  EXPECT_EQ(Status("var/alices/new").st_gid, 0U);
}

TEST_F(TaskUsers, RootWritesNothingThatAUserPutInItsWayByALink) {
  const std::string id = MadeBy(kAlice, "alice");
  const std::string log = Store(kAlice, "tasks.db-wal");
  Write("var/secret", "root's own");
  for (const bool symbolic : {true, false}) {
    fs::remove(log);
    fs::remove(Store(kAlice, "tasks.db-shm"));
    if (symbolic) {
      fs::create_symlink(Path("var/secret"), log);
    } else {
      fs::create_hard_link(Path("var/secret"), log);
    }
    EXPECT_FALSE(Task("alice", id).setProperty("body", Number(2)));
    EXPECT_EQ(Read("var/secret"), "root's own");
    EXPECT_EQ(Status("var/secret").st_uid, 0U);
  }
}

// A user may write any row to his own store; root believes what the user could have made by right.
TEST_F(TaskUsers, OwnerThatAUserForgedCountsForNobody) {
  const std::string forged = MadeBy(kAlice, "bob");
  const std::string administrators = MadeBy(kAlice, "@administrators");
  EXPECT_NE(forged, "");
  EXPECT_FALSE(SeenBy(0, "bob", forged));
  EXPECT_EQ(ListAs(0, "bob"), "[]");
  EXPECT_FALSE(SeenBy(0, "@administrators", administrators));
  EXPECT_EQ(ListAs(0, "@administrators"), "[]");
}

TEST_F(TaskUsers, OwnersThatAUserMayHaveCount) {
  const std::string everybodys = MadeBy(kAlice, "@users");
  const std::string administrators = MadeBy(kAdmin, "@administrators");
  const std::string services = MadeBy(kSystem, "@administrators");
  EXPECT_EQ(ListAs(0, "@users"), Ids({everybodys}));
  EXPECT_TRUE(SeenBy(0, "@users", everybodys));
  EXPECT_TRUE(SeenBy(0, "@administrators", administrators));
  EXPECT_TRUE(SeenBy(0, "@administrators", services));
}

TEST_F(TaskUsers, OwnersOfAnAccountWithoutAShellCountAsThoseOfAnyUser) {
  Write("etc/passwd", Read("etc/passwd") + "backup:x:910:910:A service:/:/usr/sbin/nologin\n");
  const std::string forged = MadeBy(910, "bob");
  EXPECT_NE(forged, "");
  EXPECT_FALSE(SeenBy(0, "bob", forged));
  EXPECT_EQ(ListAs(0, "bob"), "[]");
  EXPECT_TRUE(SeenBy(0, "backup", MadeBy(910, "backup")));
  EXPECT_EQ(ListAs(0, "bob"), "[]");
}

TEST_F(TaskUsers, StoreOfAUserWhoIsNoMoreCountsForNobody) {
  const std::string id = MadeBy(4711, "alice");
  EXPECT_TRUE(SeenBy(4711, "alice", id));
  EXPECT_FALSE(SeenBy(0, "alice", id));
  EXPECT_EQ(ListAs(0, "alice"), "[]");
}

TEST_F(TaskUsers, DirectoryThatAnotherMadeForAUserIsRefused) {
  fs::create_directory(Store(kAlice));
  ASSERT_EQ(chmod(Store(kAlice).c_str(), 0700), 0);
  ASSERT_EQ(chown(Store(kAlice).c_str(), kBob, kBob), 0);
  EXPECT_EQ(MadeBy(kAlice, "alice"), "");
  SyslogCapture::Clear();
  const std::string id = std::string(43, 'x') + ".1002";
  EXPECT_FALSE(TaskUtil::checkTaskExists("alice", id));
  EXPECT_EQ(SyslogCapture::Count("[the directory is not the user's alone]"), 1);
  EXPECT_EQ(As(kAlice,
               [&] {
                 return SyslogCapture::Count("Permission denied") == 0 &&
                                NewTask("alice").empty() &&
                                SyslogCapture::Count("Permission denied") == 1
                            ? 0
                            : 1;
               }),
            0);
  SyslogCapture::Clear();
  EXPECT_EQ(TaskMgr("alice").getAllTaskId(nullptr).size(), 0U);
  EXPECT_EQ(SyslogCapture::Count("task store"), 0) << "a list leaves strange directories out";
}

TEST_F(TaskUsers, DatabaseThatAnotherMadeIsRefused) {
  const std::string id = MadeBy(kAlice, "alice");
  ASSERT_EQ(chown(Store(kAlice, "tasks.db").c_str(), kBob, kBob), 0);
  SyslogCapture::Clear();
  EXPECT_FALSE(TaskUtil::checkTaskExists("alice", id));
  EXPECT_EQ(SyslogCapture::Count("[the file is not the user's alone]"), 1);
}

TEST_F(TaskUsers, NamesInTheParentThatAreNoUsersAreLeftOut) {
  const std::string id = MadeBy(kAlice, "alice");
  for (const char* name : {"01002", "x", "-1", "4294967295", "1002x"}) {
    fs::create_directory(std::string(Paths::kTaskDir) + "/" + name);
  }
  fs::create_symlink("1002", std::string(Paths::kTaskDir) + "/1003");
  EXPECT_EQ(ListAs(0, "alice"), Ids({id}));
}

TEST_F(TaskUsers, UserCannotMakeTheParent) {
  fs::remove_all(Paths::kTaskDir);
  EXPECT_EQ(MadeBy(kAlice, "alice"), "");
  EXPECT_EQ(As(kAlice,
               [] {
                 SyslogCapture::Clear();
                 NewTask("alice");
                 return SyslogCapture::Count("cannot use the task store") == 1 ? 0 : 1;
               }),
            0);
  EXPECT_FALSE(fs::exists(Paths::kTaskDir));
  EXPECT_NE(NewTask("alice"), "");
  EXPECT_NE(MadeBy(kAlice, "alice"), "");
}

}  // namespace
