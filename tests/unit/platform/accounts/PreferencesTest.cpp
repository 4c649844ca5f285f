#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>

#include "tests/unit/platform/PrivateRoot.h"
#include "webapi/platform/Core.h"

namespace {

class Preferences : public PrivateRoot {
 protected:
  void SetUp() override {
    PrivateRoot::SetUp();
    const auto reach = [] {
      return setuid(1002) == 0 && access(Path().c_str(), X_OK) == 0 ? 0 : 1;
    };
    if (IsRoot() && InChild(reach) != 0) {
      GTEST_SKIP() << "the accounts of the root cannot reach the directory that it is in";
    }
  }

  static std::string OfUser(const char* user, int size = 1024) {
    char path[1024] = "before";
    const int result = QELOUserPreferenceDirGet(user, path, size);
    EXPECT_EQ(result >= 0, path[0] != '\0') << path;
    return result < 0 ? "failed" : path;
  }
  static std::string OfGroup(const char* group) {
    char path[1024] = "before";
    const int result = QELOGroupPreferenceDirGet(group, path, sizeof path);
    EXPECT_EQ(result >= 0, path[0] != '\0') << path;
    return result < 0 ? "failed" : path;
  }
};

TEST_F(Preferences, UsersDirectoryIsMadeInTheHomeForTheUserAlone) {
  EXPECT_EQ(OfUser("alice"), Path("home/alice/.webapi"));
  const struct stat info = Status("home/alice/.webapi");
  EXPECT_EQ(info.st_mode, S_IFDIR | 0700U);
  EXPECT_EQ(info.st_uid, Status("home/alice").st_uid);
  EXPECT_EQ(info.st_gid, Status("home/alice").st_gid);
  EXPECT_EQ(OfUser("alice"), Path("home/alice/.webapi"));
}

TEST_F(Preferences, MakingTheDirectoryKeepsOurOwnRights) {
  ASSERT_EQ(OfUser("alice"), Path("home/alice/.webapi"));
  Write("etc/own", "");
  EXPECT_EQ(Status("etc/own").st_uid, geteuid());
  EXPECT_EQ(Status("etc/own").st_gid, getegid());
}

TEST_F(Preferences, UnknownUserAndUserWithoutHomeHaveNone) {
  EXPECT_EQ(OfUser("zoe"), "failed");
  EXPECT_EQ(OfUser(""), "failed");
  EXPECT_EQ(OfUser("../etc"), "failed");
  EXPECT_EQ(OfUser("system"), "failed");
  Write("etc/passwd", "odd:x:1002:1002:::/bin/sh\nbad:x:1002:1002::relative:/bin/sh\n");
  EXPECT_EQ(OfUser("odd"), "failed");
  EXPECT_EQ(OfUser("bad"), "failed");
}

TEST_F(Preferences, SymbolicLinkInTheHomeIsNotFollowed) {
  ASSERT_EQ(symlink(Path("etc").c_str(), Path("home/alice/.webapi").c_str()), 0);
  EXPECT_EQ(OfUser("alice"), "failed");
}

TEST_F(Preferences, FileInThePlaceOfTheDirectoryIsRefused) {
  Write("home/alice/.webapi", "");
  EXPECT_EQ(OfUser("alice"), "failed");
}

TEST_F(Preferences, DirectoryOfAnotherUserIsRefused) {
  if (!IsRoot()) {
    GTEST_SKIP() << "only root gives directories away";
  }
  ASSERT_EQ(mkdir(Path("home/alice/.webapi").c_str(), 0700), 0);
  EXPECT_EQ(OfUser("alice"), "failed");
}

TEST_F(Preferences, PathThatDoesNotFitIsRefused) {
  EXPECT_EQ(OfUser("alice", 10), "failed");
}

TEST_F(Preferences, GroupsDirectoryIsForItsMembers) {
  EXPECT_EQ(OfGroup("users"), Path("var/lib/webapi/groups/users"));
  const struct stat info = Status("var/lib/webapi/groups/users");
  if (IsRoot()) {
    EXPECT_EQ(info.st_mode, S_IFDIR | S_ISGID | 0770U);
    EXPECT_EQ(info.st_uid, 0U);
    EXPECT_EQ(info.st_gid, 1101U);
  } else {
    EXPECT_EQ(info.st_mode, S_IFDIR | 0700U);
  }
  EXPECT_EQ(Status("var/lib/webapi/groups").st_mode, S_IFDIR | 0711U);
}

TEST_F(Preferences, GroupsDirectoryStaysAsItIs) {
  ASSERT_EQ(OfGroup("users"), Path("var/lib/webapi/groups/users"));
  ASSERT_EQ(chmod(Path("var/lib/webapi/groups/users").c_str(), 0750), 0);
  EXPECT_EQ(OfGroup("users"), Path("var/lib/webapi/groups/users"));
  EXPECT_EQ(Status("var/lib/webapi/groups/users").st_mode & 0777U, 0750U);
}

TEST_F(Preferences, GroupIsOneOfTheDatabase) {
  EXPECT_EQ(OfGroup("zoes"), "failed");
  EXPECT_EQ(OfGroup(""), "failed");
  EXPECT_EQ(OfGroup("../users"), "failed");
  EXPECT_FALSE(std::filesystem::exists(Path("var/lib/webapi/groups")));
}

TEST_F(Preferences, GroupWhoseNameLeadsElsewhereIsRefused) {
  Write("etc/group", "../../evil:x:1102:\n..:x:1103:\na/b:x:1104:\n");
  EXPECT_EQ(OfGroup("../../evil"), "failed");
  EXPECT_EQ(OfGroup(".."), "failed");
  EXPECT_EQ(OfGroup("a/b"), "failed");
}

TEST_F(Preferences, MemberFindsTheGroupsDirectory) {
  if (!IsRoot()) {
    GTEST_SKIP() << "only root becomes other users";
  }
  ASSERT_EQ(OfGroup("users"), Path("var/lib/webapi/groups/users"));
  EXPECT_EQ(InChild([] {
              if (setgid(1101) != 0 || setuid(1002) != 0) {
                return 1;
              }
              const std::string path = OfGroup("users");
              return path != "failed" && mkdir((path + "/mine").c_str(), 0700) == 0 ? 0 : 2;
            }),
            0);
}

}  // namespace
