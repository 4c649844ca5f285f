#include "webapi/base/ReplaceFile.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

#include "TemporaryDir.h"
#include "webapi/base/UniqueFd.h"

namespace QELO {
namespace {

class Replacing : public TemporaryDir {
 protected:
  struct stat Status(const std::string& name) const {
    struct stat info {};
    EXPECT_EQ(stat(Path(name).c_str(), &info), 0);
    return info;
  }
  mode_t Mode(const std::string& name) const { return Status(name).st_mode & 07777; }
};

TEST_F(Replacing, NewFileHasTheModeAskedFor) {
  const mode_t former = umask(0077);
  EXPECT_TRUE(ReplaceFile(Path("secret"), "text"));
  EXPECT_TRUE(ReplaceFile(Path("open"), "text", {.mode = 0644}));
  umask(former);
  EXPECT_EQ(Content("secret"), "text");
  EXPECT_EQ(Mode("secret"), 0600U);
  EXPECT_EQ(Mode("open"), 0644U);
  EXPECT_EQ(Files(), 2);
}

TEST_F(Replacing, FormerFileHandsItsModeOn) {
  Write("file", "a longer text than the new one");
  chmod(Path("file").c_str(), 0640);
  const ino_t former = Status("file").st_ino;
  EXPECT_TRUE(ReplaceFile(Path("file"), "new", {.mode = 0600}));
  EXPECT_EQ(Content("file"), "new");
  EXPECT_EQ(Mode("file"), 0640U);
  EXPECT_NE(Status("file").st_ino, former);
}

TEST_F(Replacing, FormerFileHandsItsOwnerOnWhenAskedFor) {
  if (geteuid() != 0) {
    GTEST_SKIP() << "needs root's rights";
  }
  Write("file", "old");
  ASSERT_EQ(chown(Path("file").c_str(), 12345, 23456), 0);
  EXPECT_TRUE(ReplaceFile(Path("file"), "kept", {.keepsOwner = true, .isSynced = true}));
  EXPECT_EQ(Status("file").st_uid, 12345U);
  EXPECT_EQ(Status("file").st_gid, 23456U);
  EXPECT_TRUE(ReplaceFile(Path("file"), "taken"));
  EXPECT_EQ(Status("file").st_uid, geteuid());
}

TEST_F(Replacing, RelativePathStartsAtTheDirectory) {
  const UniqueFd directory(open(directory_.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
  EXPECT_TRUE(ReplaceFile("file", "text", {.directory = directory.Get()}));
  EXPECT_EQ(Content("file"), "text");
  EXPECT_EQ(Files(), 1);
}

TEST_F(Replacing, LeftoverOfOneNameIsReplacedAndNotFollowed) {
  Write("victim", "untouched");
  std::filesystem::create_symlink(Path("victim"), Path("file.new"));
  EXPECT_TRUE(ReplaceFile(Path("file"), "text", {.freshSuffix = ".new"}));
  EXPECT_EQ(Content("file"), "text");
  EXPECT_EQ(Content("victim"), "untouched");
  EXPECT_EQ(Files(), 2);
}

TEST_F(Replacing, FailureTellsWhyAndLeavesNothing) {
  std::filesystem::create_directory(Path("directory"));
  EXPECT_FALSE(ReplaceFile(Path("directory"), "text"));
  EXPECT_EQ(errno, EISDIR);
  EXPECT_EQ(Files(), 1);
  EXPECT_FALSE(ReplaceFile(Path("missing/file"), "text"));
  EXPECT_EQ(errno, ENOENT);
}

}  // namespace
}  // namespace QELO
