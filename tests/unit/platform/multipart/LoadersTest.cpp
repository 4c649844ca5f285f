// The loaders of the seam over bodies on standard input.

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <cstring>
#include <filesystem>
#include <fstream>

#include "platform/multipart/Limits.h"
#include "tests/support/Sanitizer.h"
#include "tests/unit/multipart/Form.h"
#include "tests/unit/platform/PrivateRoot.h"
#include "webapi/base/UniqueFd.h"
#include "webapi/platform/Upload.h"

namespace QELO::Platform {
namespace {

namespace fs = std::filesystem;

std::vector<unsigned long long>& progress() {
  static std::vector<unsigned long long> calls;
  return calls;
}

/// Standard input holds a body, and files go into temp/ of a private root.
class Loaders : public PrivateRoot {
 protected:
  void SetUp() override {
    PrivateRoot::SetUp();
    ASSERT_TRUE(fs::create_directory(Path("temp")));
    ASSERT_EQ(chmod(Path("temp").c_str(), 01777), 0);
    directory = Path("temp");
    former_ = fcntl(STDIN_FILENO, F_DUPFD_CLOEXEC, 10);
    QeloCgiUploadOwnerSet(geteuid(), getegid());
  }
  void TearDown() override {
    Give("", "");  // the files of the upload before go
    QeloCgiLoadUploadAll(&fields, &files, directory.c_str(), 0);
    QLIBCSzHashFree(fields);
    QLIBCSzHashFree(files);
    dup2(former_, STDIN_FILENO);
    close(former_);
    unsetenv("CONTENT_TYPE");
    unsetenv("CONTENT_LENGTH");
  }

  static void Give(const std::string& body, const char* type = Form::kType,
                   const std::string& length = "") {
    const int fd = memfd_create("body", MFD_CLOEXEC);
    ASSERT_EQ(write(fd, body.data(), body.size()), static_cast<ssize_t>(body.size()));
    lseek(fd, 0, SEEK_SET);
    dup2(fd, STDIN_FILENO);
    close(fd);
    setenv("CONTENT_TYPE", type, 1);
    setenv("CONTENT_LENGTH", length.empty() ? std::to_string(body.size()).c_str() : length.c_str(),
           1);
  }
  int LoadAll() { return QeloCgiLoadUploadAll(&fields, &files, directory.c_str(), 0); }
  int LoadParams(QeloCgiUploadProgress callback = nullptr) {
    return QeloCgiLoadUploadParams(&fields, callback, &state, part, sizeof part, field,
                                   sizeof field, file, sizeof file);
  }
  int LoadFile(QeloCgiUploadProgress callback = nullptr) {
    return QeloCgiLoadUploadFileToDir(&fields, directory.c_str(), callback, &state, part, field,
                                      file);
  }
  /// A hash as "name=value;" in the order of the names.
  static std::string Text(const QLIBSZHASH* hash) {
    std::string text;
    const char* value = nullptr;
    for (const char* name = QLIBCSzHashNext(hash, nullptr, &value); name != nullptr;
         name = QLIBCSzHashNext(hash, name, &value)) {
      text += std::string(name) + "=" + value + ";";
    }
    return text;
  }
  std::string Uploaded(const char* name) const {
    const char* path = QLIBCSzHashGetValue(files, name);
    return path == nullptr ? "(none)" : Read(std::string(path).substr(Path().size()));
  }
  /// Leaves no block of 16 KiB or more to this process.
  static void ExhaustMemory() {
    unsigned long pages = 0;
    std::ifstream("/proc/self/statm") >> pages;
    const rlim_t bytes = pages * static_cast<rlim_t>(sysconf(_SC_PAGESIZE));
    const rlimit none{bytes, RLIM_INFINITY};
    ASSERT_EQ(setrlimit(RLIMIT_AS, &none), 0);
    for (size_t size = 1 << 20; size >= 16 << 10; size /= 2) {
      while (void* block = malloc(size)) {
        static_cast<volatile char*>(block)[0] = 1;
      }
    }
  }
  int Count() const { return CountFiles("temp"); }

  std::string directory;
  QLIBSZHASH* fields = QLIBCSzHashAlloc(256);
  QLIBSZHASH* files = QLIBCSzHashAlloc(256);
  QeloCgiUploadState state{};
  char part[256] = {};
  char field[64] = {};
  char file[491] = {};

 private:
  int former_ = -1;
};

TEST_F(Loaders, WholeUploadHasFieldsAndFiles) {
  Give(Form::Field("a", "1") + Form::File("f", "x.txt", "one") + Form::Field("b", "") +
       Form::File("g", "y.txt", "") + Form::End());
  EXPECT_EQ(LoadAll(), QELO_UPLOAD_DONE);
  EXPECT_EQ(Text(fields), "a=1;b=;f=x.txt;g=y.txt;");
  EXPECT_EQ(Uploaded("f"), "one");
  EXPECT_EQ(Uploaded("g"), "");
  EXPECT_EQ(Count(), 2);
}

TEST_F(Loaders, FilesOfOneFieldAreToldApart) {
  Give(Form::File("f", "x", "1") + Form::File("f", "y", "2") + Form::File("f[1]", "z", "3") +
       Form::End());
  EXPECT_EQ(LoadAll(), QELO_UPLOAD_DONE);
  EXPECT_EQ(Text(fields), "f=x;f[1]=y;f[1][1]=z;");
  EXPECT_EQ(Uploaded("f") + Uploaded("f[1]") + Uploaded("f[1][1]"), "123");
}

TEST_F(Loaders, FieldDoesNotTakeTheNameOfAFile) {
  Give(Form::Field("f", "../before") + Form::File("f", "x", "1") + Form::Field("f", "../after") +
       Form::End());
  EXPECT_EQ(LoadAll(), QELO_UPLOAD_DONE);
  EXPECT_EQ(Text(fields), "f=x;");
}

TEST_F(Loaders, FileFieldWithoutAChosenFileIsAnEmptyField) {
  Give(Form::File("f", "", "") + Form::End());
  EXPECT_EQ(LoadAll(), QELO_UPLOAD_DONE);
  EXPECT_EQ(Text(fields), "f=;");
  EXPECT_EQ(Text(files), "");
}

TEST_F(Loaders, FilesAreTheOwners) {
  if (!IsRoot()) {
    GTEST_SKIP() << "needs root";
  }
  QeloCgiUploadOwnerSet(1002, 1002);
  Give(Form::File("f", "x", "1") + Form::End());
  EXPECT_EQ(LoadAll(), QELO_UPLOAD_DONE);
  const std::string path = QLIBCSzHashGetValue(files, "f");
  EXPECT_EQ(Status(path.substr(Path().size())).st_uid, 1002U);
}

TEST_F(Loaders, BodyThatEndsEarlyLeavesNothing) {
  const std::string body =
      Form::Field("a", "1") + Form::File("f", "x", "one") + Form::File("g", "y", "two") + "--B--";
  for (size_t length = 0; length < body.size(); ++length) {
    Give(body.substr(0, length), Form::kType, std::to_string(body.size()));
    EXPECT_EQ(LoadAll(), QELO_UPLOAD_BROKEN_OFF) << length;
    EXPECT_EQ(Count(), 0) << length;
    EXPECT_EQ(Text(files), "") << length;
  }
}

TEST_F(Loaders, BodyThatIsAnnouncedTooShortIsMalformed) {
  const std::string body = Form::File("f", "x", "one") + "--B--";
  Give(body, Form::kType, std::to_string(body.size() - 1));
  EXPECT_EQ(LoadAll(), QELO_UPLOAD_MALFORMED);
  EXPECT_EQ(Count(), 0);
}

TEST_F(Loaders, NothingBehindTheAnnouncedLengthIsRead) {
  const std::string body = Form::Field("a", "1") + Form::End();
  Give(body + "next", Form::kType, std::to_string(body.size()));
  const UniqueFd input(dup(STDIN_FILENO));
  EXPECT_EQ(LoadAll(), QELO_UPLOAD_DONE);
  char rest[10] = {};
  EXPECT_EQ(read(input.Get(), rest, sizeof rest), 4);
}

TEST_F(Loaders, ReceivedBodyLeavesTheNullDevice) {
  Give(Form::Field("a", "1") + Form::End());
  EXPECT_EQ(LoadAll(), QELO_UPLOAD_DONE);
  struct stat info {};
  ASSERT_EQ(fstat(STDIN_FILENO, &info), 0);
  EXPECT_TRUE(S_ISCHR(info.st_mode));
}

TEST_F(Loaders, TypeWithoutABoundaryIsMalformed) {
  for (const char* type : {"", "multipart/form-data", "multipart/form-data; boundary="}) {
    Give(Form::End(), type);
    EXPECT_EQ(LoadAll(), QELO_UPLOAD_MALFORMED) << type;
  }
}

TEST_F(Loaders, FailureStays) {
  Give(Form::Part("x", "1") + Form::Field("a", "1") + Form::End());
  EXPECT_EQ(LoadParams(), QELO_UPLOAD_MALFORMED);
  EXPECT_EQ(state.result, QELO_UPLOAD_MALFORMED);
  EXPECT_EQ(LoadParams(), QELO_UPLOAD_MALFORMED);
  EXPECT_EQ(LoadAll(), QELO_UPLOAD_MALFORMED);
  EXPECT_EQ(Text(fields), "");
}

TEST_F(Loaders, FieldWithAZeroByteIsMalformed) {
  Give(Form::Field("a", std::string("1\0002", 3)) + Form::End());
  EXPECT_EQ(LoadAll(), QELO_UPLOAD_MALFORMED);
}

TEST_F(Loaders, FieldsHaveALimit) {
  const std::string half(UploadLimits::kFieldBytes / 2 - 1, 'x');
  Give(Form::Field("a", half) + Form::Field("b", half) + Form::End());
  EXPECT_EQ(LoadAll(), QELO_UPLOAD_DONE);
  Give(Form::Field("a", half) + Form::Field("b", half + "x") + Form::End());
  EXPECT_EQ(LoadAll(), QELO_UPLOAD_TOO_LARGE);
  std::string many;
  for (size_t count = 0; count < UploadLimits::kFields; ++count) {
    many += Form::Field("a", "1");
  }
  Give(many + Form::End());
  EXPECT_EQ(LoadAll(), QELO_UPLOAD_DONE);
  Give(many + Form::Field("a", "1") + Form::End());
  EXPECT_EQ(LoadAll(), QELO_UPLOAD_TOO_LARGE);
}

TEST_F(Loaders, FilesHaveALimit) {
  rlimit limit{};
  getrlimit(RLIMIT_NOFILE, &limit);
  if (limit.rlim_cur < UploadLimits::kFiles + 100) {
    GTEST_SKIP() << "needs more descriptors";
  }
  std::string many;
  for (size_t count = 0; count < UploadLimits::kFiles; ++count) {
    many += Form::File("f" + std::to_string(count), "x", "1");
  }
  Give(many + Form::End());
  EXPECT_EQ(LoadAll(), QELO_UPLOAD_DONE);
  EXPECT_EQ(Count(), static_cast<int>(UploadLimits::kFiles));
  Give(many + Form::File("f", "x", "1") + Form::End());
  EXPECT_EQ(LoadAll(), QELO_UPLOAD_TOO_LARGE);
  EXPECT_EQ(Count(), 0);
}

TEST_F(Loaders, DirectoryThatIsNoneMakesNoFile) {
  for (const char* wrong : {"/nonexistent", "etc/passwd"}) {
    directory = wrong;
    Give(Form::File("f", "x", "1") + Form::End());
    EXPECT_EQ(LoadAll(), QELO_UPLOAD_NO_FILE) << wrong;
  }
}

TEST_F(Loaders, FullDiskIsTold) {
  // A file may not grow beyond a limit: what a full disk or a quota does.
  Give(Form::File("f", "x", std::string(100000, 'x')) + Form::End());
  EXPECT_EQ(InChild([&] {
              signal(SIGXFSZ, SIG_IGN);
              const rlimit small{50000, 50000};
              return setrlimit(RLIMIT_FSIZE, &small) == 0 && LoadAll() == QELO_UPLOAD_NO_SPACE &&
                             Count() == 0
                         ? 0
                         : 1;
            }),
            0);
}

TEST_F(Loaders, WithoutMemoryAnUploadHasFailedAndLeavesNothing) {
  if (IsSanitized()) {
    GTEST_SKIP() << "the sanitizer's memory cannot be made scarce";
  }
  Give(Form::File("f", "x", "1") + Form::Field("a", std::string(900'000, 'x')) + Form::End());
  EXPECT_EQ(InChild([&] {
              ExhaustMemory();
              return LoadAll() == QELO_UPLOAD_NO_MEMORY ? 0 : 1;
            }),
            0);
  lseek(STDIN_FILENO, 0, SEEK_SET);
  EXPECT_EQ(
      InChild([&] {
        if (LoadParams() != QELO_UPLOAD_DONE || LoadFile() != QELO_UPLOAD_DONE) {
          return 1;
        }
        ExhaustMemory();
        return LoadParams() == QELO_UPLOAD_NO_MEMORY && LoadAll() == QELO_UPLOAD_NO_MEMORY ? 0 : 2;
      }),
      0);
  EXPECT_EQ(Count(), 0);
}

TEST_F(Loaders, DeferredUploadComesPartAfterPart) {
  const std::string body = Form::Field("a", "1") + Form::File("f", "x", "one") +
                           Form::Field("b", "2") + Form::File("g", "y", "two") +
                           Form::Field("c", "3") + Form::End();
  Give(body);
  EXPECT_EQ(LoadParams(), 1);
  EXPECT_EQ(Text(fields), "a=1;");
  EXPECT_STREQ(part, "Content-Disposition: form-data; name=\"f\"; filename=\"x\"");
  EXPECT_EQ(std::string(field) + "/" + file, "f/x");
  EXPECT_EQ(state.total, body.size());
  EXPECT_EQ(state.left, body.size() - body.find("\r\none"));
  EXPECT_EQ(LoadParams(), 1);  // the file is still to be loaded
  EXPECT_EQ(std::string(field) + "/" + file, "f/x");
  EXPECT_EQ(LoadFile(), 1);
  EXPECT_EQ(std::string(part) + field + file, "");
  EXPECT_EQ(Read(std::string(QLIBCSzHashGetValue(fields, "f")).substr(Path().size())), "one");
  EXPECT_EQ(Count(), 1);
  EXPECT_EQ(LoadParams(), 1);
  EXPECT_EQ(std::string(field) + "/" + file, "g/y");
  EXPECT_EQ(LoadFile(), 1);
  EXPECT_EQ(LoadParams(), 1);
  EXPECT_EQ(std::string(part) + field + file, "");
  EXPECT_STREQ(QLIBCSzHashGetValue(fields, "c"), "3");
  EXPECT_EQ(state.left, 0U);
  EXPECT_EQ(LoadParams(), 1);
}

TEST_F(Loaders, FileThatWasNotFoundIsNotLoaded) {
  Give(Form::Field("a", "1") + Form::End());
  EXPECT_EQ(LoadParams(), 1);
  EXPECT_EQ(LoadFile(), QELO_UPLOAD_NO_FILE);
}

TEST_F(Loaders, NamesThatTheBuffersDoNotHoldAreTooLarge) {
  Give(Form::File("field", "name", "1") + Form::End());
  EXPECT_EQ(QeloCgiLoadUploadParams(&fields, nullptr, &state, part, sizeof part, field, 5, file,
                                    sizeof file),
            QELO_UPLOAD_TOO_LARGE);
  EXPECT_EQ(std::string(part) + field + file, "");
}

TEST_F(Loaders, ProgressIsToldAndEndsWithTheWhole) {
  const std::string body = Form::File("f", "x", std::string(3 << 20, 'x')) + Form::End();
  Give(body);
  progress().clear();
  const QeloCgiUploadProgress callback = [](unsigned long long done, unsigned long long total) {
    progress().insert(progress().end(), {done, total});
  };
  EXPECT_EQ(LoadParams(callback), 1);
  EXPECT_EQ(LoadFile(callback), 1);
  ASSERT_GT(progress().size(), 8U);
  for (size_t at = 0; at < progress().size(); at += 2) {
    EXPECT_GT(progress()[at], at == 0 ? 0 : progress()[at - 2]);
    EXPECT_EQ(progress()[at + 1], body.size());
  }
  EXPECT_EQ(progress()[progress().size() - 2], body.size());
}

TEST_F(Loaders, FieldsOfTheCallAreHandedOutOnceMore) {
  const std::string body = Form::Field("api", "A") + Form::Field("version", "1") +
                           Form::Field("method", "m") + Form::Field("_sid", "S") +
                           Form::File("f", "x", "one") + Form::End();
  for (const bool whole : {true, false}) {
    Give(body);
    QeloCgiContext context{};
    QLIBSZHASH* hash = QLIBCSzHashAlloc(256);
    memcpy(context.block, &hash, sizeof hash);
    unsigned long long positions[2] = {};
    EXPECT_EQ(QeloCgiLoadUploadNumParams(&context, 3, 0, positions, part, sizeof part), 1);
    EXPECT_EQ(Text(hash), "_sid=S;api=A;method=m;version=1;");
    EXPECT_EQ(positions[0], body.find("\r\none"));
    EXPECT_EQ(positions[1], body.size());
    EXPECT_EQ(whole ? LoadAll() : LoadParams(), 1);
    EXPECT_STREQ(QLIBCSzHashGetValue(fields, "_sid"), "S");
    EXPECT_EQ(whole ? Uploaded("f") : std::string(field), whole ? "one" : "f");
    QLIBCSzHashFree(hash);
    QLIBCHashRemoveAll(fields);
  }
}

TEST_F(Loaders, FormWithoutAFileLeavesItsEndBehindTheCall) {
  const std::string body = Form::Field("api", "A") + Form::End();
  Give(body);
  QeloCgiContext context{};
  unsigned long long positions[2] = {};
  EXPECT_EQ(QeloCgiLoadUploadNumParams(&context, 3, 0, positions, part, sizeof part),
            QELO_UPLOAD_NO_MEMORY);
  memcpy(context.block, &files, sizeof files);
  EXPECT_EQ(QeloCgiLoadUploadNumParams(&context, 3, 0, positions, part, sizeof part), 1);
  EXPECT_STREQ(part, "");
  EXPECT_LT(positions[0], positions[1]);
  QLIBCHashRemoveAll(files);
  EXPECT_EQ(LoadAll(), 1);
  EXPECT_EQ(Text(fields), "api=A;");
}

}  // namespace
}  // namespace QELO::Platform
