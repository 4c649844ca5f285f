#include "programs/webapi-exec/transfer/UploadBody.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/random.h>
#include <sys/sendfile.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <cstring>

#include "programs/webapi-exec/follow/ProgressScreen.h"
#include "programs/webapi-exec/transfer/ByteProgress.h"
#include "webapi/base/Hex.h"
#include "webapi/base/TextFile.h"

namespace QELO::ExecProgram {
namespace {

constexpr size_t kBoundaryBytes = 16;
constexpr off_t kAtOnce = 1 << 20;  ///< bytes between two looks at the terminal

std::string makeBoundary() {
  char bytes[kBoundaryBytes] = {};
  const ssize_t count = getrandom(bytes, sizeof bytes, 0);
  return HexText(std::string_view(bytes, count == sizeof bytes ? sizeof bytes : 0));
}

/// A text between quotes, as browsers write it.
std::string quoted(const std::string& text) {
  std::string safe;
  for (const char c : text) {
    safe += c == '"' ? "%22" : c == '\r' ? "%0D" : c == '\n' ? "%0A" : std::string(1, c);
  }
  return '"' + safe + '"';
}

bool sendFile(int pipe, int file, off_t start, off_t length, ByteProgress& progress) {
  off_t position = start;
  const off_t end = start + length;
  while (position < end) {
    const auto wanted = static_cast<size_t>(std::min(end - position, kAtOnce));
    const ssize_t count = TEMP_FAILURE_RETRY(sendfile(pipe, file, &position, wanted));
    if (count <= 0) {
      return false;
    }
    progress.Add(static_cast<uint64_t>(count));
  }
  return true;
}

}  // namespace

UploadBody::UploadBody() : boundary_(makeBoundary()) {}

UploadBody::~UploadBody() {
  if (process_ > 0) {
    kill(process_, SIGTERM);
    TEMP_FAILURE_RETRY(waitpid(process_, nullptr, 0));
  }
}

std::string UploadBody::Open(const std::vector<std::pair<std::string, std::string>>& files) {
  for (const auto& [field, path] : files) {
    Part part;
    struct stat info {};
    const int error = OpenRegularFile(AT_FDCWD, path.c_str(), part.file, info, 0);
    if (error != 0) {
      return path + ": " + (error == EINVAL ? "not a regular file" : strerror(error));
    }
    part.length = info.st_size;
    part.head = (parts_.empty() ? "--" : "\r\n--") + boundary_ +
                "\r\nContent-Disposition: form-data; name=" + quoted(field) +
                "; filename=" + quoted(path.substr(path.rfind('/') + 1)) +
                "\r\nContent-Type: application/octet-stream\r\n\r\n";
    parts_.push_back(std::move(part));
  }
  return "";
}

void UploadBody::Resume(uid_t caller, const std::string& call) {
  struct stat info {};
  if (parts_.size() != 1 || fstat(parts_.front().file.Get(), &info) != 0) {
    return;
  }
  Part& part = parts_.front();
  slice_.Find(caller, call, info);
  part.start = static_cast<off_t>(slice_.There());
  part.length -= part.start;
}

Json::Value UploadBody::Request() const {
  Json::Value request(Json::objectValue);
  request["CONTENT_TYPE"] = Type();
  request["CONTENT_LENGTH"] = std::to_string(Length());
  slice_.Tell(request);
  return request;
}

uint64_t UploadBody::Length() const {
  uint64_t length = boundary_.size() + 8;  // with the line end before it and its dashes
  for (const Part& part : parts_) {
    length += part.head.size() + static_cast<uint64_t>(part.length);
  }
  return length;
}

bool UploadBody::Start() {
  int ends[2];
  if (pipe2(ends, O_CLOEXEC) != 0) {
    return false;
  }
  UniqueFd reading(ends[0]);
  UniqueFd writing(ends[1]);
  process_ = fork();
  if (process_ == 0) {
    reading = UniqueFd();
    Write(writing.Get());
  }
  return process_ > 0 && dup2(reading.Get(), STDIN_FILENO) == STDIN_FILENO &&
         setenv("CONTENT_TYPE", Type().c_str(), 1) == 0 &&
         setenv("CONTENT_LENGTH", std::to_string(Length()).c_str(), 1) == 0;
}

void UploadBody::Write(int pipe) const {
  signal(SIGPIPE, SIG_IGN);          // a method that needs no more of it
  prctl(PR_SET_PDEATHSIG, SIGKILL);  // a call that is ended has sent no more than this
  ByteProgress progress(true);
  progress.Begin(There(), There() + Length());
  bool isGood = true;
  for (const Part& part : parts_) {
    isGood = isGood && WriteText(pipe, part.head) &&
             sendFile(pipe, part.file.Get(), part.start, part.length, progress);
    progress.Add(isGood ? part.head.size() : 0);
  }
  const std::string end = "\r\n--" + boundary_ + "--\r\n";
  if (isGood && WriteText(pipe, end)) {
    progress.Add(end.size());
  }
  _exit(0);
}

}  // namespace QELO::ExecProgram
