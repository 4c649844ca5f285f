#include "paths/Folder.h"

#include <fcntl.h>
#include <sys/mount.h>
#include <sys/socket.h>
#include <sys/sysmacros.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <functional>
#include <thread>

#include "SharedFolder.h"

using namespace files;

namespace fs = std::filesystem;

namespace {

std::string contentOf(const Descriptor& file) {
  char text[64] = {};
  const ssize_t count = pread(file.Get(), text, sizeof text - 1, 0);
  return count < 0 ? "unread" : text;
}

/// Runs a test's step where mounts are the process's own; 77 when that is not allowed here.
int inOwnMounts(const std::function<int()>& step) {
  const pid_t child = fork();
  if (child == 0) {
    const bool isOwn =
        unshare(CLONE_NEWNS) == 0 && mount("none", "/", nullptr, MS_REC | MS_PRIVATE, nullptr) == 0;
    _exit(isOwn ? step() : 77);
  }
  int status = 0;
  waitpid(child, &status, 0);
  return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

}  // namespace

using FolderTest = SharedFolder;

TEST_F(FolderTest, OpensFilesBelow) {
  MakeFolder("a/b");
  Write(Path("a/b/file"), "text");
  Folder inner;
  Descriptor file;
  Item item;
  ASSERT_EQ(folder_.Enter("a/b", inner), Reason::kNone);
  ASSERT_EQ(inner.OpenFile("file", file, item), Reason::kNone);
  EXPECT_EQ(contentOf(file), "text");
  EXPECT_EQ(item.size, 4U);
  EXPECT_EQ(item.name, "file");
  EXPECT_TRUE(item.IsFile());
}

TEST_F(FolderTest, WhatIsMissingOrOfAnotherKindIsTold) {
  Write(Path("file"), "text");
  MakeFolder("folder");
  Folder inner;
  Descriptor file;
  Item item;
  EXPECT_EQ(folder_.Enter("none", inner), Reason::kNotFound);
  EXPECT_EQ(folder_.Enter("file", inner), Reason::kNotAFolder);
  EXPECT_EQ(folder_.Enter("file/below", inner), Reason::kNotAFolder);
  EXPECT_EQ(folder_.OpenFile("none", file, item), Reason::kNotFound);
  EXPECT_EQ(folder_.OpenFile("folder", file, item), Reason::kNotAFile);
}

TEST_F(FolderTest, NothingLeadsAbove) {
  Folder inner;
  Descriptor file;
  Item item;
  MakeFolder("a");
  for (const char* below : {"..", "../outside", "a/../..", "a/../../outside", "/etc", "/"}) {
    EXPECT_EQ(folder_.Enter(below, inner), Reason::kMount) << below;
  }
  EXPECT_EQ(folder_.OpenFile("../outside/secret", file, item), Reason::kMount);
}

TEST_F(FolderTest, LinksAreNotFollowed) {
  MakeFolder("a");
  Write(Path("a/file"), "text");
  fs::create_symlink(Outside("secret"), Path("out"));
  fs::create_symlink(Outside(""), Path("outdir"));
  fs::create_symlink("a", Path("indir"));
  fs::create_symlink("a/file", Path("in"));
  fs::create_symlink("/proc/self/root", Path("magic"));
  Folder inner;
  Descriptor file;
  Item item;
  for (const char* name : {"outdir", "indir", "magic", "outdir/x", "magic/etc"}) {
    EXPECT_EQ(folder_.Enter(name, inner), Reason::kLink) << name;
  }
  for (const char* name : {"out", "in", "outdir", "outdir/secret", "indir/file"}) {
    EXPECT_EQ(folder_.OpenFile(name, file, item), Reason::kLink) << name;
  }
  ASSERT_EQ(folder_.Look("out", item), Reason::kNone);
  EXPECT_EQ(item.type, ItemType::kLink);
  EXPECT_EQ(item.size, 0U) << "nothing of what it leads to is told";
}

TEST_F(FolderTest, SharedFolderReplacedByALinkIsRefused) {
  const fs::path other = around_ / "other";
  fs::rename(Path("").parent_path(), other);
  fs::create_symlink(Outside("").parent_path(), around_ / "share");
  Folder again;
  EXPECT_EQ(Folder::OpenShare(share_, again), Reason::kShareBroken);
  Item item;
  EXPECT_EQ(folder_.Look("secret", item), Reason::kNotFound) << "the folder that was opened stays";
}

TEST_F(FolderTest, SharedFolderBehindALinkIsRefused) {
  fs::create_symlink(around_, around_ / "outside/way");
  Folder again;
  EXPECT_EQ(Folder::OpenShare({.name = "s", .path = Outside("way/share"), .comment = ""}, again),
            Reason::kShareBroken);
  EXPECT_EQ(Folder::OpenShare({.name = "s", .path = Outside("secret"), .comment = ""}, again),
            Reason::kShareBroken);
  EXPECT_EQ(Folder::OpenShare({.name = "s", .path = Outside("none"), .comment = ""}, again),
            Reason::kShareBroken);
}

TEST_F(FolderTest, PipesDevicesAndSocketsAreNotOpened) {
  ASSERT_EQ(mkfifo(Path("pipe").c_str(), 0666), 0);
  const int listener = socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0);
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  snprintf(address.sun_path, sizeof address.sun_path, "%s", Path("socket").c_str());
  ASSERT_EQ(bind(listener, reinterpret_cast<sockaddr*>(&address), sizeof address), 0);
  close(listener);
  Descriptor file;
  Item item;
  EXPECT_EQ(folder_.OpenFile("pipe", file, item), Reason::kSpecial) << "and nobody waits";
  EXPECT_EQ(folder_.OpenFile("socket", file, item), Reason::kSpecial);
  ASSERT_EQ(folder_.Look("pipe", item), Reason::kNone);
  EXPECT_EQ(item.type, ItemType::kSpecial);
  if (mknod(Path("null").c_str(), S_IFCHR | 0666, makedev(1, 3)) == 0) {
    EXPECT_EQ(folder_.OpenFile("null", file, item), Reason::kSpecial);
  }
}

TEST_F(FolderTest, HardLinksAreFilesLikeOthers) {
  fs::create_hard_link(Outside("secret"), Path("hard"));
  Descriptor file;
  Item item;
  ASSERT_EQ(folder_.OpenFile("hard", file, item), Reason::kNone);
  EXPECT_EQ(item.links, 2U);
}

TEST_F(FolderTest, MountsAreNotEntered) {
  MakeFolder("mnt");
  Write(Path("file"), "below");
  Write(Path("bound"), "");
  const int result = inOwnMounts([&] {
    if (mount("none", Path("mnt").c_str(), "tmpfs", 0, "size=64k") != 0 ||
        mount(Outside("secret").c_str(), Path("bound").c_str(), nullptr, MS_BIND, nullptr) != 0) {
      return 77;
    }
    Folder folder;  // in these mounts
    Folder inner;
    Descriptor file;
    Item item;
    if (Folder::OpenShare(share_, folder) != Reason::kNone ||
        folder.Enter("mnt", inner) != Reason::kMount) {
      return 1;
    }
    if (folder.OpenFile("bound", file, item) != Reason::kMount) {
      return 2;
    }
    if (folder.Look("mnt", item) != Reason::kNone || item.type != ItemType::kMount) {
      return 3;
    }
    if (folder.Look("bound", item) != Reason::kNone || item.type != ItemType::kMount ||
        item.size != 0) {
      return 4;
    }
    return folder.RemoveFolder("mnt") == Reason::kBusy ? 0 : 5;
  });
  if (result == 77) {
    GTEST_SKIP() << "mounts take root's rights";
  }
  EXPECT_EQ(result, 0);
}

TEST_F(FolderTest, LinkPlantedDuringTheCallLeadsNowhere) {
  MakeFolder("swap");
  Write(Path("swap/secret"), "mine");
  fs::create_symlink(Outside("").parent_path(), Path("link"));
  std::atomic<bool> ends = false;
  std::thread planter([&] {
    while (!ends) {  // a folder and a link take turns under one name
      renameat2(AT_FDCWD, Path("swap").c_str(), AT_FDCWD, Path("link").c_str(), RENAME_EXCHANGE);
    }
  });
  int opened = 0;
  int refused = 0;
  for (int i = 0; i < 200000 && (opened < 200 || refused < 200); ++i) {
    Folder inner;
    Descriptor file;
    Item item;
    if (folder_.Enter("swap", inner) == Reason::kNone &&
        inner.OpenFile("secret", file, item) == Reason::kNone) {
      ++opened;
      EXPECT_EQ(contentOf(file), "mine");
    } else {
      ++refused;
    }
  }
  ends = true;
  planter.join();
  EXPECT_GE(opened, 200);
  EXPECT_GE(refused, 200) << "the link was met";
}

TEST_F(FolderTest, FileReplacedBetweenCheckAndUseIsTheOneThatWasChecked) {
  Write(Path("swap"), "mine");
  ASSERT_EQ(mkfifo(Path("pipe").c_str(), 0666), 0);
  std::atomic<bool> ends = false;
  std::thread planter([&] {
    while (!ends) {
      renameat2(AT_FDCWD, Path("swap").c_str(), AT_FDCWD, Path("pipe").c_str(), RENAME_EXCHANGE);
    }
  });
  int opened = 0;
  int refused = 0;
  for (int i = 0; i < 200000 && (opened < 200 || refused < 200); ++i) {
    Descriptor file;
    Item item;
    const Reason reason = folder_.OpenFile("swap", file, item);
    if (reason == Reason::kNone) {
      ++opened;
      EXPECT_EQ(contentOf(file), "mine");
    } else {
      ++refused;
      EXPECT_EQ(reason, Reason::kSpecial);
    }
  }
  ends = true;
  planter.join();
  EXPECT_GE(opened, 200);
  EXPECT_GE(refused, 200) << "the pipe was met, and not waited for";
}

TEST_F(FolderTest, MoveReplacesNothing) {
  Write(Path("a"), "a");
  Write(Path("b"), "b");
  EXPECT_EQ(folder_.Move("a", folder_, "b"), Reason::kExists);
  EXPECT_EQ(Content(Path("b")), "b");
  EXPECT_EQ(folder_.Move("none", folder_, "c"), Reason::kNotFound);
  EXPECT_EQ(folder_.Move("a", folder_, "c"), Reason::kNone);
  EXPECT_EQ(Content(Path("c")), "a");
  EXPECT_EQ(folder_.Replace("c", folder_, "b"), Reason::kNone);
  EXPECT_EQ(Content(Path("b")), "a");
}

TEST_F(FolderTest, MoveOverALinkReplacesTheLinkAlone) {
  Write(Path("a"), "mine");
  fs::create_symlink(Outside("secret"), Path("link"));
  EXPECT_EQ(folder_.Move("a", folder_, "link"), Reason::kExists);
  EXPECT_EQ(folder_.Replace("a", folder_, "link"), Reason::kNone);
  EXPECT_EQ(Content(Outside("secret")), "secret");
  EXPECT_FALSE(fs::is_symlink(Path("link")));
}

TEST_F(FolderTest, RemovesALinkAndNotItsTarget) {
  fs::create_symlink(Outside(""), Path("link"));
  EXPECT_EQ(folder_.RemoveFolder("link"), Reason::kNotAFolder);
  EXPECT_EQ(folder_.RemoveFile("link"), Reason::kNone);
  EXPECT_TRUE(fs::exists(Outside("secret")));
}
