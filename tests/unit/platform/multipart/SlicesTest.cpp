// One file in several requests, put together by the loader of the whole upload.

#include <fcntl.h>
#include <sys/file.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>

#include "tests/unit/multipart/Form.h"
#include "tests/unit/platform/PrivateRoot.h"
#include "webapi/base/UniqueFd.h"
#include "webapi/platform/Upload.h"

namespace {

namespace fs = std::filesystem;

constexpr char kId[] = "abcdefgh-1234_XY";
constexpr uid_t kAlice = 1002;
constexpr uid_t kBob = 1003;

class Slices : public PrivateRoot {
 protected:
  void SetUp() override {
    PrivateRoot::SetUp();
    ASSERT_TRUE(fs::create_directory(Path("temp")));
    ASSERT_EQ(chmod(Path("temp").c_str(), 01777), 0);
    former_ = fcntl(STDIN_FILENO, F_DUPFD_CLOEXEC, 10);
    setenv("HTTP_X_TYPE_NAME", "sliceUpload", 1);
    setenv("CONTENT_TYPE", Form::kType, 1);
    QeloCgiUploadOwnerSet(geteuid(), getegid());
    QeloCgiUploadCallerSet(kAlice);
  }
  void TearDown() override {
    Load("");  // the files of the upload before go
    for (const char* name : {"HTTP_X_TYPE_NAME", "HTTP_X_UPLOAD_ID", "HTTP_X_FILE_SIZE",
                             "HTTP_X_SLICE_OFFSET", "CONTENT_TYPE", "CONTENT_LENGTH"}) {
      unsetenv(name);
    }
    dup2(former_, STDIN_FILENO);
    close(former_);
    QLIBCSzHashFree(fields);
    QLIBCSzHashFree(files);
  }

  static void Give(const std::string& body, size_t length = 0) {
    const int fd = memfd_create("body", MFD_CLOEXEC);
    EXPECT_EQ(write(fd, body.data(), body.size()), static_cast<ssize_t>(body.size()));
    lseek(fd, 0, SEEK_SET);
    dup2(fd, STDIN_FILENO);
    close(fd);
    setenv("CONTENT_LENGTH", std::to_string(length == 0 ? body.size() : length).c_str(), 1);
  }
  int Load(const std::string& body, size_t length = 0) {
    Give(body, length);
    QLIBCHashRemoveAll(fields);
    QLIBCHashRemoveAll(files);
    const int result = QeloCgiLoadUploadAll(&fields, &files, Path("temp").c_str(), 0);
    unsigned long long size = 0;
    received = 0;
    QeloCgiUploadSliceGet(&received, &size);
    return result;
  }
  /// Loads what was given, part after part.
  int TakeAll() {
    QeloCgiUploadState state{};
    char part[256];
    char field[64];
    char file[491];
    const auto next = [&] {
      return QeloCgiLoadUploadParams(&fields, nullptr, &state, part, sizeof part, field,
                                     sizeof field, file, sizeof file);
    };
    int result = next();
    while (result == QELO_UPLOAD_DONE && *part != '\0') {
      result = QeloCgiLoadUploadFileToDir(&fields, Path("temp").c_str(), nullptr, &state, part,
                                          field, file);
      EXPECT_EQ(state.result, result);
      result = result == QELO_UPLOAD_DONE ? next() : result;
    }
    unsigned long long size = 0;
    received = 0;
    QeloCgiUploadSliceGet(&received, &size);
    return result;
  }
  int TakeBody(const std::string& body) {
    Give(body);
    QLIBCHashRemoveAll(fields);
    return TakeAll();
  }
  int Take(size_t offset, const std::string& content) {
    Say(std::to_string(offset), "9");
    return TakeBody(Form::File("f", "x", content) + Form::End());
  }
  static void Say(const std::string& offset, const std::string& size, const std::string& id = kId) {
    setenv("HTTP_X_SLICE_OFFSET", offset.c_str(), 1);
    setenv("HTTP_X_FILE_SIZE", size.c_str(), 1);
    setenv("HTTP_X_UPLOAD_ID", id.c_str(), 1);
  }
  /// Loads a slice of a file of 9 bytes.
  int Add(size_t offset, const std::string& content, const std::string& id = kId) {
    Say(std::to_string(offset), "9", id);
    return Load(Form::File("f", "x", content) + Form::End());
  }
  /// How much there is, as a request without a slice asks.
  unsigned long long Ask() {
    Say("0", "9");
    EXPECT_EQ(Load(Form::Field("a", "1") + Form::End()), QELO_UPLOAD_PARTIAL);
    return received;
  }
  std::string Uploaded() const {
    const char* path = QLIBCSzHashGetValue(files, "f");
    return path == nullptr ? "(none)" : Read(std::string(path).substr(Path().size()));
  }
  static int Files() { return CountFiles("temp"); }
  static int Records() { return CountFiles("var/lib/webapi/uploads"); }

  QLIBSZHASH* fields = QLIBCSzHashAlloc(256);
  QLIBSZHASH* files = QLIBCSzHashAlloc(256);
  unsigned long long received = 0;

 private:
  int former_ = -1;
};

TEST_F(Slices, MakeOneFile) {
  EXPECT_EQ(Add(0, "1234"), QELO_UPLOAD_PARTIAL);
  EXPECT_EQ(received, 4U);
  EXPECT_EQ(Uploaded(), "(none)");
  EXPECT_EQ(Add(4, "56"), QELO_UPLOAD_PARTIAL);
  EXPECT_EQ(Add(6, "789"), QELO_UPLOAD_DONE);
  EXPECT_EQ(Uploaded(), "123456789");
  EXPECT_STREQ(QLIBCSzHashGetValue(fields, "f"), "x");
  EXPECT_EQ(Records(), 0);
  EXPECT_EQ(Files(), 1);
}

TEST_F(Slices, OneMayBeTheWhole) {
  EXPECT_EQ(Add(0, "123456789"), QELO_UPLOAD_DONE);
  EXPECT_EQ(Uploaded(), "123456789");
  Say("0", "0");
  EXPECT_EQ(Load(Form::File("f", "x", "") + Form::End()), QELO_UPLOAD_DONE);
  EXPECT_EQ(Uploaded(), "");
}

TEST_F(Slices, FileIsPrivateUntilItIsItsOwners) {
  EXPECT_EQ(Add(0, "1234"), QELO_UPLOAD_PARTIAL);
  const fs::path file = fs::directory_iterator(Path("temp"))->path();
  EXPECT_EQ(file.filename().string().rfind("webapi-partial-", 0), 0U);
  struct stat info {};
  ASSERT_EQ(stat(file.c_str(), &info), 0);
  EXPECT_EQ(info.st_mode, S_IFREG | 0600U);
  EXPECT_EQ(info.st_uid, geteuid());
  if (IsRoot()) {
    QeloCgiUploadOwnerSet(900, 900);
    EXPECT_EQ(Add(4, "56789"), QELO_UPLOAD_DONE);
    ASSERT_EQ(stat(QLIBCSzHashGetValue(files, "f"), &info), 0);
    EXPECT_EQ(info.st_uid, 900U);
  }
}

TEST_F(Slices, ThatDoNotFollowAreRefusedAndTellHowMuchThereIs) {
  EXPECT_EQ(Add(4, "5"), QELO_UPLOAD_WRONG_SLICE);
  EXPECT_EQ(received, 0U);
  EXPECT_EQ(Records(), 0);
  EXPECT_EQ(Add(0, "1234"), QELO_UPLOAD_PARTIAL);
  EXPECT_EQ(Add(0, "1234"), QELO_UPLOAD_WRONG_SLICE);
  EXPECT_EQ(received, 4U);
  EXPECT_EQ(Add(5, "6"), QELO_UPLOAD_WRONG_SLICE);
  EXPECT_EQ(Add(4, "56789"), QELO_UPLOAD_DONE);
}

TEST_F(Slices, BeyondTheWholeAreRefused) {
  EXPECT_EQ(Add(0, "1234567890"), QELO_UPLOAD_TOO_LARGE);
  EXPECT_EQ(Add(0, "1234"), QELO_UPLOAD_PARTIAL);
  EXPECT_EQ(Add(4, "567890"), QELO_UPLOAD_TOO_LARGE);
  EXPECT_EQ(Ask(), 4U);
}

TEST_F(Slices, BrokenOffAreKeptAsFarAsTheyCame) {
  Say("0", "9");
  const std::string body = Form::File("f", "x", "123456789") + Form::End();
  EXPECT_EQ(Load(body.substr(0, body.find("789")), body.size()), QELO_UPLOAD_BROKEN_OFF);
  EXPECT_EQ(Ask(), 6U);
  EXPECT_EQ(Add(6, "789"), QELO_UPLOAD_DONE);
  EXPECT_EQ(Uploaded(), "123456789");
}

TEST_F(Slices, WholeThatBrokeOffAtItsEndIsFinishedByAnEmptyOne) {
  Say("0", "9");
  const std::string body = Form::File("f", "x", "123456789") + Form::End();
  EXPECT_EQ(Load(body.substr(0, body.size() - 3), body.size()), QELO_UPLOAD_BROKEN_OFF);
  EXPECT_EQ(Ask(), 9U);
  EXPECT_EQ(Add(9, ""), QELO_UPLOAD_DONE);
  EXPECT_EQ(Uploaded(), "123456789");
}

TEST_F(Slices, NothingOfAnUnknownFileIsThere) {
  EXPECT_EQ(Ask(), 0U);
  EXPECT_EQ(Records(), 0);
}

TEST_F(Slices, OfTwoCallersAreTwoFiles) {
  EXPECT_EQ(Add(0, "1234"), QELO_UPLOAD_PARTIAL);
  QeloCgiUploadCallerSet(kBob);
  EXPECT_EQ(Add(4, "56789"), QELO_UPLOAD_WRONG_SLICE);
  EXPECT_EQ(received, 0U);
  EXPECT_EQ(Add(0, "bob's"), QELO_UPLOAD_PARTIAL);
  QeloCgiUploadCallerSet(kAlice);
  EXPECT_EQ(Add(4, "56789"), QELO_UPLOAD_DONE);
  EXPECT_EQ(Uploaded(), "123456789");
}

TEST_F(Slices, FileOfWhichNothingIsSaidIsAWholeOne) {
  EXPECT_EQ(Load(Form::File("f", "x", "1234") + Form::End()), QELO_UPLOAD_DONE);
  EXPECT_EQ(Uploaded(), "1234");
}

TEST_F(Slices, HeadersThatMakeNoSenseAreRefused) {
  const std::string body = Form::File("f", "x", "1") + Form::End();
  for (const auto& [offset, size, id] :
       {std::tuple("", "9", kId), std::tuple("0", "", kId), std::tuple("-1", "9", kId),
        std::tuple("0", "9x", kId), std::tuple("0", "9", ""), std::tuple("0", "9", "short"),
        std::tuple("0", "9", "../../../../etc/passwd"),
        std::tuple("0", "9", "with a blank 1234")}) {
    Say(offset, size, id);
    EXPECT_EQ(Load(body), QELO_UPLOAD_WRONG_SLICE) << offset << " " << size << " " << id;
  }
  Say("0", "9", std::string(65, 'i'));
  EXPECT_EQ(Load(body), QELO_UPLOAD_WRONG_SLICE);
}

TEST_F(Slices, TwoInOneBodyAreMalformed) {
  Say("0", "9");
  EXPECT_EQ(Load(Form::File("f", "x", "1") + Form::File("g", "y", "2") + Form::End()),
            QELO_UPLOAD_MALFORMED);
}

TEST_F(Slices, FileOfAnotherSizeIsBegunAnew) {
  EXPECT_EQ(Add(0, "1234"), QELO_UPLOAD_PARTIAL);
  Say("0", "2");
  EXPECT_EQ(Load(Form::File("f", "x", "ab") + Form::End()), QELO_UPLOAD_DONE);
  EXPECT_EQ(Uploaded(), "ab");
  EXPECT_EQ(Files(), 1);
}

TEST_F(Slices, FileThatIsGoneIsBegunAnew) {
  EXPECT_EQ(Add(0, "1234"), QELO_UPLOAD_PARTIAL);
  fs::remove(fs::directory_iterator(Path("temp"))->path());
  EXPECT_EQ(Add(4, "56789"), QELO_UPLOAD_WRONG_SLICE);
  EXPECT_EQ(received, 0U);
  EXPECT_EQ(Add(0, "123456789"), QELO_UPLOAD_DONE);
}

TEST_F(Slices, LinkInThePlaceOfTheFileIsNotFollowed) {
  EXPECT_EQ(Add(0, "1234"), QELO_UPLOAD_PARTIAL);
  const fs::path file = fs::directory_iterator(Path("temp"))->path();
  Write("victim", "1234");
  fs::remove(file);
  fs::create_symlink(Path("victim"), file);
  EXPECT_EQ(Add(4, "56789"), QELO_UPLOAD_WRONG_SLICE);
  EXPECT_EQ(Read("victim"), "1234");
}

TEST_F(Slices, AreAddedByOneRequestAtATime) {
  EXPECT_EQ(Add(0, "1234"), QELO_UPLOAD_PARTIAL);
  const std::string record = "var/lib/webapi/uploads/1002-" + std::string(kId);
  const QELO::UniqueFd other(open(Path(record).c_str(), O_RDONLY | O_CLOEXEC));
  ASSERT_EQ(flock(other.Get(), LOCK_EX), 0);
  EXPECT_EQ(Add(4, "5"), QELO_UPLOAD_BUSY);
  flock(other.Get(), LOCK_UN);
  EXPECT_EQ(Add(4, "5"), QELO_UPLOAD_PARTIAL);
}

TEST_F(Slices, ThatWaitedTooLongAreRemovedByTheNext) {
  EXPECT_EQ(Add(0, "1234"), QELO_UPLOAD_PARTIAL);
  Age("var/lib/webapi/uploads/1002-" + std::string(kId), 24 * 60 * 60 + 10);
  EXPECT_EQ(Add(0, "1234", "another-file-of-hers"), QELO_UPLOAD_PARTIAL);
  EXPECT_EQ(Records(), 1);
  EXPECT_EQ(Files(), 1);
}

TEST_F(Slices, FilesOfACallerHaveALimit) {
  for (int number = 0; number < 16; ++number) {
    EXPECT_EQ(Add(0, "1", "some-file-number-" + std::to_string(number)), QELO_UPLOAD_PARTIAL);
  }
  EXPECT_EQ(Add(0, "1"), QELO_UPLOAD_TOO_LARGE);
  EXPECT_EQ(Records(), 16);
  EXPECT_EQ(Add(1, "2", "some-file-number-7"), QELO_UPLOAD_PARTIAL);
  QeloCgiUploadCallerSet(kBob);
  EXPECT_EQ(Add(0, "1"), QELO_UPLOAD_PARTIAL);
}

TEST_F(Slices, OfAMethodThatReadsItselfMakeOneFile) {
  EXPECT_EQ(Take(0, "1234"), QELO_UPLOAD_PARTIAL);
  EXPECT_EQ(received, 4U);
  EXPECT_EQ(Take(4, ""), QELO_UPLOAD_PARTIAL);
  EXPECT_EQ(Take(5, "6"), QELO_UPLOAD_WRONG_SLICE);
  EXPECT_EQ(received, 4U);
  EXPECT_EQ(Take(4, "56789"), QELO_UPLOAD_DONE);
  const char* path = QLIBCSzHashGetValue(fields, "f");
  ASSERT_NE(path, nullptr);
  EXPECT_EQ(Read(std::string(path).substr(Path().size())), "123456789");
  EXPECT_EQ(Files(), 1);
  QeloCgiUploadCallerSet(static_cast<uid_t>(-1));
  EXPECT_EQ(Records(), 0);
}

TEST_F(Slices, QuestionOfAMethodThatReadsItselfIsAnswered) {
  EXPECT_EQ(Take(0, "1234"), QELO_UPLOAD_PARTIAL);
  Say("0", "9");
  EXPECT_EQ(TakeBody(Form::Field("a", "1") + Form::End()), QELO_UPLOAD_PARTIAL);
  EXPECT_EQ(received, 4U);
  Say("0", "9", "nothing-came-of-this");
  EXPECT_EQ(TakeBody(Form::Field("a", "1") + Form::End()), QELO_UPLOAD_PARTIAL);
  EXPECT_EQ(received, 0U);
  QeloCgiUploadCallerSet(static_cast<uid_t>(-1));
  EXPECT_EQ(Records(), 1);
}

TEST_F(Slices, SecondFileOfAMethodThatReadsItselfIsMalformed) {
  Say("0", "9");
  EXPECT_EQ(TakeBody(Form::File("f", "x", "1") + Form::File("g", "y", "2") + Form::End()),
            QELO_UPLOAD_MALFORMED);
  Say("0", "1", "another-file-of-hers");
  EXPECT_EQ(TakeBody(Form::File("f", "x", "1") + Form::File("g", "y", "2") + Form::End()),
            QELO_UPLOAD_MALFORMED);
}

TEST_F(Slices, AreOpenedWithTheRightsOfTheOneWhoNamesTheCaller) {
  if (!IsRoot()) {
    GTEST_SKIP() << "an ordinary user has the same rights throughout";
  }
  for (const auto& [offset, content, result] :
       {std::tuple(0, "1234", QELO_UPLOAD_PARTIAL), std::tuple(4, "56789", QELO_UPLOAD_DONE)}) {
    Say(std::to_string(offset), "9");
    Give(Form::File("f", "x", content) + Form::End());
    EXPECT_EQ(QeloCgiUploadCallerSet(kAlice), 0);
    ASSERT_EQ(seteuid(kAlice), 0);
    EXPECT_EQ(TakeAll(), result);
    ASSERT_EQ(seteuid(0), 0);
    if (result == QELO_UPLOAD_PARTIAL) {
      struct stat info {};
      ASSERT_EQ(stat(fs::directory_iterator(Path("temp"))->path().c_str(), &info), 0);
      EXPECT_EQ(info.st_uid, kAlice);
    }
    QeloCgiUploadCallerSet(static_cast<uid_t>(-1));
  }
  EXPECT_EQ(Records(), 0);
  const char* path = QLIBCSzHashGetValue(fields, "f");
  ASSERT_NE(path, nullptr);
  EXPECT_EQ(Read(std::string(path).substr(Path().size())), "123456789");
}

TEST_F(Slices, BytesOfAnotherAccountAreNotGoneOnWith) {
  if (!IsRoot()) {
    GTEST_SKIP() << "an ordinary user has no other account";
  }
  EXPECT_EQ(Add(0, "1234"), QELO_UPLOAD_PARTIAL);
  const fs::path file = fs::directory_iterator(Path("temp"))->path();
  ASSERT_EQ(chown(file.c_str(), kBob, kBob), 0);
  EXPECT_EQ(Add(4, "56789"), QELO_UPLOAD_WRONG_SLICE);
  EXPECT_EQ(fs::file_size(file), 4U);
}

TEST_F(Slices, RecordThatAKilledProcessLeftEmptyIsNoFileAndGoesAway) {
  EXPECT_EQ(Add(0, "1"), QELO_UPLOAD_PARTIAL);
  for (int number = 0; number < 20; ++number) {
    Write("var/lib/webapi/uploads/1002-left-behind-number-" + std::to_string(number), "");
  }
  EXPECT_EQ(Add(0, "1", "some-other-file-of-hers"), QELO_UPLOAD_PARTIAL);
  for (int number = 0; number < 20; ++number) {
    Age("var/lib/webapi/uploads/1002-left-behind-number-" + std::to_string(number), 100);
  }
  EXPECT_EQ(Add(1, "2"), QELO_UPLOAD_PARTIAL);
  EXPECT_EQ(Records(), 2);
}

TEST_F(Slices, DirectoryThatIsNoneBeginsNothing) {
  fs::remove(Path("temp"));
  EXPECT_EQ(Add(0, "1"), QELO_UPLOAD_NO_FILE);
  EXPECT_EQ(Records(), 0);
}

}  // namespace
