#include "platform/tasks/module/TaskDatabase.h"

#include <algorithm>
#include <tuple>

#include "platform/tasks/module/Patience.h"
#include "platform/tasks/module/Transaction.h"

namespace QELO::Platform {

TaskDatabase::TaskDatabase(sqlite3* database, KeepSeconds keepSeconds)
    : database_(database), keepSeconds_(keepSeconds) {}

TaskResult TaskDatabase::Load(const TaskKey& key, TaskRecord& record) {
  Statement statement(
      Prepare("SELECT t.ending, t.pid, t.start, t.boot, t.born, t.version, p.name, p.value"
              " FROM tasks t LEFT JOIN properties p ON p.task=t.id"
              " WHERE t.owner=?1 AND t.task=?2"));
  statement.Text(1, key.owner).Text(2, key.id);
  record = {};
  int64_t size = 0;
  bool found = false;
  for (; statement.Row(); found = true) {
    record.ending = static_cast<TaskEnding>(statement.NumberAt(0));
    record.process = {static_cast<pid_t>(statement.NumberAt(1)),
                      static_cast<uint64_t>(statement.NumberAt(2)), statement.TextAt(3)};
    record.born = statement.NumberAt(4);
    record.version = statement.NumberAt(5);
    if (!statement.IsNull(6)) {
      std::string value = statement.TextAt(7);
      size += static_cast<int64_t>(value.size());
      record.properties.emplace(statement.TextAt(6), std::move(value));
    }
    if (size > kLargestRecord) {
      error_ = "a record is too large";
      return TaskResult::kFailed;
    }
  }
  if (!statement.Good()) {
    return Fail();
  }
  return found ? TaskResult::kDone : TaskResult::kMissing;
}

TaskResult TaskDatabase::Update(const TaskKey& key, const TaskProperties& properties) {
  Transaction transaction(*this);
  if (!transaction.Begun()) {
    return Fail();
  }
  int64_t row = 0;
  TaskResult result = Find(key, row);
  if (result == TaskResult::kMissing) {
    result = Create(key, row);
  }
  if (result != TaskResult::kDone) {
    return result;
  }
  if (!Put(row, properties)) {
    return TaskResult::kFailed;
  }
  return transaction.Commit() ? TaskResult::kDone : Fail();
}

TaskResult TaskDatabase::SetProcess(const TaskKey& key, const ProcessIdentity& process) {
  Statement statement(
      Prepare("UPDATE tasks SET pid=?3, start=?4, boot=?5, version=version+1,"
              " changed=?6, finished=CASE WHEN ending=1 THEN finished END,"
              " ending=CASE WHEN ending=1 THEN 1 ELSE 0 END WHERE owner=?1 AND task=?2"));
  statement.Text(1, key.owner).Text(2, key.id).Number(3, process.pid);
  statement.Number(4, static_cast<int64_t>(process.start)).Text(5, process.boot);
  return Changed(statement.Number(6, currentMilliseconds()).Run());
}

TaskResult TaskDatabase::Finish(const TaskKey& key) {
  Statement statement(
      Prepare("UPDATE tasks SET ending=1, finished=coalesce(finished, ?3), version=version+1"
              " WHERE owner=?1 AND task=?2"));
  statement.Text(1, key.owner).Text(2, key.id).Number(3, currentMilliseconds());
  return Changed(statement.Run());
}

TaskResult TaskDatabase::MarkEnded(const TaskKey& key, const ProcessIdentity& process,
                                   TaskEnding ending) {
  Statement statement(
      Prepare("UPDATE tasks SET ending=?3, finished=?4, version=version+1"
              " WHERE owner=?1 AND task=?2 AND ending=0 AND pid=?5 AND start=?6 AND boot=?7"));
  statement.Text(1, key.owner).Text(2, key.id).Number(3, static_cast<int>(ending));
  statement.Number(4, currentMilliseconds()).Number(5, process.pid);
  statement.Number(6, static_cast<int64_t>(process.start)).Text(7, process.boot);
  return Changed(statement.Run());
}

TaskResult TaskDatabase::Remove(const TaskKey& key) {
  Transaction transaction(*this);
  int64_t row = 0;
  if (!transaction.Begun()) {
    return Fail();
  }
  const TaskResult found = Find(key, row);
  if (found != TaskResult::kDone) {
    return found;
  }
  // Its process may still set a result; that must not bring the record back.
  Statement statement(
      Prepare("INSERT OR REPLACE INTO removed(owner, task, time) VALUES(?1,?2,?3)"));
  statement.Text(1, key.owner).Text(2, key.id).Number(3, currentMilliseconds());
  return Erase(row) && statement.Run() && transaction.Commit() ? TaskResult::kDone : Fail();
}

TaskResult TaskDatabase::List(const TaskQuery& query, std::vector<ListedTask>& tasks) {
  Tidy();
  // The index holds all that is read here. In the order of age it would take twice as long.
  constexpr char kAll[] =
      "SELECT task, created, id FROM tasks INDEXED BY tasks_named"
      " WHERE owner=?1 AND task>=?2 AND task<?3 LIMIT ?4";
  constexpr char kUnended[] =
      "SELECT task, created, id FROM tasks INDEXED BY tasks_running"
      " WHERE finished IS NULL AND owner=?1 AND task>=?2 AND task<?3 LIMIT ?4";
  Statement statement(Prepare(query.unended ? kUnended : kAll));
  const std::string end = query.prefix + '\x7f';  // behind every character of an id
  statement.Text(1, query.owner).Text(2, query.prefix).Text(3, end).Number(4, kMostListed);
  while (statement.Row()) {
    tasks.push_back({statement.TextAt(0), statement.NumberAt(1), statement.NumberAt(2)});
  }
  std::sort(tasks.begin(), tasks.end(), [](const ListedTask& left, const ListedTask& right) {
    return std::tie(left.created, left.row) < std::tie(right.created, right.row);
  });
  return statement.Good() ? TaskResult::kDone : Fail();
}

void TaskDatabase::SetPatience(int milliseconds) {
  if (milliseconds != patienceMs_) {
    patienceMs_ = milliseconds;
    sqlite3_busy_timeout(database_.get(), milliseconds);
  }
}

sqlite3_stmt* TaskDatabase::Prepare(const char* sql) {
  auto& statement = statements_[sql];
  if (!statement) {
    sqlite3_stmt* prepared = nullptr;
    sqlite3_prepare_v3(database_.get(), sql, -1, SQLITE_PREPARE_PERSISTENT, &prepared, nullptr);
    statement.reset(prepared);
  }
  return statement.get();
}

TaskResult TaskDatabase::Find(const TaskKey& key, int64_t& row) {
  Statement statement(Prepare("SELECT id FROM tasks WHERE owner=?1 AND task=?2"));
  if (statement.Text(1, key.owner).Text(2, key.id).Row()) {
    row = statement.NumberAt(0);
    return TaskResult::kDone;
  }
  return statement.Good() ? TaskResult::kMissing : Fail();
}

TaskResult TaskDatabase::Create(const TaskKey& key, int64_t& row) {
  Statement removed(Prepare("SELECT 1 FROM removed WHERE owner=?1 AND task=?2"));
  if (removed.Text(1, key.owner).Text(2, key.id).Row()) {
    return TaskResult::kRemoved;
  }
  const int64_t now = currentMilliseconds();
  const std::string boot = readBootId();
  Statement statement(
      Prepare("INSERT INTO tasks(owner, task, created, changed, born, boot)"
              " VALUES(?1, ?2, ?3, ?3, ?4, ?5)"));
  statement.Text(1, key.owner).Text(2, key.id).Number(3, now);
  statement.Number(4, bootMilliseconds()).Text(5, boot);
  if (!removed.Good() || !Clear(now) || !statement.Run()) {
    return Fail();
  }
  row = sqlite3_last_insert_rowid(database_.get());
  return TaskResult::kDone;
}

bool TaskDatabase::Put(int64_t row, const TaskProperties& properties) {
  for (const auto& [name, value] : properties) {
    Statement put(
        Prepare("INSERT INTO properties(task, name, value) VALUES(?1, ?2, ?3)"
                " ON CONFLICT(task, name) DO UPDATE SET value=excluded.value"));
    if (!put.Number(1, row).Text(2, name).Bytes(3, value).Run()) {
      Fail();
      return false;
    }
  }
  Statement size(Prepare("SELECT total(length(value)) FROM properties WHERE task=?1"));
  Statement version(Prepare("UPDATE tasks SET version=version+1, changed=?2 WHERE id=?1"));
  version.Number(1, row).Number(2, currentMilliseconds());
  if (!size.Number(1, row).Row() || !version.Run()) {
    Fail();
    return false;
  }
  if (size.NumberAt(0) > kLargestRecord) {
    error_ = "a record would become too large";
    return false;
  }
  return true;
}

bool TaskDatabase::Erase(int64_t row) {
  Statement properties(Prepare("DELETE FROM properties WHERE task=?1"));
  Statement task(Prepare("DELETE FROM tasks WHERE id=?1"));
  return properties.Number(1, row).Run() && task.Number(1, row).Run();
}

TaskResult TaskDatabase::Changed(bool run) {
  if (!run) {
    return Fail();
  }
  return sqlite3_changes(database_.get()) > 0 ? TaskResult::kDone : TaskResult::kMissing;
}

TaskResult TaskDatabase::Fail() {
  error_ = sqlite3_errmsg(database_.get());
  return isHeldByOthers(database_.get()) ? TaskResult::kBusy : TaskResult::kFailed;
}

}  // namespace QELO::Platform
