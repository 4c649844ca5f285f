#include "programs/webapi-server/front/WorkerLinks.h"

#include <algorithm>

namespace QELO {
namespace {

/// For a worker to have put things back after the call before, which it mostly has.
constexpr std::chrono::milliseconds kReadyPatience{10};
/// For a new one to have taken its account.
constexpr std::chrono::milliseconds kStartPatience{20};
/// For a call to be taken: it goes into the socket as a whole.
constexpr std::chrono::seconds kSendLimit{2};
/// Beyond a call's own limit, at which its worker is killed.
constexpr std::chrono::seconds kMargin{10};

}  // namespace

WorkerLinks::WorkerLinks(const WorkerLimits& limits,
                         std::function<UniqueFd(const std::string& key)> start)
    : limits_(limits), start_(std::move(start)) {}

WorkerLinks::Entries::iterator WorkerLinks::Find(const std::string& key) {
  return std::find_if(entries_.begin(), entries_.end(),
                      [&](const Entry& entry) { return entry.key == key; });
}

bool WorkerLinks::Start(const std::string& key) {
  const size_t most = std::max(1U, limits_.workers / std::max(1U, limits_.fronts));
  while (entries_.size() >= most) {
    entries_.pop_back();
  }
  UniqueFd socket = start_(key);
  if (!socket) {
    return false;
  }
  const qelodaemon::Limits limits{std::chrono::seconds(0), kSendLimit, limits_.call + kMargin};
  entries_.push_front({key, std::make_unique<WorkerLink>(std::move(socket), limits), true});
  return true;
}

WorkerLink* WorkerLinks::Get(const std::string& key) {
  auto found = Find(key);
  if (found != entries_.end()) {
    const bool isNew = found->isNew;
    const auto coming = found->link->AwaitReady(isNew ? kStartPatience : kReadyPatience);
    if (coming == WorkerLink::Coming::kWhole) {
      entries_.splice(entries_.begin(), entries_, found);
      return found->link.get();
    }
    if (isNew && coming == WorkerLink::Coming::kLater) {
      return nullptr;  // it may be for the next call
    }
    entries_.erase(found);
    if (isNew) {
      return nullptr;  // nobody can be had for that account, as the next look-up may find again
    }
  }
  if (!Start(key)) {
    return nullptr;
  }
  WorkerLink& link = *entries_.front().link;
  const auto coming = link.AwaitReady(kStartPatience);
  if (coming == WorkerLink::Coming::kGone) {
    entries_.pop_front();
  }
  return coming == WorkerLink::Coming::kWhole ? &link : nullptr;
}

void WorkerLinks::Used(const std::string& key) {
  const auto found = Find(key);
  if (found != entries_.end()) {
    found->isNew = false;
  }
}

void WorkerLinks::Drop(const std::string& key) {
  const auto found = Find(key);
  if (found != entries_.end()) {
    entries_.erase(found);
  }
}

}  // namespace QELO
