#include "webapi/Pipe.h"

#include <fcntl.h>
#include <unistd.h>

#include <cstdint>
#include <cstring>
#include <memory>
#include <new>
#include <string>

#include "webapi/JsonHelper.h"
#include "webapi/model/Log.h"

namespace QELO {
namespace {

constexpr int kPageSize = 4096;

void closeEnd(int& end) {
  if (end >= 0) {
    close(end);
    end = -1;
  }
}

}  // namespace

Pipe::Pipe() : readEnd_(-1), writeEnd_(-1) {}

Pipe::~Pipe() {
  Close();
}

bool Pipe::Init() {
  int ends[2];
  if (pipe2(ends, O_CLOEXEC) != 0) {
    return false;
  }
  readEnd_ = ends[0];
  writeEnd_ = ends[1];
  if (geteuid() == 0) {
    // Now, since a child may give up the right to it before it knows how much it has to say.
    fcntl(writeEnd_, F_SETPIPE_SZ, kPrivilegedCapacity);
  }
  return true;
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
  // The length may take a page of its own.
  const size_t needed = size + 2 * kPageSize;
  const int capacity = fcntl(writeEnd_, F_GETPIPE_SZ);
  if (capacity < 0 || static_cast<size_t>(capacity) >= needed) {
    return true;  // not a pipe: no limit to see to
  }
  return needed <= INT32_MAX && fcntl(writeEnd_, F_SETPIPE_SZ, static_cast<int>(needed)) >= 0;
}

bool Pipe::WriteJson(const Json::Value& value) {
  const std::string text = JsonHelper::toString(value);
  if (text.size() > UINT32_MAX || !HasRoomFor(text.size())) {
    return false;
  }
  const uint32_t length = static_cast<uint32_t>(text.size());
  if (TEMP_FAILURE_RETRY(write(writeEnd_, &length, sizeof length)) != sizeof length) {
    return false;
  }
  return TEMP_FAILURE_RETRY(write(writeEnd_, text.data(), length)) == static_cast<ssize_t>(length);
}

bool Pipe::ReadJson(Json::Value& value) {
  constexpr char kSource[] = "APIUtilsPrivate.cpp";
  uint32_t length = 0;
  if (TEMP_FAILURE_RETRY(read(readEnd_, &length, sizeof length)) != sizeof length) {
    WEBAPI_LOG(kSource, "protocol failed");
    return false;
  }
  if (length == 0) {
    WEBAPI_LOG(kSource, "error size=0");
    return false;
  }
  // malloc'ed zero pages cost nothing until they are written: a child that lies about its length
  // takes no memory.
  const std::unique_ptr<char, void (*)(void*)> text(static_cast<char*>(calloc(length, 1)), free);
  if (text == nullptr) {
    WEBAPI_LOG(kSource, "new szBuf[%lu] failed", static_cast<unsigned long>(length));
    return false;
  }
  const ssize_t count = TEMP_FAILURE_RETRY(read(readEnd_, text.get(), length));
  if (count != static_cast<ssize_t>(length)) {
    WEBAPI_LOG(kSource, "read json %lu failed, got %lu", static_cast<unsigned long>(length),
               static_cast<unsigned long>(count));
    return false;
  }
  return JsonHelper::fromString(std::string(text.get(), length), value);
}

}  // namespace QELO
