#include "webapi/entry/intake/RequestBody.h"

#include <fcntl.h>
#include <poll.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <memory>

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
  const int fd = open("/dev/null", O_RDONLY | O_CLOEXEC);
  if (fd > STDIN_FILENO) {
    dup2(fd, STDIN_FILENO);
    close(fd);
  } else if (fd == STDIN_FILENO) {
    fcntl(fd, F_SETFD, 0);  // children inherit it like any standard input
  }
}

}  // namespace QELO::RequestBody
