#include "paths/NewFile.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>
#include <cstdarg>

#include "SharedFolder.h"
#include "paths/VirtualPath.h"

using namespace files;

namespace fs = std::filesystem;

namespace {

bool hasNamelessFiles = true;

int openIt(int folder, const char* path, int flags, va_list arguments) {
  if (!hasNamelessFiles && (flags & O_TMPFILE) == O_TMPFILE) {
    errno = EOPNOTSUPP;
    return -1;
  }
  const int mode = (flags & (O_CREAT | __O_TMPFILE)) != 0 ? va_arg(arguments, int) : 0;
  return static_cast<int>(syscall(SYS_openat, folder, path, flags, mode));
}

}  // namespace

/// Stand for the C library's: not every file system has files without names.
extern "C" int openat(int folder, const char* path, int flags, ...) {
  va_list arguments;
  va_start(arguments, flags);
  const int opened = openIt(folder, path, flags, arguments);
  va_end(arguments);
  return opened;
}
namespace {

class NewFileTest : public SharedFolder {
 protected:
  void Fill(NewFile& file, const std::string& text) const {
    ASSERT_EQ(file.Make(folder_), Reason::kNone);
    ASSERT_EQ(write(file.Get(), text.data(), text.size()), static_cast<ssize_t>(text.size()));
  }
  long Names() const { return std::distance(fs::directory_iterator(Path("")), {}); }
};

}  // namespace

TEST_F(NewFileTest, HasItsNameWhenItIsWhole) {
  bool isSkipped = false;
  NewFile file;
  Fill(file, "new");
  EXPECT_FALSE(IsThere("file"));
  ASSERT_EQ(file.Finish("file", Existing::kRefuse, isSkipped), Reason::kNone);
  EXPECT_EQ(Content(Path("file")), "new");
  EXPECT_FALSE(isSkipped);
  EXPECT_EQ(Names(), 1);
}

TEST_F(NewFileTest, LeavesNothingWhenItIsDropped) {
  {
    NewFile file;
    Fill(file, "new");
  }
  EXPECT_EQ(Names(), 0);
}

TEST_F(NewFileTest, WhatIsThereStaysOrIsReplacedWhole) {
  Write(Path("file"), "old");
  const int reader = open(Path("file").c_str(), O_RDONLY | O_CLOEXEC);
  bool isSkipped = false;
  {
    NewFile file;
    Fill(file, "new");
    EXPECT_EQ(file.Finish("file", Existing::kRefuse, isSkipped), Reason::kExists);
    EXPECT_EQ(file.Finish("file", Existing::kSkip, isSkipped), Reason::kNone);
    EXPECT_TRUE(isSkipped);
    EXPECT_EQ(Content(Path("file")), "old");
    EXPECT_EQ(file.Finish("file", Existing::kReplace, isSkipped), Reason::kNone);
  }
  EXPECT_EQ(Content(Path("file")), "new");
  char text[4] = {};
  EXPECT_EQ(read(reader, text, 3), 3);
  EXPECT_STREQ(text, "old") << "who reads the old one goes on to";
  close(reader);
  EXPECT_EQ(Names(), 1);
}

TEST_F(NewFileTest, ReplacesNoFolderAndNoTargetOfALink) {
  MakeFolder("folder");
  fs::create_symlink(Outside("secret"), Path("link"));
  bool isSkipped = false;
  NewFile file;
  Fill(file, "new");
  EXPECT_EQ(file.Finish("folder", Existing::kReplace, isSkipped), Reason::kNotAFile);
  ASSERT_EQ(file.Finish("link", Existing::kReplace, isSkipped), Reason::kNone);
  EXPECT_EQ(Content(Outside("secret")), "secret");
  EXPECT_FALSE(fs::is_symlink(Path("link")));
}

TEST_F(NewFileTest, WritesIntoNoHardLink) {
  fs::create_hard_link(Outside("secret"), Path("hard"));
  bool isSkipped = false;
  NewFile file;
  Fill(file, "new");
  ASSERT_EQ(file.Finish("hard", Existing::kReplace, isSkipped), Reason::kNone);
  EXPECT_EQ(Content(Path("hard")), "new");
  EXPECT_EQ(Content(Outside("secret")), "secret");
}

TEST_F(NewFileTest, HasThePermissionsOfANewFile) {
  const mode_t before = umask(027);
  bool isSkipped = false;
  NewFile file;
  Fill(file, "new");
  umask(before);
  ASSERT_EQ(file.Finish("file", Existing::kRefuse, isSkipped), Reason::kNone);
  struct stat info {};
  ASSERT_EQ(stat(Path("file").c_str(), &info), 0);
  EXPECT_EQ(info.st_mode & 07777, 0640U);
}

TEST_F(NewFileTest, WhereFilesNeedNames_HasOneOfItsOwnUntilItIsWhole) {
  hasNamelessFiles = false;
  bool isSkipped = false;
  Write(Path("file"), "old");
  {
    NewFile file;
    Fill(file, "new");
    ASSERT_EQ(Names(), 2);
    for (const fs::directory_entry& entry : fs::directory_iterator(Path(""))) {
      EXPECT_TRUE(entry.path().filename() == "file" || isTemporaryName(entry.path().filename()));
    }
    EXPECT_EQ(file.Finish("file", Existing::kRefuse, isSkipped), Reason::kExists);
  }
  EXPECT_EQ(Names(), 1) << "one that is dropped is gone";
  NewFile file;
  Fill(file, "new");
  EXPECT_EQ(file.Finish("file", Existing::kReplace, isSkipped), Reason::kNone);
  EXPECT_EQ(Content(Path("file")), "new");
  NewFile other;
  Fill(other, "other");
  EXPECT_EQ(other.Finish("other", Existing::kRefuse, isSkipped), Reason::kNone);
  EXPECT_EQ(Names(), 2);
  hasNamelessFiles = true;
}

TEST(TemporaryName, IsAnotherEachTime) {
  const std::string name = temporaryName();
  EXPECT_TRUE(name.starts_with(".qelo-part-"));
  EXPECT_EQ(name.size(), 11U + 32U);
  EXPECT_NE(name, temporaryName());
}
