#include "webapi/entry/intake/RequestBody.h"

#include <poll.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <memory>

#include "webapi/base/NullDevice.h"

namespace QELO::RequestBody {
namespace {

struct Free {
  void operator()(char* memory) const { free(memory); }
};

}  // namespace

bool Read(int fd, int64_t length, std::chrono::milliseconds idleLimit, std::string& text) {
  const size_t size = static_cast<size_t>(length);
  // Zeroed by the kernel page by page as bytes arrive, so that an announced length costs nothing.
  const std::unique_ptr<char, Free> buffer(static_cast<char*>(calloc(size + 1, 1)));
  if (buffer == nullptr) {
    return false;
  }
  size_t received = 0;
  while (received < size) {
    pollfd input{fd, POLLIN, 0};
    const int ready = TEMP_FAILURE_RETRY(poll(&input, 1, static_cast<int>(idleLimit.count())));
    if (ready < 0) {
      return false;
    }
    if (ready == 0) {
      break;
    }
    const ssize_t count = TEMP_FAILURE_RETRY(read(fd, buffer.get() + received, size - received));
    if (count < 0 && errno != EAGAIN) {
      return false;
    }
    if (count == 0) {
      break;
    }
    received += count > 0 ? static_cast<size_t>(count) : 0;
  }
  text = buffer.get();
  return true;
}

void CloseStandardInput() {
  PutNullOver({STDIN_FILENO}, O_RDONLY);
}

}  // namespace QELO::RequestBody
