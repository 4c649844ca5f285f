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
bool receive(int fd, size_t size, const PaceLimits& limits, std::string& text) {
  Pace pace(limits);
  while (text.size() < size) {
    const int ready = pace.Await(fd, POLLIN);
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
    pace.Add(text.size() - received);
  }
  return true;
}

}  // namespace

bool Read(int fd, int64_t length, const PaceLimits& limits, std::string& text) {
  std::string received;
  try {
    // The kernel gives pages as they are written to, so an announced length costs nothing.
    received.reserve(static_cast<size_t>(length));
  } catch (const std::exception&) {
    return false;
  }
  if (!receive(fd, static_cast<size_t>(length), limits, received)) {
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
