#pragma once

#include <json/json.h>

#include <memory>
#include <string>

#include "webapi/Export.h"

/// The host's task manager: durable records of background work, which processes share.
///
/// A task belongs to an owner (a user's name or a pseudo-owner such as "@users") and has an id that
/// is unique for it. A record holds named JSON properties.
namespace ARDO {

struct TaskPrivate;

/// One record. Reads come from the state of the last load; updates go through to the store.
class WEBAPI_API Task {
 public:
  /// Names the record, which is made by the first update.
  Task(const std::string& owner, const std::string& taskId);
  Task(const Task&) = delete;
  Task& operator=(const Task&) = delete;
  ~Task();

  /// Collects the properties that are set until endUpdate(), which stores all or none.
  void beginUpdate();
  /// Outside of an update it is an update of its own. @return false when it was not stored
  bool setProperty(const std::string& name, const Json::Value& value);
  /// @return false when nothing was stored; a record that was removed is not made again
  bool endUpdate();

  /// Null when there is no such property. The "body" of a task that ended without being finished is
  /// an error body, whatever its process had set.
  Json::Value getProperty(const std::string& name) const;
  bool hasProperty(const std::string& name) const;
  bool getBoolProperty(const std::string& name, bool def) const;

  /// Whether the task ended: it was finished, or its process is gone.
  bool isFinished() const;
  /// Marks the task as ended. @param remove  removes the record as well
  /// @return false when that was not stored
  bool finish(bool remove);
  /// Removes the record. @return false when there is none or it cannot be removed
  bool remove();
  /// Reads the record anew. @return false when there is none
  bool reload();
  /// Whether the last read found the store busy, so that there may be a record all the same.
  bool isBusy() const;

  /// Records the process that does the work, by its id and start time.
  bool setCreatePid(int pid);
  /// That process's id while it is the process that was recorded, and alive; else 0.
  int getCreatePid() const;
  std::string getTaskId() const;

  /// Waits for a property that another process sets, and reads the record.
  /// @param limit  longest time in units of 10 ms; it returns sooner when the task has ended or its
  ///               record is removed meanwhile
  /// @return whether the property is there
  bool waitForDataReady(const std::string& name, int limit);
  /// Waits until the record changes after its last read: by an update, its end or its removal.
  /// Reads it anew; a record that was not read before is read first.
  /// @param limit  longest time in units of 10 ms
  /// @return false when the limit passed first
  bool waitForChange(int limit);

 private:
  std::unique_ptr<TaskPrivate> private_;
};

/// The records of one owner.
class WEBAPI_API TaskMgr {
 public:
  explicit TaskMgr(const std::string& owner);
  /// The ids of the owner's tasks, oldest first, as an array of strings.
  /// @param prefix  only those that start with it; null for all
  Json::Value getAllTaskId(const char* prefix);
  /// Of those the ones that nobody has found ended yet. Ended ones cost nothing, however many.
  Json::Value getUnendedTaskId(const char* prefix);
  /// Whether the last list lacks tasks of the owner because a store that is waited for was busy.
  /// Stores of other users, which may hold what is everybody's, are left out when they are.
  bool isIncomplete() const { return isIncomplete_; }

 private:
  std::string owner_;
  bool isIncomplete_ = false;
};

class WEBAPI_API TaskUtil {
 public:
  /// A new id that starts with `prefix` and cannot be guessed. Only the user that the process runs
  /// as now, and root, can use it.
  /// @param prefix  up to 128 letters, digits, '.', '_' and '-'
  /// @return "" when the prefix holds something else (logged)
  static std::string getUniqueID(const std::string& owner, const std::string& prefix);
  static bool checkTaskExists(const std::string& owner, const std::string& taskId);
};

}  // namespace ARDO
