#include "webapi/entry/intake/RequestBody.h"

#include <poll.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <exception>
#include <utility>

#include "webapi/base/NullDevice.h"

namespace QELO::RequestBody {
namespace {

constexpr size_t kPiece = 64 << 10;  // bytes that a pipe holds

/// Reads up to `size` bytes into a text that has room for them.
/// @return false when the input cannot be read
bool receive(int fd, size_t size, std::chrono::milliseconds idleLimit, std::string& text) {
  while (text.size() < size) {
    pollfd input{fd, POLLIN, 0};
    const int ready = TEMP_FAILURE_RETRY(poll(&input, 1, static_cast<int>(idleLimit.count())));
    if (ready <= 0) {
      return ready == 0;
    }
    const size_t received = text.size();
    text.resize(std::min(size, received + kPiece));
    const ssize_t count =
        TEMP_FAILURE_RETRY(read(fd, text.data() + received, text.size() - received));
    text.resize(received + static_cast<size_t>(std::max<ssize_t>(count, 0)));
    if (count == 0 || (count < 0 && errno != EAGAIN)) {
      return count == 0;
    }
  }
  return true;
}

}  // namespace

bool Read(int fd, int64_t length, std::chrono::milliseconds idleLimit, std::string& text) {
  std::string received;
  try {
    // The kernel gives pages as they are written to, so an announced length costs nothing.
    received.reserve(static_cast<size_t>(length));
  } catch (const std::exception&) {
    return false;
  }
  if (!receive(fd, static_cast<size_t>(length), idleLimit, received)) {
    return false;
  }
  received.resize(std::min(received.find('\0'), received.size()));
  text = std::move(received);
  return true;
}

void CloseStandardInput() {
  PutNullOver({STDIN_FILENO}, O_RDONLY);
}

}  // namespace QELO::RequestBody
