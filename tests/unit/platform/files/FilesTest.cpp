#include <sys/stat.h>
#include <unistd.h>

#include "tests/unit/platform/PrivateRoot.h"
#include "webapi/platform/Core.h"

namespace {

constexpr uid_t kAnyUid = static_cast<uid_t>(-1);
constexpr gid_t kAnyGid = static_cast<gid_t>(-1);

int makeDirs(const std::string& path, mode_t mode, uid_t uid = kAnyUid, gid_t gid = kAnyGid,
             int keepExistingOwner = 0) {
  return QELOFSMkdirP(path.c_str(), keepExistingOwner, 0, uid, gid, mode);
}

using Files = PrivateRoot;

TEST_F(Files, ExistsTellsFilesAndDirectoriesFromNothing) {
  EXPECT_EQ(QLIBCFileExist(Path("etc").c_str()), 1);
  EXPECT_EQ(QLIBCFileExist(Path("etc/passwd").c_str()), 1);
  EXPECT_EQ(QLIBCFileExist(Path("etc/missing").c_str()), 0);
}

TEST_F(Files, ExistsSaysNoOfALinkToNothing) {
  ASSERT_EQ(symlink("nothing", Path("var/link").c_str()), 0);
  EXPECT_EQ(QLIBCFileExist(Path("var/link").c_str()), 0);
}

TEST_F(Files, TouchCreatesAnEmptyFile) {
  EXPECT_EQ(QLIBCFileTouch(Path("var/mark").c_str()), 0);
  EXPECT_EQ(Status("var/mark").st_size, 0);
  EXPECT_EQ(Status("var/mark").st_mode & 0777U, 0600U);
}

TEST_F(Files, TouchBringsTheTimesToNowAndLeavesTheContent) {
  Write("var/mark", "content");
  Age("var/mark", 1000);
  EXPECT_EQ(QLIBCFileTouch(Path("var/mark").c_str()), 0);
  EXPECT_LE(time(nullptr) - Status("var/mark").st_mtim.tv_sec, 2);
  EXPECT_EQ(Read("var/mark"), "content");
}

TEST_F(Files, TouchFailsBelowAMissingDirectoryOrAFile) {
  EXPECT_NE(QLIBCFileTouch(Path("missing/mark").c_str()), 0);
  EXPECT_NE(QLIBCFileTouch(Path("etc/passwd/mark").c_str()), 0);
}

TEST_F(Files, MkdirMakesAllParentsWithSearchWhereReadingIsGranted) {
  EXPECT_EQ(makeDirs(Path("var/a/b/c"), 0600), 0);
  for (const char* made : {"var/a", "var/a/b", "var/a/b/c"}) {
    EXPECT_EQ(Status(made).st_mode, S_IFDIR | 0700U) << made;
  }
  EXPECT_EQ(makeDirs(Path("var/d"), 0640), 0);
  EXPECT_EQ(Status("var/d").st_mode, S_IFDIR | 0750U);
}

TEST_F(Files, MkdirGivesTheModeWhateverTheUmaskIs) {
  const mode_t old = umask(077);
  EXPECT_EQ(makeDirs(Path("var/shared"), 0775), 0);
  umask(old);
  EXPECT_EQ(Status("var/shared").st_mode, S_IFDIR | 0775U);
}

TEST_F(Files, MkdirOfAnExistingDirectorySucceedsAndLeavesItsMode) {
  ASSERT_EQ(mkdir(Path("var/old").c_str(), 0711), 0);
  EXPECT_EQ(makeDirs(Path("var/old"), 0700), 0);
  EXPECT_EQ(makeDirs(Path("var/old/"), 0700), 0);
  EXPECT_EQ(Status("var/old").st_mode, S_IFDIR | 0711U);
}

TEST_F(Files, MkdirAcceptsDoubledAndTrailingSlashes) {
  EXPECT_EQ(makeDirs(Path("var//x///y//"), 0700), 0);
  EXPECT_EQ(Status("var/x/y").st_mode, S_IFDIR | 0700U);
}

TEST_F(Files, MkdirFailsWhereAFileIs) {
  EXPECT_NE(makeDirs(Path("etc/passwd"), 0700), 0);
  EXPECT_NE(makeDirs(Path("etc/passwd/x"), 0700), 0);
  EXPECT_NE(makeDirs("", 0700), 0);
}

TEST_F(Files, MkdirGivesWhatItCreatesToTheOwner) {
  if (!IsRoot()) {
    GTEST_SKIP() << "only root gives directories away";
  }
  EXPECT_EQ(makeDirs(Path("var/of/alice"), 0700, 1002, 1002), 0);
  EXPECT_EQ(Status("var").st_uid, 0U);
  EXPECT_EQ(Status("var/of").st_uid, 1002U);
  EXPECT_EQ(Status("var/of/alice").st_uid, 1002U);
  EXPECT_EQ(Status("var/of/alice").st_gid, 1002U);
}

TEST_F(Files, MkdirGivesAnExistingDirectoryAwayUnlessItsOwnerIsKept) {
  if (!IsRoot()) {
    GTEST_SKIP() << "only root gives directories away";
  }
  ASSERT_EQ(mkdir(Path("var/old").c_str(), 0700), 0);
  EXPECT_EQ(makeDirs(Path("var/old"), 0700, 1002, kAnyGid, 1), 0);
  EXPECT_EQ(Status("var/old").st_uid, 0U);
  EXPECT_EQ(makeDirs(Path("var/old"), 0700, 1002, kAnyGid, 0), 0);
  EXPECT_EQ(Status("var/old").st_uid, 1002U);
}

TEST_F(Files, MkdirFailsWhenTheOwnerCannotBeGiven) {
  if (IsRoot()) {
    GTEST_SKIP() << "root may give directories away";
  }
  EXPECT_NE(makeDirs(Path("var/of"), 0700, geteuid() + 1, kAnyGid), 0);
}

}  // namespace
