// Measures the task manager: an update of a running task, the start of a task that sets its first
// result at once, and the list of an owner with 10,000 tasks. Prints "name value unit" lines.
// Usage: task_bench SECONDS

#include <signal.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <functional>
#include <string>
#include <vector>

#include "webapi/APIPolling.h"
#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/platform/Task.h"

namespace {

using std::chrono::duration;
using std::chrono::steady_clock;

constexpr char kOwner[] = "@bench";
constexpr int kTasks = 10'000;

/// How long an operation takes, in seconds: each of as many runs as fit.
std::vector<double> measure(double seconds, const std::function<bool()>& operation) {
  std::vector<double> times;
  const auto end = steady_clock::now() + duration<double>(seconds);
  do {
    const auto start = steady_clock::now();
    if (!operation()) {
      fprintf(stderr, "an operation failed; the system log tells why\n");
      exit(1);
    }
    times.push_back(duration<double>(steady_clock::now() - start).count());
  } while (steady_clock::now() < end);
  return times;
}

double medianOf(std::vector<double> times) {
  const auto middle = times.begin() + static_cast<std::ptrdiff_t>(times.size() / 2);
  std::nth_element(times.begin(), middle, times.end());
  return *middle;
}

/// Counts the few updates that wait for the disk on behalf of all.
double meanOf(const std::vector<double>& times) {
  double sum = 0;
  for (const double time : times) {
    sum += time;
  }
  return sum / static_cast<double>(times.size());
}

std::string makeTask(const std::string& prefix) {
  const std::string id = ARDO::TaskUtil::getUniqueID(kOwner, prefix);
  ARDO::Task task(kOwner, id);
  task.beginUpdate();
  task.setProperty("auto_remove", false);
  task.setProperty("info", "api, version, method, parameters");
  return task.endUpdate() ? id : "";
}

/// As a background process does it that tells its progress.
std::vector<double> measureUpdate(double seconds) {
  ARDO::Task task(kOwner, makeTask("update_"));
  int done = 0;
  return measure(seconds, [&] {
    Json::Value body;
    body["success"] = true;
    body["data"]["done"] = ++done;
    task.beginUpdate();
    return task.setProperty("body", body) && task.setProperty("task_run", true) && task.endUpdate();
  });
}

std::vector<double> measureStart(double seconds) {
  signal(SIGCHLD, SIG_IGN);  // nobody waits for the background processes
  QELO::APIRequest request;
  QELO::APIResponse response(&request);
  QELO::APIPolling polling(&request);
  polling.SetGroupAttr("everyone");
  const auto work = [](QELO::APIRequest*, QELO::APIResponse* answer, void*) {
    answer->SetSuccess(true);
  };
  return measure(seconds, [&] { return polling.Start(&response, work, nullptr); });
}

std::vector<double> measureList(double seconds) {
  for (int i = 0; i < kTasks; ++i) {
    makeTask("list_");
  }
  return measure(seconds,
                 [] { return ARDO::TaskMgr(kOwner).getAllTaskId("list_").size() == kTasks; });
}

void removeAll() {
  for (const Json::Value& id : ARDO::TaskMgr(kOwner).getAllTaskId(nullptr)) {
    ARDO::Task(kOwner, id.asString()).remove();
  }
}

}  // namespace

int main(int argc, char** argv) {
  const double seconds = argc > 1 ? strtod(argv[1], nullptr) : 0;
  if (seconds <= 0) {
    fprintf(stderr, "usage: task_bench SECONDS\n");
    return 2;
  }
  removeAll();  // what a run that was broken off left
  const std::vector<double> updates = measureUpdate(seconds / 3);
  printf("task.update.us %.1f us\n", meanOf(updates) * 1e6);
  printf("task.update.median.us %.1f us\n", medianOf(updates) * 1e6);
  printf("task.start.ms %.2f ms\n", medianOf(measureStart(seconds / 3)) * 1e3);
  printf("task.list.ms %.2f ms\n", medianOf(measureList(seconds / 3)) * 1e3);
  removeAll();
  return 0;
}
