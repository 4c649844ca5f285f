#pragma once

#include <functional>
#include <list>
#include <memory>
#include <string>
#include <utility>

#include "programs/webapi-server/front/WorkerLink.h"
#include "programs/webapi-server/workers/WorkerLimits.h"

namespace QELO {

/// The workers of one front, one an account and priority, those used last in front.
class WorkerLinks {
 public:
  /// @param start  has a worker started: none when there may be no more
  WorkerLinks(const WorkerLimits& limits, std::function<UniqueFd(const std::string& key)> start);

  /// A worker that waits for a call, with this account and priority.
  /// @return null: there is none at present
  WorkerLink* Get(const std::string& key);
  /// Parts from a worker, which ends when it is told nothing more.
  void Drop(const std::string& key);
  /// A call was sent to it, and more will be.
  void Used(const std::string& key);

 private:
  struct Entry {
    std::string key;
    std::unique_ptr<WorkerLink> link;
    bool isNew;  ///< nothing was sent yet
  };
  using Entries = std::list<Entry>;

  Entries::iterator Find(const std::string& key);
  bool Start(const std::string& key);

  const WorkerLimits limits_;
  const std::function<UniqueFd(const std::string&)> start_;
  Entries entries_;
};

}  // namespace QELO
