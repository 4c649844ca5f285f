#include "programs/webapi-server/front/Front.h"

#include <fcntl.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdint>
#include <cstring>
#include <exception>

#include "programs/webapi-server/EntryName.h"
#include "programs/webapi-server/ScgiHeader.h"
#include "programs/webapi-server/workers/MemoryUse.h"
#include "webapi/WebEntry.h"
#include "webapi/base/Log.h"

namespace QELO {
namespace {

constexpr char kSource[] = "Front.cpp";
constexpr unsigned kMostRequests = 20000;
constexpr size_t kMostMemory = size_t{96} << 20;  ///< bytes of its own that a front may have
/// Processes of a front that wait for a slow method or a slow client. One more is not begun.
constexpr size_t kMostWaiters = 8;
char* noEnvironment[] = {nullptr};

/// Makes a copy of the body standard input, and leaves the body in the connection.
bool copyBodyToInput(int connection, int64_t length) {
  std::string body(static_cast<size_t>(length), '\0');
  int ends[2];
  if (recv(connection, body.data(), body.size(), MSG_PEEK | MSG_DONTWAIT) != length ||
      pipe2(ends, O_CLOEXEC) != 0) {
    return false;
  }
  const UniqueFd reading(ends[0]);
  const UniqueFd writing(ends[1]);
  const bool done = write(writing.Get(), body.data(), body.size()) == length &&
                    dup2(reading.Get(), STDIN_FILENO) == STDIN_FILENO;
  explicit_bzero(body.data(), body.size());
  return done;
}

}  // namespace

Front::Front(UniqueFd channel, const WorkerLimits& limits, int argc, char** argv)
    : channel_(std::move(channel)),
      limits_(limits),
      argc_(argc),
      argv_(argv),
      workers_(limits, [this](const std::string& key) { return StartWorker(key); }),
      null_(open("/dev/null", O_RDWR | O_CLOEXEC)) {}

UniqueFd Front::StartWorker(const std::string& key) {
  ControlChannel::Message reply;
  if (!ControlChannel::Send(channel_.Get(), ControlChannel::kWantWorker, key, -1, true) ||
      !ControlChannel::Receive(channel_.Get(), reply, true) ||
      reply.kind != ControlChannel::kWorker) {
    return UniqueFd();
  }
  return std::move(reply.descriptor);
}

void Front::ReapWaiters() {
  for (pid_t pid; (pid = waitpid(-1, nullptr, WNOHANG)) > 0;) {
    waiters_.erase(std::remove(waiters_.begin(), waiters_.end(), pid), waiters_.end());
  }
}

Ending Front::WornOut() const {
  if (served_ >= kMostRequests) {
    return Ending::kCalls;
  }
  return served_ % 16 == 0 && OwnMemory() > kMostMemory ? Ending::kMemory : Ending::kTold;
}

/// @return whether the request is served, or somebody's who serves it
bool Front::Serve(std::string& header, const UniqueFd& connection) {
  std::vector<char*> environment;
  int64_t length = 0;
  if (!ScgiHeader::Parse(header, environment, length) ||
      (length > 0 && !copyBodyToInput(connection.Get(), length)) ||
      dup2(connection.Get(), STDOUT_FILENO) != STDOUT_FILENO) {
    return false;
  }
  FrontRoad road(workers_, limits_, connection.Get(), length, waiters_.size() < kMostWaiters);
  environ = environment.data();
  try {
    WebEntry entry;
    entry.SetArgs(argc_, argv_);
    entry.RunBy(road);
  } catch (const std::exception& error) {
    WEBAPI_LOG(kSource, "%s", LogText(error.what()).c_str());
  }
  environ = noEnvironment;
  dup2(null_.Get(), STDIN_FILENO);
  dup2(null_.Get(), STDOUT_FILENO);
  if (!road.IsLeft()) {
    shutdown(connection.Get(), SHUT_RDWR);
  }
  if (road.IsWaiter()) {
    _exit(0);
  }
  if (road.Waiter() > 0) {
    waiters_.push_back(road.Waiter());
  }
  return !road.IsServedApart();
}

int Front::Run() {
  using namespace ControlChannel;
  TakeEntryName();
  environ = noEnvironment;
  for (Message message; Receive(channel_.Get(), message, true); message = Message()) {
    if (message.kind != kRequest) {
      continue;
    }
    ReapWaiters();
    const bool served = Serve(message.text, message.descriptor);
    message.descriptor = UniqueFd();
    explicit_bzero(message.text.data(), message.text.size());
    ++served_;
    const Ending ending = WornOut();
    const bool isLast = ending != Ending::kTold;
    const char word = served ? (isLast ? kDoneLast : kDone) : (isLast ? kLeftLast : kLeft);
    if (!Send(channel_.Get(), word, "", -1, true) || isLast) {
      return static_cast<int>(ending);
    }
  }
  return static_cast<int>(Ending::kTold);
}

}  // namespace QELO
