#pragma once

#include <json/json.h>

#include <cstdint>
#include <functional>
#include <string>
#include <vector>

/// The host's task manager as unit tests want it: records are files of a directory, so that real
/// forked processes share them, and each operation fails on demand.
struct FakeTask {
  /// The one in use; a fresh one without records for every test that calls Reset().
  static FakeTask& Get();
  static FakeTask& Reset();

  /// Calls of this process: "Operation(argument, ...)" in order. A child's are its own.
  std::vector<std::string> calls;
  /// The steps of updates of this process: "beginUpdate", "setProperty(name)" and "endUpdate" in
  /// order; a property that is set outside of an update has one of its own.
  std::vector<std::string> updateSteps;

  std::string nextId = "id1";       ///< what getUniqueID appends to the prefix
  bool endUpdate = true;            ///< false: nothing is stored
  bool finish = true;               ///< false: nothing is stored
  bool setCreatePid = true;         ///< false: nothing is stored
  bool tellDead = false;            ///< getCreatePid answers a process that has ended, too
  bool busy = false;                ///< no record can be read
  size_t largestUpdate = SIZE_MAX;  ///< longer ones, as JSON text, are not stored
  /// Called by operations once they have looked at the records or changed them: what another
  /// process does in that moment. Named as in `calls`.
  std::function<void(const std::string& operation)> meanwhile;

  /// A record: {"properties": {...}, "finished": bool, "pid": int}; null when there is none.
  Json::Value Record(const std::string& owner, const std::string& taskId) const;
  /// Replaces a record; null removes it.
  void Put(const std::string& owner, const std::string& taskId, const Json::Value& record) const;
  /// Changes a record as one step for all processes. @return false when there is none
  bool Change(const std::string& owner, const std::string& taskId, bool create,
              const std::function<void(Json::Value&)>& change) const;
  std::vector<std::string> Ids(const std::string& owner) const;

  std::string directory;
};
