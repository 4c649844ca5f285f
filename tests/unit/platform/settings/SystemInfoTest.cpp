#include <fcntl.h>
#include <sys/file.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <vector>

#include "tests/unit/platform/PrivateRoot.h"
#include "webapi/base/UniqueFd.h"
#include "webapi/platform/Core.h"

namespace {

constexpr char kFile[] = "etc/qeloinfo.conf";

class SystemInfo : public PrivateRoot {
 protected:
  static int SetKey(const char* key, const char* value) { return QLIBCINFOSetKeyValue(key, value); }
  static bool Holds(const char* key, const char* value) {
    return QLIBCFileCheckKeyValue(Path(kFile).c_str(), key, value, 0) == 1;
  }
};

TEST_F(SystemInfo, NewKeyIsAddedAtTheEnd) {
  Write(kFile, "a=\"1\"\n");
  EXPECT_EQ(SetKey("b", "two words"), 0);
  EXPECT_EQ(Read(kFile), "a=\"1\"\nb=\"two words\"\n");
}

TEST_F(SystemInfo, NewKeyHasALineOfItsOwnBehindAnUnfinishedOne) {
  Write(kFile, "a=\"1\"");
  EXPECT_EQ(SetKey("b", "2"), 0);
  EXPECT_EQ(Read(kFile), "a=\"1\"\nb=\"2\"\n");
}

TEST_F(SystemInfo, OtherLinesAndCommentsStay) {
  Write(kFile, "# head\n\n a = 1\nb=2 # why\n# b=9\nbc=3\nno line of ours\n");
  EXPECT_EQ(SetKey("b", "4"), 0);
  EXPECT_EQ(Read(kFile), "# head\n\n a = 1\nb=\"4\" # why\n# b=9\nbc=3\nno line of ours\n");
  EXPECT_EQ(SetKey("a", ""), 0);
  EXPECT_EQ(Read(kFile), "# head\n\na=\"\"\nb=\"4\" # why\n# b=9\nbc=3\nno line of ours\n");
}

TEST_F(SystemInfo, CommentIsToldFromAValue) {
  Write(kFile, "a=\"x # y\"\nb='z' # c\nc=x#y\nd=# all\n");
  for (const char* key : {"a", "b", "c", "d"}) {
    EXPECT_EQ(SetKey(key, "v"), 0);
  }
  EXPECT_EQ(Read(kFile), "a=\"v\"\nb=\"v\" # c\nc=\"v\"\nd=\"v\" # all\n");
}

TEST_F(SystemInfo, OfTwoLinesTheOneThatCountsIsChanged) {
  Write(kFile, "a=1\na=2\n");
  EXPECT_EQ(SetKey("a", "3"), 0);
  EXPECT_TRUE(Holds("a", "3"));
  EXPECT_EQ(Read(kFile), "a=1\na=\"3\"\n");
}

TEST_F(SystemInfo, EveryValueThatIsTakenReadsBack) {
  for (const char* value : {"", " ", "it's", "say \"x\"", "a=b", "# no comment", "$HOME", "ä"}) {
    EXPECT_EQ(SetKey("key", value), 0) << value;
    EXPECT_TRUE(Holds("key", value)) << value << " in " << Read(kFile);
  }
}

TEST_F(SystemInfo, WhatNoLineCanHoldIsRefused) {
  const std::string before = Read(kFile);
  EXPECT_LT(SetKey("key", "two\nlines"), 0);
  EXPECT_LT(SetKey("key", "both ' and \""), 0);
  for (const char* key : {"", "a b", "a=b", "#a", "a\nb", "ä"}) {
    EXPECT_LT(SetKey(key, "x"), 0) << key;
  }
  EXPECT_LT(SetKey(nullptr, "x"), 0);
  EXPECT_LT(SetKey("key", nullptr), 0);
  EXPECT_LT(SetKey("key", std::string(1 << 20, 'x').c_str()), 0);
  EXPECT_EQ(Read(kFile), before);
}

TEST_F(SystemInfo, MissingFileIsMadeReadableForAll) {
  std::filesystem::remove(Path(kFile));
  EXPECT_EQ(SetKey("a", "1"), 0);
  EXPECT_EQ(Read(kFile), "a=\"1\"\n");
  EXPECT_EQ(Status(kFile).st_mode & 07777, 0644u);
}

TEST_F(SystemInfo, ModeAndGroupStay) {
  Write(kFile, "a=1\n", 0640);
  if (IsRoot()) {
    ASSERT_EQ(chown(Path(kFile).c_str(), 0, 34), 0);
  }
  const struct stat before = Status(kFile);
  EXPECT_EQ(SetKey("a", "2"), 0);
  EXPECT_EQ(Status(kFile).st_mode, before.st_mode);
  EXPECT_EQ(Status(kFile).st_uid, before.st_uid);
  EXPECT_EQ(Status(kFile).st_gid, before.st_gid);
  EXPECT_NE(Status(kFile).st_ino, before.st_ino);  // readers see the old or the new text
}

TEST_F(SystemInfo, LinkIsFollowedAndStays) {
  Write("etc/elsewhere.conf", "a=1\n");
  std::filesystem::remove(Path(kFile));
  std::filesystem::create_symlink(Path("etc/elsewhere.conf"), Path(kFile));
  EXPECT_EQ(SetKey("a", "2"), 0);
  EXPECT_TRUE(std::filesystem::is_symlink(Path(kFile)));
  EXPECT_EQ(Read("etc/elsewhere.conf"), "a=\"2\"\n");
}

TEST_F(SystemInfo, WhatIsNoFileOrTooLargeIsLeftAlone) {
  const std::string large = "a=1\n" + std::string(1 << 20, '#');
  Write(kFile, large);
  EXPECT_LT(SetKey("a", "2"), 0);
  EXPECT_EQ(Read(kFile), large);
  std::filesystem::remove(Path(kFile));
  std::filesystem::create_directory(Path(kFile));
  EXPECT_LT(SetKey("a", "2"), 0);
  std::filesystem::remove(Path(kFile));
}

TEST_F(SystemInfo, NothingButTheFileIsLeft) {
  const int before = CountFiles("etc");
  SetKey("a", "1");
  SetKey("a", "two\nlines");
  EXPECT_EQ(CountFiles("etc"), before);
}

TEST_F(SystemInfo, LockThatIsHeldEndsInAFailure) {
  const QELO::UniqueFd holder(open(Path("etc").c_str(), O_RDONLY | O_DIRECTORY));
  ASSERT_EQ(flock(holder.Get(), LOCK_EX), 0);
  EXPECT_LT(SetKey("a", "1"), 0);
}

TEST_F(SystemInfo, UserWithoutTheRightFails) {
  if (!IsRoot()) {
    GTEST_SKIP() << "needs root";
  }
  const std::string before = Read(kFile);
  EXPECT_EQ(
      InChild([] { return setresuid(4242, 4242, 4242) == 0 && SetKey("a", "1") < 0 ? 0 : 1; }), 0);
  EXPECT_EQ(Read(kFile), before);
}

TEST_F(SystemInfo, WritersAtOnceLoseNothing) {
  Write(kFile, "");
  std::vector<pid_t> children;
  for (int writer = 0; writer < 4; ++writer) {
    const pid_t child = fork();
    if (child == 0) {
      bool good = true;
      for (int i = 0; i < 25; ++i) {
        good = SetKey(("k" + std::to_string(writer * 25 + i)).c_str(), "v") == 0 && good;
      }
      _exit(good ? 0 : 1);
    }
    children.push_back(child);
  }
  for (const pid_t child : children) {
    int status = -1;
    waitpid(child, &status, 0);
    EXPECT_EQ(status, 0);
  }
  for (int i = 0; i < 100; ++i) {
    EXPECT_TRUE(Holds(("k" + std::to_string(i)).c_str(), "v")) << i;
  }
}

}  // namespace
