#include "work/FileCopy.h"

#include <fcntl.h>
#include <linux/limits.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <memory>

#include "work/Stop.h"

namespace files {
namespace {

constexpr size_t kPiece = 8 << 20;     ///< bytes that the kernel copies at once
constexpr size_t kBuffer = 256 << 10;  ///< bytes where it cannot
constexpr mode_t kPermissions = 0777;  ///< what makes a program another user's is not copied

/// Copies some bytes through memory, for file systems that cannot do it by themselves.
/// @return bytes, 0 at the end of the file, or -1 with errno
ssize_t copyThroughMemory(int from, int to, off_t at, size_t size) {
  static const std::unique_ptr<char[]> buffer(new char[kBuffer]);
  const ssize_t count = TEMP_FAILURE_RETRY(pread(from, buffer.get(), std::min(size, kBuffer), at));
  for (ssize_t written = 0; written < count;) {
    const ssize_t more = TEMP_FAILURE_RETRY(
        pwrite(to, buffer.get() + written, static_cast<size_t>(count - written), at + written));
    if (more < 0) {
      return -1;
    }
    written += more;
  }
  return count;
}

ssize_t copySome(int from, int to, off_t at, size_t size) {
  off_t in = at;
  off_t out = at;
  const ssize_t count =
      TEMP_FAILURE_RETRY(copy_file_range(from, &in, to, &out, std::min(size, kPiece), 0));
  const bool isUnable = count < 0 && (errno == EXDEV || errno == EINVAL || errno == ENOSYS ||
                                      errno == EOPNOTSUPP || errno == EIO || errno == EPERM);
  // Some file systems say 0 where they cannot; the end of the file says so by either way.
  return isUnable || count == 0 ? copyThroughMemory(from, to, at, size) : count;
}

/// @return 0 or errno
int keepAttributes(int file, const Item& source) {
  const timespec times[] = {{0, UTIME_OMIT},
                            {source.mtime, static_cast<long>(source.mtimeNanoseconds)}};
  return fchmod(file, source.mode & kPermissions) == 0 && futimens(file, times) == 0 ? 0 : errno;
}

}  // namespace

Reason copyContent(int from, int to, uint64_t size, Report& report) {
  const off_t end = static_cast<off_t>(size);
  off_t at = 0;
  while (at < end && !Stop::IsAsked()) {
    const off_t data = lseek(from, at, SEEK_DATA);
    if (data < 0 && errno == ENXIO) {
      break;  // a hole up to the end
    }
    const off_t hole = data < 0 ? -1 : lseek(from, data, SEEK_HOLE);
    const off_t until = hole < 0 ? end : std::min(hole, end);
    at = std::max(at, data);
    while (at < until && !Stop::IsAsked()) {
      const ssize_t count = copySome(from, to, at, static_cast<size_t>(until - at));
      if (count <= 0) {
        return count == 0 ? Reason::kChanged : reasonOf(errno);
      }
      at += count;
      report.DoneBytes(static_cast<uint64_t>(count));
    }
  }
  return ftruncate(to, end) == 0 ? Reason::kNone : reasonOf(errno);
}

Reason copyFile(const Folder& from, const std::string& name, const Folder& to,
                const std::string& newName, Existing existing, Report& report, Item& copied,
                bool& isSkipped) {
  Item taken;
  if (existing != Existing::kReplace && to.Look(newName, taken) == Reason::kNone) {
    isSkipped = existing == Existing::kSkip;  // known before the work
    return isSkipped ? Reason::kNone : Reason::kExists;
  }
  Descriptor source;
  NewFile copy;
  Reason reason = from.OpenFile(name, source, copied);
  if (reason == Reason::kNone) {
    reason = copy.Make(to);
  }
  if (reason == Reason::kNone) {
    reason = copyContent(source.Get(), copy.Get(), copied.size, report);
  }
  if (reason == Reason::kNone) {
    reason = reasonOf(keepAttributes(copy.Get(), copied));
  }
  return reason != Reason::kNone || Stop::IsAsked() ? reason
                                                    : copy.Finish(newName, existing, isSkipped);
}

Reason copyLink(const Folder& from, const std::string& name, const Folder& to,
                const std::string& newName, Existing existing, bool& isSkipped) {
  char target[PATH_MAX + 1] = {};
  if (readlinkat(from.Get(), name.c_str(), target, PATH_MAX) < 0) {
    return reasonOf(errno);
  }
  if (symlinkat(target, to.Get(), newName.c_str()) == 0) {
    return Reason::kNone;
  }
  if (errno != EEXIST || existing == Existing::kRefuse) {
    return reasonOf(errno);
  }
  if (existing == Existing::kSkip) {
    isSkipped = true;
    return Reason::kNone;
  }
  const std::string own = temporaryName();
  if (symlinkat(target, to.Get(), own.c_str()) != 0) {
    return reasonOf(errno);
  }
  const Reason reason = to.Replace(own, to, newName);
  if (reason != Reason::kNone) {
    to.RemoveFile(own);
  }
  return reason;
}

}  // namespace files
