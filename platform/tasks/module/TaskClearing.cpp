// How tasks end unseen, and what is cleared when a record is made or records are listed.

#include <sys/types.h>
#include <time.h>

#include <algorithm>

#include "platform/tasks/module/TaskSchema.h"
#include "platform/tasks/module/Transaction.h"

namespace QELO::Platform {
namespace {

constexpr int64_t kSecondMs = 1000;
constexpr int64_t kStartMs = 30 * kSecondMs;               // a process records itself by then
constexpr int64_t kRemovedKeepMs = 24 * 3600 * kSecondMs;  // a process told to stop is gone by then
// Most records that one creation or list looks at or clears.
constexpr int kMostOld = 1000;
constexpr int kMostForgotten = 20;
constexpr int kMostCleared = 100;

}  // namespace

int64_t currentMilliseconds() {
  timespec now{};
  clock_gettime(CLOCK_REALTIME, &now);
  return static_cast<int64_t>(now.tv_sec) * kSecondMs + now.tv_nsec / 1'000'000;
}

TaskEnding judgeTask(const TaskRecord& record) {
  if (record.ending != TaskEnding::kRunning) {
    return record.ending;
  }
  const std::string boot = readBootId();
  if (!boot.empty() && boot != record.process.boot) {
    return TaskEnding::kRestarted;
  }
  if (record.process.pid == 0) {
    return bootMilliseconds() - record.born > kStartMs ? TaskEnding::kNeverStarted
                                                       : TaskEnding::kRunning;
  }
  return findProcess(record.process) == ProcessState::kGone ? TaskEnding::kProcessGone
                                                            : TaskEnding::kRunning;
}

bool TaskDatabase::Clear(int64_t now) {
  const int64_t before = now - keepSeconds_() * kSecondMs;
  std::vector<Forgotten> forgotten;
  return FindForgotten(before, forgotten) && EndForgotten(forgotten) && ClearEnded(before) &&
         ClearRemoved(now - kRemovedKeepMs);
}

// For a reader, who must not wait for writers: what it does not clear the next one does.
void TaskDatabase::Tidy() {
  const int64_t now = currentMilliseconds();
  const int64_t before = now - keepSeconds_() * kSecondMs;
  std::vector<Forgotten> forgotten;
  if (!HasEnded(before) && (!FindForgotten(before, forgotten) || forgotten.empty())) {
    return;
  }
  sqlite3_busy_timeout(database_.get(), 0);
  {
    Transaction transaction(*this);
    if (transaction.Begun() && Clear(now)) {
      transaction.Commit();
    }
  }
  sqlite3_busy_timeout(database_.get(), patienceMs_);
}

bool TaskDatabase::HasEnded(int64_t before) {
  return Statement(Prepare("SELECT 1 FROM tasks WHERE finished<?1 LIMIT 1"))
      .Number(1, before)
      .Row();
}

// In a random order, so that those that run do not hide the others for ever.
bool TaskDatabase::FindForgotten(int64_t before, std::vector<Forgotten>& forgotten) {
  Statement statement(
      Prepare("SELECT id, pid, start, boot, born, changed FROM tasks WHERE id IN"
              " (SELECT id FROM (SELECT id FROM tasks INDEXED BY tasks_running"
              "   WHERE finished IS NULL AND created<?1 ORDER BY created LIMIT ?2)"
              "  ORDER BY random() LIMIT ?3)"));
  statement.Number(1, before).Number(2, kMostOld).Number(3, kMostForgotten);
  while (statement.Row()) {
    TaskRecord record;
    record.process = {static_cast<pid_t>(statement.NumberAt(1)),
                      static_cast<uint64_t>(statement.NumberAt(2)), statement.TextAt(3)};
    record.born = statement.NumberAt(4);
    const TaskEnding ending = judgeTask(record);
    if (ending != TaskEnding::kRunning) {
      forgotten.push_back({statement.NumberAt(0), ending, statement.NumberAt(5)});
    }
  }
  return statement.Good();
}

// Nobody saw them end. They count from their last sign of life, not from now: nothing would be
// cleared in time otherwise.
bool TaskDatabase::EndForgotten(const std::vector<Forgotten>& forgotten) {
  const int64_t boot = currentMilliseconds() - bootMilliseconds();
  bool good = true;
  for (const auto& [row, ending, time] : forgotten) {
    // What a restart ended may have lived until then.
    const int64_t end = ending == TaskEnding::kRestarted ? std::max(time, boot) : time;
    Statement mark(
        Prepare("UPDATE tasks SET ending=?2, finished=?3, version=version+1 WHERE id=?1"));
    good = good && mark.Number(1, row).Number(2, static_cast<int>(ending)).Number(3, end).Run();
  }
  return good;
}

bool TaskDatabase::ClearEnded(int64_t before) {
  std::vector<int64_t> rows;
  Statement statement(Prepare("SELECT id FROM tasks WHERE finished<?1 ORDER BY finished LIMIT ?2"));
  statement.Number(1, before).Number(2, kMostCleared);
  while (statement.Row()) {
    rows.push_back(statement.NumberAt(0));
  }
  bool good = statement.Good();
  for (const int64_t row : rows) {
    good = good && Erase(row);
  }
  return good;
}

bool TaskDatabase::ClearRemoved(int64_t before) {
  Statement statement(
      Prepare("DELETE FROM removed WHERE (owner, task) IN"
              " (SELECT owner, task FROM removed WHERE time<?1 ORDER BY time LIMIT ?2)"));
  return statement.Number(1, before).Number(2, kMostCleared).Run();
}

}  // namespace QELO::Platform
