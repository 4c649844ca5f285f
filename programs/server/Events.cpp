#include "programs/server/Events.h"

#include <sys/epoll.h>

namespace QELO {
namespace {

constexpr int kAtOnce = 64;

}  // namespace

bool Events::Open() {
  events_ = UniqueFd(epoll_create1(EPOLL_CLOEXEC));
  return static_cast<bool>(events_);
}

bool Events::Watch(int descriptor) {
  epoll_event event{};
  event.events = EPOLLIN;
  event.data.fd = descriptor;
  return epoll_ctl(events_.Get(), EPOLL_CTL_ADD, descriptor, &event) == 0;
}

void Events::Unwatch(int descriptor) {
  epoll_ctl(events_.Get(), EPOLL_CTL_DEL, descriptor, nullptr);
}

std::vector<int> Events::Wait(std::chrono::milliseconds limit) {
  epoll_event events[kAtOnce];
  const int count = epoll_wait(events_.Get(), events, kAtOnce, static_cast<int>(limit.count()));
  std::vector<int> descriptors;
  for (int i = 0; i < count; ++i) {
    descriptors.push_back(events[i].data.fd);
  }
  return descriptors;
}

}  // namespace QELO
