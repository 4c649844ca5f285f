// Temporary files: private, without a name while they grow, and gone with their process.

#include "platform/multipart/TemporaryFile.h"

#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <filesystem>
#include <functional>

#include "platform/base/Secrets.h"
#include "tests/unit/base/TemporaryDir.h"

namespace QELO::Platform {
namespace {

namespace fs = std::filesystem;

class Temporary : public TemporaryDir {
 protected:
  void SetUp() override {
    ASSERT_EQ(chmod(directory_.c_str(), 01777), 0);
    folder = std::make_shared<TemporaryFolder>();
    ASSERT_TRUE(folder->Open(directory_.c_str()));
  }
  static bool IsRoot() { return geteuid() == 0; }
  static std::string AnyName() { return kTemporaryPrefix + makeSecret(); }
  bool Opens(const std::string& name) const { return TemporaryFolder().Open(Path(name).c_str()); }
  /// @return the exit status of a forked child, -1 when it was killed
  static int InChild(const std::function<int()>& body) {
    const pid_t child = fork();
    if (child == 0) {
      _exit(body());
    }
    int status = 0;
    return waitpid(child, &status, 0) == child && WIFEXITED(status) ? WEXITSTATUS(status) : -1;
  }

  std::shared_ptr<TemporaryFolder> folder;
};

TEST_F(Temporary, FileHasNoNameUntilItIsKept) {
  const auto file = TemporaryFile::Create(folder, std::nullopt);
  ASSERT_TRUE(file);
  EXPECT_TRUE(file->Write("content"));
  EXPECT_EQ(file->Path(), "");
  EXPECT_EQ(Files(), 0);
  ASSERT_TRUE(file->Keep());
  EXPECT_EQ(Files(), 1);
  EXPECT_EQ(file->Path().rfind(Path("webapi-upload-"), 0), 0U);
  EXPECT_EQ(Content(fs::path(file->Path()).filename()), "content");
  struct stat info {};
  ASSERT_EQ(stat(file->Path().c_str(), &info), 0);
  EXPECT_EQ(info.st_mode, S_IFREG | 0600U);
}

TEST_F(Temporary, FileGoesWithItsObject) {
  auto file = TemporaryFile::Create(folder, std::nullopt);
  ASSERT_TRUE(file->Keep());
  file.reset();
  EXPECT_EQ(Files(), 0);
}

TEST_F(Temporary, RenamedFileStays) {
  auto file = TemporaryFile::Create(folder, std::nullopt);
  ASSERT_TRUE(file->Keep());
  fs::rename(file->Path(), Path("kept"));
  file.reset();
  EXPECT_TRUE(fs::exists(Path("kept")));
}

TEST_F(Temporary, ForkedChildLeavesItsParentsFile) {
  auto file = TemporaryFile::Create(folder, std::nullopt);
  ASSERT_TRUE(file->Keep());
  EXPECT_EQ(InChild([&] {
              file.reset();
              return 0;
            }),
            0);
  EXPECT_EQ(Files(), 1);
}

TEST_F(Temporary, FileIsItsOwners) {
  if (!IsRoot()) {
    GTEST_SKIP() << "needs root";
  }
  const auto file = TemporaryFile::Create(folder, FileOwner{1002, 1003});
  ASSERT_TRUE(file && file->Keep());
  struct stat info {};
  ASSERT_EQ(stat(file->Path().c_str(), &info), 0);
  EXPECT_EQ(info.st_uid, 1002U);
  EXPECT_EQ(info.st_gid, 1003U);
  EXPECT_EQ(info.st_mode, S_IFREG | 0600U);
}

TEST_F(Temporary, FileOfAnOwnerThatItCannotHaveIsNotMade) {
  if (!IsRoot()) {
    GTEST_SKIP() << "needs root";
  }
  EXPECT_EQ(InChild([&] {
              if (setresuid(1002, 1002, 1002) != 0) {
                return 1;
              }
              return TemporaryFile::Create(folder, FileOwner{1003, 1003}) == nullptr ? 0 : 2;
            }),
            0);
}

TEST_F(Temporary, SweepRemovesWhatAKilledProcessLeft) {
  EXPECT_EQ(InChild([&] {
              const auto file = TemporaryFile::Create(folder, std::nullopt);
              file->Keep();
              return raise(SIGKILL);
            }),
            -1);
  EXPECT_EQ(Files(), 1);
  folder->Sweep();
  EXPECT_EQ(Files(), 0);
}

TEST_F(Temporary, SignalThatEndsTheProcessRemovesItsFilesFirst) {
  for (const int signal : {SIGTERM, SIGSEGV, SIGABRT}) {
    EXPECT_EQ(InChild([&] {
                for (const int each : {SIGTERM, SIGSEGV, SIGABRT}) {
                  std::signal(each, SIG_DFL);  // a sanitizer's own
                }
                const auto renamed = TemporaryFile::Create(folder, std::nullopt);
                auto gone = TemporaryFile::Create(folder, std::nullopt);
                const auto file = TemporaryFile::Create(folder, std::nullopt);
                if (!renamed->Keep() || !gone->Keep() || !file->Keep()) {
                  return 1;
                }
                gone.reset();
                fs::rename(renamed->Path(), Path("renamed"));
                return raise(signal);
              }),
              -1);
    EXPECT_EQ(Files(), 1) << signal;
  }
}

TEST_F(Temporary, ForkedChildThatASignalEndsLeavesItsParentsFile) {
  const auto file = TemporaryFile::Create(folder, std::nullopt);
  ASSERT_TRUE(file->Keep());
  EXPECT_EQ(InChild([] { return raise(SIGTERM); }), -1);
  EXPECT_EQ(Files(), 1);
}

TEST_F(Temporary, SweepLeavesTheFilesOfTheLiving) {
  const auto file = TemporaryFile::Create(folder, std::nullopt);
  ASSERT_TRUE(file->Keep());
  folder->Sweep();
  EXPECT_EQ(Files(), 1);
}

TEST_F(Temporary, SweepLeavesWhatIsNoneOfOurs) {
  Write("other", "");
  Write("webapi-upload-", "");
  Write("webapi-upload-short", "");
  Write("target", "content");
  ASSERT_EQ(mkdir(Path(AnyName()).c_str(), 0700), 0);
  ASSERT_EQ(mkfifo(Path(AnyName()).c_str(), 0600), 0);
  ASSERT_EQ(symlink(Path("target").c_str(), Path(AnyName()).c_str()), 0);
  folder->Sweep();
  EXPECT_EQ(Files(), 7);
  EXPECT_EQ(Content("target"), "content");
}

TEST_F(Temporary, SweepOfALinkedFileTakesTheLinkAlone) {
  Write("victim", "content");
  ASSERT_EQ(link(Path("victim").c_str(), Path(AnyName()).c_str()), 0);
  folder->Sweep();
  EXPECT_EQ(Content("victim"), "content");
}

TEST_F(Temporary, FolderThatOthersMayWriteToHasTheStickyBit) {
  fs::create_directory(Path("folder"));
  ASSERT_EQ(chmod(Path("folder").c_str(), 0777), 0);
  EXPECT_FALSE(Opens("folder"));
  EXPECT_EQ(errno, EPERM);
  ASSERT_EQ(chmod(Path("folder").c_str(), 01777), 0);
  EXPECT_TRUE(Opens("folder"));
  ASSERT_EQ(chmod(Path("folder").c_str(), 0770), 0);
  EXPECT_FALSE(Opens("folder"));
  ASSERT_EQ(chmod(Path("folder").c_str(), 0700), 0);
  EXPECT_TRUE(Opens("folder"));
}

TEST_F(Temporary, FolderAndLinksToItAreRootsOrOurs) {
  if (!IsRoot()) {
    GTEST_SKIP() << "needs root";
  }
  fs::create_directory(Path("folder"));
  ASSERT_EQ(symlink("folder", Path("link").c_str()), 0);
  EXPECT_TRUE(Opens("link"));
  ASSERT_EQ(lchown(Path("link").c_str(), 1002, 1002), 0);
  EXPECT_FALSE(Opens("link"));
  ASSERT_EQ(chown(Path("folder").c_str(), 1002, 1002), 0);
  EXPECT_FALSE(Opens("folder"));
}

TEST_F(Temporary, WhatIsNoFolderIsNotOpened) {
  Write("file", "");
  EXPECT_FALSE(Opens("file"));
  EXPECT_FALSE(Opens("missing"));
}

}  // namespace
}  // namespace QELO::Platform
