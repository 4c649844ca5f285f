#include "work/Walks.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <atomic>
#include <thread>

#include "SharedFolder.h"
#include "paths/VirtualPath.h"

using namespace files;

namespace fs = std::filesystem;

namespace {

class WalksTest : public SharedFolder {
 protected:
  Stand At(const std::string& name) const { return {folder_, name, "/share/" + name}; }
  bool Remove(const std::string& name) { return removeItem(At(name), report_); }
  /// Copies into the folder "to".
  bool Copy(const std::string& name, Existing existing = Existing::kRefuse, bool isMoving = false) {
    Folder to;
    EXPECT_EQ(folder_.Enter("to", to), Reason::kNone);
    return Transfer(to, existing, isMoving, report_).Do(At(name), name);
  }
  bool Move(const std::string& name, Existing existing = Existing::kRefuse) {
    return Copy(name, existing, true);
  }
  /// "path reason" of what failed, each with a blank behind it.
  std::string Failures() const {
    std::string all;
    const Json::Value data = report_.Json();
    for (const Json::Value& error : data["errors"]) {
      all += error["path"].asString() + " " + error["reason"].asString() + " ";
    }
    return all;
  }
  std::string Done() const {
    const Json::Value items = report_.Json()["items"];
    return items["done"].asString();
  }
  /// A folder in a folder, and so on.
  void MakeDeep(const std::string& name, size_t depth) const {
    int at = open(Path("").c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC);
    for (size_t i = 0; i < depth; ++i) {
      const std::string child = i == 0 ? name : "d";
      ASSERT_EQ(mkdirat(at, child.c_str(), 0777), 0);
      const int inner = openat(at, child.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC);
      close(at);
      at = inner;
    }
    close(at);
  }

  Report report_{"working"};
};

}  // namespace

TEST_F(WalksTest, RemovesAFolderWithAllThatIsInIt) {
  MakeFolder("a/b/c");
  Write(Path("a/b/file"), "x");
  fs::create_symlink(Outside(""), Path("a/link"));
  ASSERT_EQ(mkfifo(Path("a/pipe").c_str(), 0666), 0);
  EXPECT_TRUE(Remove("a"));
  EXPECT_FALSE(IsThere("a"));
  EXPECT_TRUE(fs::exists(Outside("secret"))) << "a link's target stays";
  EXPECT_EQ(Done(), "6");
}

TEST_F(WalksTest, RemovesALinkToAFolderAlone) {
  fs::create_symlink(Outside(""), Path("link"));
  EXPECT_TRUE(Remove("link"));
  EXPECT_TRUE(fs::exists(Outside("secret")));
}

TEST_F(WalksTest, RemovesManyFiles) {
  MakeFolder("many");
  for (int i = 0; i < 3000; ++i) {
    Write(Path("many/" + std::to_string(i)), "");
  }
  EXPECT_TRUE(Remove("many"));
  EXPECT_FALSE(IsThere("many"));
}

TEST_F(WalksTest, DepthHasALimit) {
  MakeDeep("deep", VirtualPath::kDeepestWalk + 1);
  EXPECT_TRUE(Remove("deep")) << "the deepest one is removed unread";
  EXPECT_EQ(Failures(), "");
  MakeDeep("deep", VirtualPath::kDeepestWalk + 3);
  EXPECT_FALSE(Remove("deep"));
  EXPECT_NE(Failures().find(" too_deep "), std::string::npos);
  MakeFolder("to");
  EXPECT_FALSE(Copy("deep"));
}

TEST_F(WalksTest, RemovalThatMeetsAPlantedLinkLeavesItsTarget) {
  for (int i = 0; i < 50; ++i) {
    MakeFolder("victim");
    fs::create_symlink(Outside(""), Path("link"));
    std::atomic<bool> ends = false;
    std::thread planter([&] {
      while (!ends) {
        renameat2(AT_FDCWD, Path("victim").c_str(), AT_FDCWD, Path("link").c_str(),
                  RENAME_EXCHANGE);
      }
    });
    Remove("victim");
    Remove("link");
    ends = true;
    planter.join();
    fs::remove_all(Path("victim"));
    fs::remove_all(Path("link"));
  }
  EXPECT_EQ(Content(Outside("secret")), "secret");
}

TEST_F(WalksTest, CopiesATreeAsItIs) {
  MakeFolder("to");
  MakeFolder("a/inner");
  Write(Path("a/file"), "text");
  Write(Path("a/inner/empty"), "");
  fs::create_symlink("file", Path("a/link"));
  chmod(Path("a/file").c_str(), 04750);
  chmod(Path("a/inner").c_str(), 0711);
  const timespec times[] = {{0, 0}, {1000, 5}};
  ASSERT_EQ(utimensat(AT_FDCWD, Path("a/file").c_str(), times, 0), 0);
  EXPECT_TRUE(Copy("a")) << Failures();
  EXPECT_EQ(Content(Path("to/a/file")), "text");
  EXPECT_TRUE(IsThere("to/a/inner/empty"));
  EXPECT_EQ(fs::read_symlink(Path("to/a/link")), "file");
  struct stat info {};
  ASSERT_EQ(stat(Path("to/a/file").c_str(), &info), 0);
  EXPECT_EQ(info.st_mode & 07777, 0750U) << "no program becomes another user's";
  EXPECT_EQ(info.st_mtim.tv_sec, 1000);
  EXPECT_EQ(info.st_mtim.tv_nsec, 5);
  ASSERT_EQ(stat(Path("to/a/inner").c_str(), &info), 0);
  EXPECT_EQ(info.st_mode & 0777, 0711U);
  EXPECT_EQ(Done(), "5");
}

TEST_F(WalksTest, CopyKeepsHoles) {
  MakeFolder("to");
  const int file = open(Path("sparse").c_str(), O_CREAT | O_WRONLY | O_CLOEXEC, 0600);
  ASSERT_EQ(pwrite(file, "x", 1, 64 << 20), 1);
  ASSERT_EQ(ftruncate(file, 128 << 20), 0);
  close(file);
  EXPECT_TRUE(Copy("sparse"));
  struct stat info {};
  ASSERT_EQ(stat(Path("to/sparse").c_str(), &info), 0);
  EXPECT_EQ(info.st_size, 128 << 20);
  EXPECT_LT(info.st_blocks * 512, 8 << 20);
}

TEST_F(WalksTest, CopyOpensNoPipe) {
  MakeFolder("to");
  ASSERT_EQ(mkfifo(Path("pipe").c_str(), 0666), 0);
  EXPECT_FALSE(Copy("pipe"));
  EXPECT_EQ(Failures(), "/share/pipe special ");
}

TEST_F(WalksTest, CopyRefusesSkipsOrReplacesWhatIsThere) {
  MakeFolder("to");
  Write(Path("file"), "new");
  Write(Path("to/file"), "old");
  EXPECT_FALSE(Copy("file"));
  EXPECT_EQ(Failures(), "/share/file exists ");
  EXPECT_TRUE(Copy("file", Existing::kSkip));
  EXPECT_EQ(Content(Path("to/file")), "old");
  EXPECT_TRUE(Copy("file", Existing::kReplace));
  EXPECT_EQ(Content(Path("to/file")), "new");
  EXPECT_EQ(Content(Path("file")), "new");
}

TEST_F(WalksTest, CopyIntoAFolderOfThatNameGoesOnInIt) {
  MakeFolder("a");
  MakeFolder("to/a");
  Write(Path("a/new"), "1");
  Write(Path("a/both"), "new");
  Write(Path("to/a/both"), "old");
  EXPECT_FALSE(Copy("a"));
  EXPECT_FALSE(IsThere("to/a/new"));
  EXPECT_TRUE(Copy("a", Existing::kSkip));
  EXPECT_TRUE(IsThere("to/a/new"));
  EXPECT_EQ(Content(Path("to/a/both")), "old");
  EXPECT_TRUE(Copy("a", Existing::kReplace));
  EXPECT_EQ(Content(Path("to/a/both")), "new");
}

TEST_F(WalksTest, FolderReplacesNoFileAndAFileNoFolder) {
  MakeFolder("a");
  MakeFolder("to/b");
  Write(Path("b"), "file");
  Write(Path("to/a"), "file");
  for (const bool isMoving : {false, true}) {
    EXPECT_FALSE(Copy("a", Existing::kReplace, isMoving));
    EXPECT_FALSE(Copy("b", Existing::kReplace, isMoving));
  }
  EXPECT_EQ(Content(Path("to/a")), "file");
  EXPECT_TRUE(fs::is_directory(Path("to/b")));
}

TEST_F(WalksTest, FolderGoesNotIntoItself) {
  MakeFolder("a/to");
  Write(Path("a/file"), "x");
  Folder to;
  ASSERT_EQ(folder_.Enter("a/to", to), Reason::kNone);
  EXPECT_FALSE(Transfer(to, Existing::kReplace, false, report_).Do(At("a"), "a"));
  EXPECT_NE(Failures().find("into_itself"), std::string::npos);
  EXPECT_FALSE(IsThere("a/to/a/to"));
}

TEST_F(WalksTest, FolderIsNotMovedIntoItself) {
  MakeFolder("a/to");
  Write(Path("a/file"), "x");
  Folder to;
  ASSERT_EQ(folder_.Enter("a/to", to), Reason::kNone);
  EXPECT_FALSE(Transfer(to, Existing::kReplace, true, report_).Do(At("a"), "a"));
  EXPECT_EQ(report_.FirstReason(), Reason::kIntoItself);
  EXPECT_TRUE(IsThere("a/file"));
}

TEST_F(WalksTest, MoveIsARenamingOrGoesOnInTheFolder) {
  MakeFolder("to/b");
  MakeFolder("a");
  MakeFolder("b");
  Write(Path("a/file"), "1");
  Write(Path("b/both"), "new");
  Write(Path("b/more"), "2");
  Write(Path("to/b/both"), "old");
  EXPECT_TRUE(Move("a"));
  EXPECT_EQ(Content(Path("to/a/file")), "1");
  EXPECT_FALSE(IsThere("a"));
  EXPECT_FALSE(Move("b"));
  EXPECT_TRUE(IsThere("b/more"));
  EXPECT_TRUE(Move("b", Existing::kReplace)) << Failures();
  EXPECT_FALSE(IsThere("b"));
  EXPECT_EQ(Content(Path("to/b/both")), "new");
  EXPECT_TRUE(IsThere("to/b/more"));
}

TEST_F(WalksTest, MoveThatSkipsLeavesWhatWasSkipped) {
  MakeFolder("to");
  Write(Path("file"), "new");
  Write(Path("to/file"), "old");
  EXPECT_TRUE(Move("file", Existing::kSkip));
  EXPECT_EQ(Content(Path("file")), "new");
  EXPECT_EQ(Content(Path("to/file")), "old");
  EXPECT_EQ(report_.Json()["skipped"].asString(), "1");
}

TEST_F(WalksTest, MoveToAnotherFileSystemCopiesAndTakesAway) {
  std::string place = "/dev/shm/files-XXXXXX";
  if (mkdtemp(place.data()) == nullptr) {
    GTEST_SKIP() << "there is no other file system";
  }
  MakeFolder("a/inner");
  Write(Path("a/inner/file"), "text");
  Write(Path("a/both"), "new");
  fs::create_symlink("inner", Path("a/link"));
  ASSERT_EQ(mkfifo(Path("a/pipe").c_str(), 0666), 0);
  Folder to;
  ASSERT_EQ(Folder::OpenShare({.name = "s", .path = place, .comment = ""}, to), Reason::kNone);
  EXPECT_FALSE(Transfer(to, Existing::kRefuse, true, report_).Do(At("a"), "a"));
  EXPECT_EQ(Failures(), "/share/a/pipe special ");
  EXPECT_EQ(Content(place + "/a/inner/file"), "text");
  EXPECT_TRUE(fs::is_symlink(place + "/a/link"));
  EXPECT_FALSE(IsThere("a/inner"));
  EXPECT_FALSE(IsThere("a/link"));
  EXPECT_TRUE(IsThere("a/pipe")) << "what was not copied stays";
  fs::remove_all(place);
}

TEST_F(WalksTest, WhatIsReadOnlyIsToldAndTheRestIsDone) {
  if (geteuid() == 0) {
    GTEST_SKIP() << "root may read everything";
  }
  MakeFolder("to");
  MakeFolder("a");
  Write(Path("a/locked"), "x");
  Write(Path("a/open"), "x");
  chmod(Path("a/locked").c_str(), 0);
  EXPECT_FALSE(Copy("a"));
  EXPECT_EQ(Failures(), "/share/a/locked denied ");
  EXPECT_TRUE(IsThere("to/a/open"));
  EXPECT_FALSE(IsThere("to/a/locked"));
}

TEST_F(WalksTest, CountingCanBeEnded) {
  MakeFolder("a/b");
  Write(Path("a/file"), "four");
  uint64_t bytes = 0;
  int items = 0;
  EXPECT_TRUE(countItems(At("a"), [&](uint64_t size) {
    bytes += size;
    return ++items < 100;
  }));
  EXPECT_EQ(items, 3);
  EXPECT_EQ(bytes, 4U);
  EXPECT_FALSE(countItems(At("a"), [&](uint64_t) { return false; }));
}
