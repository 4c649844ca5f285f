// What may take long: copy, move, remove. Small work is done at once, large work in the background.

#include <unistd.h>
#include <webapi/APIPolling.h>

#include <functional>

#include "calls/Call.h"
#include "calls/Methods.h"
#include "calls/ReadExisting.h"
#include "work/Report.h"
#include "work/Stop.h"
#include "work/Walks.h"

namespace files {
namespace {

using QELO::APIPolling;
using QELO::APIRequest;
using QELO::APIResponse;

constexpr char kTaskPrefix[] = "files_";
constexpr int kMostTasks = 4;       ///< of a user at once
constexpr int kLimitReached = 507;  ///< of APIPolling
constexpr int kNiceness = 10;

constexpr unsigned kSmallItems = 200;       ///< what is done at once
constexpr uint64_t kSmallBytes = 64 << 20;  ///< what is done at once

enum class Kind { kCopy, kMove, kRemove };

/// What one call asks for.
struct Job {
  Kind kind = Kind::kCopy;
  Existing existing = Existing::kRefuse;
  const Shares* shares = nullptr;
  /// They are opened one after the other: there may be more than the process may hold open.
  std::vector<VirtualPath> items;
  std::string newName;  ///< of the one item; "": their own names
  Folder to;
};

const char* stateOf(Kind kind) {
  return kind == Kind::kCopy ? "copying" : kind == Kind::kMove ? "moving" : "removing";
}

std::string newNameOf(const Job& job, const VirtualPath& path) {
  return job.newName.empty() ? path.Name() : job.newName;
}

/// Whether a move of the item is nothing but a new name.
bool isRenaming(const Job& job, const Located& located) {
  Item item;
  Item target;
  Item taken;
  return job.kind == Kind::kMove && located.Look(item) == Reason::kNone &&
         job.to.LookAtItself(target) == Reason::kNone && item.mount == target.mount &&
         job.to.Look(newNameOf(job, located.path), taken) == Reason::kNotFound;
}

/// What the work will come to. @return false when `found` ended it
bool count(const Job& job, const std::function<bool(uint64_t)>& found) {
  for (const VirtualPath& path : job.items) {
    Located located;
    if (locate(*job.shares, path, located) != Reason::kNone) {
      continue;
    }
    if (isRenaming(job, located)
            ? !found(0)
            : !countItems({located.parent, located.name, path.Text()}, found)) {
      return false;
    }
  }
  return true;
}

bool isSmall(const Job& job) {
  unsigned items = 0;
  uint64_t bytes = 0;
  return count(job, [&](uint64_t size) {
    bytes += size;
    return ++items <= kSmallItems && (bytes <= kSmallBytes || job.kind == Kind::kRemove);
  });
}

void doWork(const Job& job, Report& report) {
  report.StartWork();
  Transfer transfer(job.to, job.existing, job.kind == Kind::kMove, report);
  for (const VirtualPath& path : job.items) {
    Located located;
    if (Stop::IsAsked()) {
      return;
    }
    if (const Reason reason = locate(*job.shares, path, located); reason != Reason::kNone) {
      report.Failed(path.Text(), reason);
      continue;
    }
    const Stand stand{located.parent, located.name, path.Text()};
    if (job.kind == Kind::kRemove) {
      removeItem(stand, report);
    } else {
      transfer.Do(stand, newNameOf(job, path));
    }
  }
}

/// The first failure is the error, with all that was done and failed beside it.
void answer(Report& report, APIResponse& response) {
  report.Finish();
  Json::Value data = report.Json();
  if (report.FailedItems() == 0) {
    response.SetSuccess(data);
    return;
  }
  data["path"] = data["errors"][0]["path"];
  data["reason"] = data["errors"][0]["reason"];
  response.SetError(static_cast<int>(report.FirstReason()), data);
}

void workInBackground(APIRequest*, APIResponse* response, void* argument) {
  const Job& job = *static_cast<const Job*>(argument);
  Stop::Watch();
  [[maybe_unused]] const int niceness = nice(kNiceness);  // people at work go first
  Report report(stateOf(job.kind));
  report.TellTo([&](const Json::Value& data) { response->SetSuccess(data); });
  count(job, [&](uint64_t bytes) {
    report.Found(bytes);
    return !Stop::IsAsked();
  });
  doWork(job, report);
  if (!Stop::IsAsked()) {
    answer(report, *response);
  }
}

void run(Call& call, Job& job) {
  if (isSmall(job)) {
    Report report(stateOf(job.kind));
    count(job, [&](uint64_t bytes) {
      report.Found(bytes);
      return true;
    });
    doWork(job, report);
    answer(report, call.Response());
    return;
  }
  APIPolling polling(&call.Request());
  polling.SetPrefixAttr(kTaskPrefix);
  polling.SetRemoveAttr(false);  // the result is there to be fetched
  polling.SetLimit(kMostTasks);
  if (!polling.Start(&call.Response(), workInBackground, &job) &&
      polling.GetError() == kLimitReached) {
    call.Refuse(Reason::kTooManyTasks, job.items.front());
  }
}

/// The items of the call, all of them there. @return false when it was refused, which is the answer
bool readItems(Call& call, Job& job) {
  job.shares = &call.SharedFolders();
  if (!call.ReadPaths("path", job.items)) {
    return false;
  }
  for (const VirtualPath& path : job.items) {
    Located located;
    Item item;
    if (path.IsRoot() || path.IsShare()) {
      return call.Refuse(Reason::kShareItself, path);
    }
    if (!(job.kind == Kind::kCopy ? call.Locate(path, located)
                                  : call.LocateForChange(path, located))) {
      return false;
    }
    if (const Reason reason = located.Look(item); reason != Reason::kNone) {
      return call.Refuse(reason, path);
    }
  }
  return true;
}

/// The folder that the items go into. @return false when it was refused, which is the answer
bool readTarget(Call& call, Job& job) {
  const auto name = call.Request().GetAndCheckString("name", APIRequest::PARAM_OPTIONAL);
  VirtualPath to;
  if (name.IsInvalid() || name.IsReset() || (name.IsSet() && job.items.size() != 1) ||
      !readExisting(call.Request(), job.existing)) {
    return call.RefuseParameters();
  }
  if (!call.ReadPath("to", to) || !call.OpenFolderForChange(to, job.to)) {
    return false;
  }
  if (name.IsSet() && !isNewName(name.Get())) {
    return call.Refuse(Reason::kBadName, name.Get());
  }
  for (const VirtualPath& path : job.items) {
    if (to.IsWithin(path)) {
      return call.Refuse(Reason::kIntoItself, path);
    }
  }
  job.newName = name.Get();
  return true;
}

void transfer(APIRequest* request, APIResponse* response, Kind kind) {
  Call call(request, response);
  Job job;
  job.kind = kind;
  if (readItems(call, job) && readTarget(call, job)) {
    run(call, job);
  }
}

}  // namespace

void copy(APIRequest* request, APIResponse* response) {
  transfer(request, response, Kind::kCopy);
}

void move(APIRequest* request, APIResponse* response) {
  transfer(request, response, Kind::kMove);
}

void remove(APIRequest* request, APIResponse* response) {
  Call call(request, response);
  Job job;
  job.kind = Kind::kRemove;
  if (readItems(call, job)) {
    run(call, job);
  }
}

}  // namespace files
