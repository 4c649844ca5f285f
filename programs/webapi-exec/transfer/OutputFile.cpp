#include "programs/webapi-exec/transfer/OutputFile.h"

#include <fcntl.h>
#include <strings.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <sys/xattr.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <string_view>
#include <utility>

#include "webapi/base/Number.h"
#include "webapi/base/Text.h"

namespace QELO::ExecProgram {
namespace {

constexpr mode_t kMode = 0666;  // less the umask, as files that programs make are
constexpr char kEnding[] = ".part";
constexpr char kMarkName[] = "user.webapi.etag";
constexpr size_t kLongestMark = 256;  ///< bytes

/// The value of a header line, "" without one.
std::string_view valueOf(std::string_view head, std::string_view name) {
  while (!head.empty()) {
    const std::string_view line = TakePiece(head, "\r\n");
    if (line.size() > name.size() && line[name.size()] == ':' &&
        strncasecmp(line.data(), name.data(), name.size()) == 0) {
      return Trim(line.substr(name.size() + 1));
    }
  }
  return "";
}

/// Reads "bytes 5-9/10", and "bytes */10", which begins where it ends.
bool readContentRange(std::string_view text, off_t& first, uint64_t& total) {
  if (TakePiece(text, " ") != "bytes") {
    return false;
  }
  const std::string_view range = TakePiece(text, "/");
  if (!ParseNumber(text, total)) {
    return false;
  }
  first = static_cast<off_t>(total);
  return range == "*" || ParseNumber(range.substr(0, range.find('-')), first);
}

}  // namespace

OutputFile::~OutputFile() {
  if (file_ >= 0) {
    close(file_);
  }
}

int OutputFile::Open(const std::string& path) {
  path_ = path.empty() ? "/dev/null" : path;
  struct stat info {};
  const bool isThere = lstat(path_.c_str(), &info) == 0;
  if (!isThere || (S_ISREG(info.st_mode) && access(path_.c_str(), W_OK) == 0)) {
    const int error = OpenPart(path_ + kEnding);
    if (error >= 0) {
      return error;
    }
  }
  file_ = open(path_.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, kMode);
  return file_ < 0 ? errno : 0;
}

int OutputFile::OpenPart(const std::string& path) {
  file_ = open(path.c_str(), O_WRONLY | O_CREAT | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC, kMode);
  struct stat info {};
  if (file_ < 0 || fstat(file_, &info) != 0 || !S_ISREG(info.st_mode)) {
    if (file_ >= 0) {
      close(std::exchange(file_, -1));
    }
    return -1;
  }
  struct stat place {};
  if (flock(file_, LOCK_EX | LOCK_NB) != 0 || stat(path.c_str(), &place) != 0 ||
      place.st_ino != info.st_ino) {
    return EBUSY;
  }
  part_ = path;
  char mark[kLongestMark];
  const ssize_t length = fgetxattr(file_, kMarkName, mark, sizeof mark);
  if (info.st_size > 0 && length > 0) {
    mark_.assign(mark, static_cast<size_t>(length));
    there_ = info.st_size;
  }
  return 0;
}

void OutputFile::Begin(const std::string& head) {
  const std::string_view status = valueOf(head, "Status").substr(0, 3);
  off_t first = 0;
  const bool goesOn = (status == "206" || status == "416") &&
                      readContentRange(valueOf(head, "Content-Range"), first, total_) &&
                      first == there_;
  if (!goesOn) {
    there_ = 0;
    total_ = 0;
    ParseNumber(valueOf(head, "Content-Length"), total_);
  }
  if (part_.empty() || ftruncate(file_, there_) != 0) {
    return;
  }
  lseek(file_, there_, SEEK_SET);
  const std::string_view mark = valueOf(head, "ETag");
  fremovexattr(file_, kMarkName);
  hasMark_ = mark.starts_with('"') && mark.size() <= kLongestMark &&
             fsetxattr(file_, kMarkName, mark.data(), mark.size(), 0) == 0;
}

int OutputFile::Finish(bool isWhole) {
  int error = 0;
  struct stat info {};
  const bool isEmpty = fstat(file_, &info) == 0 && info.st_size == 0;
  if (isWhole && !part_.empty()) {
    fremovexattr(file_, kMarkName);
  }
  if (close(std::exchange(file_, -1)) != 0) {
    error = errno;
  }
  if (part_.empty()) {
    return error;
  }
  if (isWhole && error == 0) {
    return rename(part_.c_str(), path_.c_str()) == 0 ? 0 : errno;
  }
  if (isEmpty) {
    unlink(part_.c_str());
  } else {
    left_ = "what came is kept in " + part_;
    left_ += hasMark_ ? "; the same call goes on from there" : "";
  }
  return error;
}

}  // namespace QELO::ExecProgram
