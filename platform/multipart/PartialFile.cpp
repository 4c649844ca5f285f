#include "platform/multipart/PartialFile.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <time.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <functional>

#include "platform/base/Paths.h"
#include "platform/base/PrivateDir.h"
#include "platform/base/Secrets.h"
#include "webapi/base/Number.h"
#include "webapi/base/Text.h"
#include "webapi/base/TextFile.h"
#include "webapi/platform/Upload.h"

namespace QELO::Platform {
namespace {

constexpr char kPrefix[] = "webapi-partial-";
constexpr mode_t kMode = S_IRUSR | S_IWUSR;
constexpr size_t kShortestId = 16;
constexpr size_t kLongestId = 64;
constexpr size_t kLongestRecord = 4096;
constexpr int kMostLookedAt = 4096;  ///< records that one request looks at
constexpr long kEmptyWait = 60;      ///< seconds that a record without a file is left alone

struct Close {
  void operator()(DIR* stream) const { closedir(stream); }
};

std::string_view header(const char* name) {
  const char* value = getenv(name);
  return value != nullptr ? value : "";
}

/// A record: the size of the whole, and where its bytes are.
struct Record {
  uint64_t size = 0;
  std::string folder;
  std::string name;
};

bool readRecord(int file, Record& record) {
  std::string text;
  if (lseek(file, 0, SEEK_SET) != 0 || !ReadText(file, kLongestRecord, text)) {
    return false;
  }
  std::string_view rest = text;
  const std::string_view size = TakePiece(rest, "\n");
  record.folder = TakePiece(rest, "\n");
  record.name = TakePiece(rest, "\n");
  return ParseNumber(size, record.size) && record.name.starts_with(kPrefix);
}

void removeFile(const Record& record) {
  TemporaryFolder folder;
  if (folder.Open(record.folder.c_str())) {
    unlinkat(folder.Descriptor(), record.name.c_str(), 0);
  }
}

/// Opens a record and locks it, so that it stays the one of its name.
/// @return none, with errno; EWOULDBLOCK when another request has it
UniqueFd openRecord(int records, const char* name, int flags) {
  UniqueFd file(openat(records, name, O_RDWR | O_NOFOLLOW | O_CLOEXEC | flags, kMode));
  struct stat info {};
  if (!file || flock(file.Get(), LOCK_EX | LOCK_NB) != 0 || fstat(file.Get(), &info) != 0) {
    return UniqueFd();
  }
  if (info.st_nlink == 0) {  // it was taken away before it was locked
    errno = EWOULDBLOCK;
    return UniqueFd();
  }
  return file;
}

/// Removes a file that waited too long. A record that nobody has and that tells of none is what a
/// process that was killed left behind.
/// @return whether a file is begun
bool keepUnlessOld(int records, const char* name) {
  struct stat info {};
  if (fstatat(records, name, &info, AT_SYMLINK_NOFOLLOW) != 0) {
    return false;
  }
  const long limit = info.st_size == 0 ? kEmptyWait : PartialFile::kLongestWait;
  if (time(nullptr) - info.st_mtim.tv_sec <= limit) {
    return info.st_size != 0;
  }
  const UniqueFd file = openRecord(records, name, 0);
  Record record;
  if (file) {
    if (readRecord(file.Get(), record)) {
      removeFile(record);
    }
    unlinkat(records, name, 0);
  }
  return !file;
}

/// Removes what waited too long. @return how many files the caller has begun
int sweep(int records, const std::string& caller) {
  UniqueFd readable(openat(records, ".", O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  const std::unique_ptr<DIR, Close> stream(readable ? fdopendir(readable.Get()) : nullptr);
  if (stream == nullptr) {
    return 0;
  }
  readable.Release();  // the stream closes it
  int count = 0;
  const dirent* entry = nullptr;
  for (int seen = 0; seen < kMostLookedAt && (entry = readdir(stream.get())) != nullptr; ++seen) {
    if (entry->d_name[0] != '.' && keepUnlessOld(records, entry->d_name) &&
        std::string_view(entry->d_name).starts_with(caller)) {
      ++count;
    }
  }
  return count;
}

int resultOf(int error) {
  return error == ENOSPC || error == EDQUOT || error == EFBIG ? QELO_UPLOAD_NO_SPACE
                                                              : QELO_UPLOAD_NO_FILE;
}

}  // namespace

std::optional<Slice> readSlice() {
  Slice slice;
  slice.id = header("HTTP_X_UPLOAD_ID");
  const bool isGoodId = slice.id.size() >= kShortestId && slice.id.size() <= kLongestId &&
                        std::all_of(slice.id.begin(), slice.id.end(), [](char c) {
                          return IsAlphanumeric(c) || c == '-' || c == '_';
                        });
  if (!isGoodId || !ParseNumber(header("HTTP_X_FILE_SIZE"), slice.size) ||
      !ParseNumber(header("HTTP_X_SLICE_OFFSET"), slice.offset)) {
    return std::nullopt;
  }
  return slice;
}

int PartialFile::Open(uid_t caller, const Slice& slice, std::unique_ptr<PartialFile>& file) {
  file.reset();
  UniqueFd records = openPrivateDir(Paths::kSliceDir, true);
  if (!records) {
    return resultOf(errno);
  }
  const std::string owner = std::to_string(caller) + "-";
  const std::string name = owner + slice.id;
  const int count = sweep(records.Get(), owner);
  UniqueFd record = openRecord(records.Get(), name.c_str(), O_CREAT);
  if (!record) {
    return errno == EWOULDBLOCK ? QELO_UPLOAD_BUSY : resultOf(errno);
  }
  file.reset(new PartialFile(std::move(records), std::move(record), name, slice.size));
  file->isOneTooMany_ = !file->FindBytes() && count >= kMostOfACaller;
  return 0;
}

PartialFile::~PartialFile() {
  struct stat info {};
  if (opener_ == getpid() && fstat(record_.Get(), &info) == 0 && info.st_size == 0) {
    unlinkat(records_.Get(), recordName_.c_str(), 0);  // while it is locked
  }
}

void PartialFile::Forget() const {
  [[maybe_unused]] const int result = ftruncate(record_.Get(), 0);  // room is not needed
}

/// Opens the bytes that there are. @return false when there are none, or of a file of another size
bool PartialFile::FindBytes() {
  Record record;
  auto folder = std::make_shared<TemporaryFolder>();
  if (!readRecord(record_.Get(), record) || !folder->Open(record.folder.c_str())) {
    Forget();
    return false;
  }
  UniqueFd file(openat(folder->Descriptor(), record.name.c_str(),
                       O_RDWR | O_APPEND | O_NOFOLLOW | O_CLOEXEC | O_NONBLOCK));
  struct stat info {};
  const bool isFile =
      file && fstat(file.Get(), &info) == 0 && S_ISREG(info.st_mode) && info.st_nlink == 1;
  if (!isFile || record.size != size_) {
    removeFile(record);
    Forget();
    return false;
  }
  futimens(record_.Get(), nullptr);  // it is waited for anew
  received_ = static_cast<uint64_t>(info.st_size);
  fileOwner_ = info.st_uid;
  folder_ = std::move(folder);
  name_ = std::move(record.name);
  file_ = std::move(file);
  return true;
}

int PartialFile::GoOn(uint64_t offset, const char* directory) {
  // Another account's bytes are of another method, whatever their name.
  if (offset != received_ || (file_ && fileOwner_ != geteuid())) {
    return QELO_UPLOAD_WRONG_SLICE;
  }
  if (file_) {
    return 0;
  }
  return isOneTooMany_ ? static_cast<int>(QELO_UPLOAD_TOO_LARGE) : Begin(directory);
}

int PartialFile::Begin(const char* directory) {
  auto folder = std::make_shared<TemporaryFolder>();
  const std::string secret = makeSecret();
  if (secret.empty() || !folder->Open(directory)) {
    return QELO_UPLOAD_NO_FILE;
  }
  name_ = kPrefix + secret;
  // The record first: what it names may be missing, but a file without one would stay for ever.
  const std::string text = std::to_string(size_) + "\n" + directory + "\n" + name_ + "\n";
  if (ftruncate(record_.Get(), 0) == 0 && lseek(record_.Get(), 0, SEEK_SET) == 0 &&
      WriteText(record_.Get(), text)) {
    file_ = UniqueFd(openat(folder->Descriptor(), name_.c_str(),
                            O_CREAT | O_EXCL | O_RDWR | O_APPEND | O_NOFOLLOW | O_CLOEXEC, kMode));
  }
  if (!file_) {
    const int error = errno;
    Forget();
    return resultOf(error);
  }
  fileOwner_ = geteuid();
  folder_ = std::move(folder);
  return 0;
}

int PartialFile::Write(std::string_view bytes) {
  if (bytes.size() > size_ - std::min(size_, received_)) {
    return QELO_UPLOAD_TOO_LARGE;
  }
  const bool isWritten = WriteText(file_.Get(), bytes);
  const int error = errno;
  struct stat info {};
  received_ = isWritten                        ? received_ + bytes.size()
              : fstat(file_.Get(), &info) == 0 ? static_cast<uint64_t>(info.st_size)
                                               : received_;
  return isWritten ? 0 : resultOf(error);
}

std::unique_ptr<TemporaryFile> PartialFile::Finish(const std::optional<FileOwner>& owner) {
  std::unique_ptr<TemporaryFile> whole =
      TemporaryFile::Adopt(folder_, std::move(file_), name_, owner);
  if (whole != nullptr) {
    Forget();
  }
  return whole;
}

}  // namespace QELO::Platform
