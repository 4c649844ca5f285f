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

void removeIfOld(int records, const char* name) {
  struct stat info {};
  if (fstatat(records, name, &info, AT_SYMLINK_NOFOLLOW) != 0 ||
      time(nullptr) - info.st_mtim.tv_sec <= PartialFile::kLongestWait) {
    return;
  }
  const UniqueFd file = openRecord(records, name, 0);
  Record record;
  if (file) {
    if (readRecord(file.Get(), record)) {
      removeFile(record);
    }
    unlinkat(records, name, 0);
  }
}

/// Removes what waited too long. @return how many records of the caller there are
int sweep(int records, const std::string& caller) {
  UniqueFd readable(openat(records, ".", O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  DIR* stream = readable ? fdopendir(readable.Get()) : nullptr;
  if (stream == nullptr) {
    return 0;
  }
  readable.Release();  // closedir closes it
  int count = 0;
  const dirent* entry = nullptr;
  for (int seen = 0; seen < kMostLookedAt && (entry = readdir(stream)) != nullptr; ++seen) {
    if (entry->d_name[0] != '.') {
      removeIfOld(records, entry->d_name);
      count += std::string_view(entry->d_name).starts_with(caller) ? 1 : 0;
    }
  }
  closedir(stream);
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

int PartialFile::Open(uid_t caller, const Slice& slice, const char* directory, uint64_t& received,
                      std::unique_ptr<PartialFile>& file) {
  received = 0;
  const UniqueFd records = openPrivateDir(Paths::kSliceDir, true);
  if (!records) {
    return QELO_UPLOAD_NO_FILE;
  }
  const std::string owner = std::to_string(caller) + "-";
  const std::string name = owner + slice.id;
  const int count = sweep(records.Get(), owner);
  UniqueFd record = openRecord(records.Get(), name.c_str(), directory != nullptr ? O_CREAT : 0);
  if (!record) {
    return errno == EWOULDBLOCK ? QELO_UPLOAD_BUSY : errno == ENOENT ? 0 : resultOf(errno);
  }
  std::unique_ptr<PartialFile> opened(new PartialFile(std::move(record), name, slice.size));
  if (opened->Continue()) {
    received = opened->received_;
  } else if (directory == nullptr || slice.offset != 0 || count >= kMostOfACaller) {
    opened->Forget(records.Get());
    return directory == nullptr ? 0
           : slice.offset != 0  ? QELO_UPLOAD_WRONG_SLICE
                                : QELO_UPLOAD_TOO_LARGE;
  } else if (const int fault = opened->Begin(records.Get(), directory); fault != 0) {
    return fault;
  }
  if (directory != nullptr && slice.offset != received) {
    return QELO_UPLOAD_WRONG_SLICE;
  }
  file = std::move(opened);
  return 0;
}

void PartialFile::Forget(int records) const {
  unlinkat(records, recordName_.c_str(), 0);
}

/// Opens the bytes that there are. @return false when there are none, or of a file of another size
bool PartialFile::Continue() {
  Record record;
  auto folder = std::make_shared<TemporaryFolder>();
  if (!readRecord(record_.Get(), record) || !folder->Open(record.folder.c_str())) {
    return false;
  }
  UniqueFd file(openat(folder->Descriptor(), record.name.c_str(),
                       O_RDWR | O_APPEND | O_NOFOLLOW | O_CLOEXEC | O_NONBLOCK));
  struct stat info {};
  const bool isOurs = file && fstat(file.Get(), &info) == 0 && S_ISREG(info.st_mode) &&
                      info.st_uid == geteuid() && info.st_nlink == 1;
  if (!isOurs || record.size != size_) {
    removeFile(record);
    return false;
  }
  futimens(record_.Get(), nullptr);  // it is waited for anew
  received_ = static_cast<uint64_t>(info.st_size);
  folder_ = std::move(folder);
  name_ = record.name;
  file_ = std::move(file);
  return true;
}

int PartialFile::Begin(int records, const char* directory) {
  auto folder = std::make_shared<TemporaryFolder>();
  const std::string secret = makeSecret();
  if (secret.empty() || !folder->Open(directory)) {
    Forget(records);
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
    Forget(records);
    return resultOf(error);
  }
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
  const UniqueFd records = openPrivateDir(Paths::kSliceDir, false);
  if (whole != nullptr && records) {
    Forget(records.Get());
  }
  return whole;
}

}  // namespace QELO::Platform
