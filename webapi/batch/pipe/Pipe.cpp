#include "webapi/Pipe.h"

#include <errno.h>
#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string>

#include "webapi/JsonHelper.h"
#include "webapi/base/BrokenPipe.h"
#include "webapi/base/Log.h"

namespace QELO {
namespace {

constexpr char kSource[] = "APIUtilsPrivate.cpp";
/// More the kernel neither writes nor reads at once.
constexpr size_t kLargestText = 0x7ffff000;

void closeEnd(int& end) {
  if (end >= 0) {
    close(end);
    end = -1;
  }
}

/// Opens a pipe away from the standard descriptors, which others replace, be they open or not.
bool openPipe(int (&ends)[2]) {
  if (pipe2(ends, O_CLOEXEC) != 0) {
    return false;
  }
  for (int& end : ends) {
    if (end <= STDERR_FILENO) {
      const int low = end;
      end = fcntl(low, F_DUPFD_CLOEXEC, STDERR_FILENO + 1);
      close(low);
    }
  }
  if (ends[0] < 0 || ends[1] < 0) {
    closeEnd(ends[0]);
    closeEnd(ends[1]);
    return false;
  }
  return true;
}

/// Puts a socket pair with that much room in the place of the descriptors of a pipe.
bool replaceBySockets(const int (&ends)[2], int room) {
  int sockets[2];
  if (socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, sockets) != 0) {
    return false;
  }
  // Refused to some: they wait for the reader when they write more than the default.
  setsockopt(sockets[1], SOL_SOCKET, SO_SNDBUFFORCE, &room, sizeof room);
  for (int i = 0; i < 2; ++i) {
    dup3(sockets[i], ends[i], O_CLOEXEC);
    close(sockets[i]);
  }
  return true;
}

/// Whether arrays and objects nest within so many levels.
bool nestsWithin(const Json::Value& value, int levels) {
  if (!value.isArray() && !value.isObject()) {
    return true;
  }
  return levels > 0 && std::all_of(value.begin(), value.end(), [&](const Json::Value& member) {
           return nestsWithin(member, levels - 1);
         });
}

/// One read of all the text: a pipe holds it, a socket is told to wait for it.
ssize_t readText(int end, char* text, size_t length) {
  const ssize_t count = TEMP_FAILURE_RETRY(recv(end, text, length, MSG_WAITALL));
  return count < 0 && errno == ENOTSOCK ? TEMP_FAILURE_RETRY(read(end, text, length)) : count;
}

}  // namespace

Pipe::Pipe() : readEnd_(-1), writeEnd_(-1), hasWritten_(false) {}

Pipe::~Pipe() {
  Close();
}

bool Pipe::Init() {
  int ends[2];
  if (!openPipe(ends)) {
    return false;
  }
  // Now, since a child may give up the right to it before it knows how much it has to say.
  if (geteuid() == 0 && fcntl(ends[1], F_SETPIPE_SZ, kPrivilegedRoom) < 0) {
    replaceBySockets(ends, kPrivilegedRoom);  // else the pipe will do as it is
  }
  Take(ends);
  sigaction(SIGPIPE, nullptr, nullptr);  // found by the dynamic loader now, not in each child
  return true;
}

bool Pipe::InitStream() {
  int ends[2];
  if (!openPipe(ends)) {
    return false;
  }
  Take(ends);
  return true;
}

void Pipe::Take(const int (&ends)[2]) {
  Close();
  readEnd_ = ends[0];
  writeEnd_ = ends[1];
  hasWritten_ = false;
}

void Pipe::ReadOnly(int fd) {
  closeEnd(writeEnd_);
  if (fd >= 0) {
    dup2(readEnd_, fd);
  }
}

void Pipe::WriteOnly(int fd) {
  closeEnd(readEnd_);
  if (fd >= 0) {
    dup2(writeEnd_, fd);
  }
}

void Pipe::Close() {
  ReadOnly(-1);
  WriteOnly(-1);
}

int Pipe::Read(char* buffer, int size) {
  memset(buffer, 0, static_cast<size_t>(size));
  return static_cast<int>(TEMP_FAILURE_RETRY(read(readEnd_, buffer, static_cast<size_t>(size))));
}

bool Pipe::HasRoomFor(size_t size) {
  const int room = fcntl(writeEnd_, F_GETPIPE_SZ);
  if (room < 0) {
    return size <= kLargestText;  // not a pipe
  }
  const size_t page = static_cast<size_t>(sysconf(_SC_PAGESIZE));
  // What a text has beyond whole pages goes into the length's page if it can, else into one of its
  // own.
  const size_t needed = (sizeof(uint32_t) + size + page - 1) / page * page;
  return static_cast<size_t>(room) >= needed ||
         (needed <= kLargestText && fcntl(writeEnd_, F_SETPIPE_SZ, static_cast<int>(needed)) >= 0);
}

bool Pipe::WriteJson(const Json::Value& value) {
  if (!nestsWithin(value, JsonHelper::kMaxDepth)) {
    WEBAPI_LOG(kSource, "json nests deeper than %d", JsonHelper::kMaxDepth);
    return false;
  }
  const std::string text = JsonHelper::toString(value);
  if (!HasRoomFor(text.size())) {
    return false;
  }
  const BrokenPipe tolerated;
  const uint32_t length = static_cast<uint32_t>(text.size());
  if (TEMP_FAILURE_RETRY(write(writeEnd_, &length, sizeof length)) != sizeof length) {
    return false;
  }
  hasWritten_ = true;
  return TEMP_FAILURE_RETRY(write(writeEnd_, text.data(), length)) == static_cast<ssize_t>(length);
}

bool Pipe::HasReader() const {
  pollfd end{writeEnd_, 0, 0};
  return writeEnd_ >= 0 && poll(&end, 1, 0) >= 0 && (end.revents & (POLLERR | POLLHUP)) == 0;
}

bool Pipe::ReadJson(Json::Value& value) {
  uint32_t length = 0;
  if (TEMP_FAILURE_RETRY(read(readEnd_, &length, sizeof length)) != sizeof length) {
    WEBAPI_LOG(kSource, "protocol failed");
    return false;
  }
  if (length == 0) {
    WEBAPI_LOG(kSource, "error size=0");
    return false;
  }
  // Zero pages cost nothing until they are written: a child that lies about its length takes no
  // memory.
  const std::unique_ptr<char, void (*)(void*)> text(static_cast<char*>(calloc(length, 1)), free);
  if (text == nullptr) {
    WEBAPI_LOG(kSource, "new szBuf[%lu] failed", static_cast<unsigned long>(length));
    return false;
  }
  const ssize_t count = readText(readEnd_, text.get(), length);
  if (count != static_cast<ssize_t>(length)) {
    WEBAPI_LOG(kSource, "read json %lu failed, got %lu", static_cast<unsigned long>(length),
               static_cast<unsigned long>(count));
    return false;
  }
  return JsonHelper::fromString(std::string(text.get(), length), value);
}

}  // namespace QELO
