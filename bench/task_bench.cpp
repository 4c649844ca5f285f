// Measures background tasks: an update of a running task, the start of a task that sets its first
// result at once, and what a client's calls cost when the user has 10,000 tasks: a list of them
// all, to the answer's text, and the status of 1,000. Prints "name value unit" lines.
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
#include "webapi/APIRunner.h"
#include "webapi/JsonHelper.h"
#include "webapi/platform/Task.h"

namespace {

using std::chrono::duration;
using std::chrono::steady_clock;

constexpr char kOwner[] = "alice";  // a user of the root, whose tasks are removed
constexpr unsigned kTasks = 10'000;
constexpr unsigned kAskedFor = 1000;  // most ids in one call

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

/// A call as a client's is served. @return its data, once the answer was written out as text
Json::Value callOf(const char* method, const Json::Value& parameters) {
  Json::Value answer;
  QELO::APIRunner::Exec(answer, "QELO.Work.Task", 1, method, parameters, kOwner);
  return QELO::JsonHelper::toString(answer).empty() ? Json::Value() : answer["data"];
}

std::vector<double> measureList(double seconds) {
  for (unsigned i = 0; i < kTasks; ++i) {
    makeTask("list_");
  }
  Json::Value parameters;
  parameters["prefix"] = "list_";
  return measure(seconds, [&] { return callOf("list", parameters)["user"].size() == kTasks; });
}

std::vector<double> measureStatus(double seconds) {
  Json::Value parameters;
  const Json::Value list = callOf("list", Json::Value());
  for (const Json::Value& id : list["user"]) {
    if (parameters["task_ids"].size() < kAskedFor) {
      parameters["task_ids"].append(id);
    }
  }
  return measure(seconds, [&] { return callOf("status", parameters).size() == kAskedFor; });
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
  const double share = seconds / 4;
  const std::vector<double> updates = measureUpdate(share);
  printf("task.update.us %.1f us\n", meanOf(updates) * 1e6);
  printf("task.update.median.us %.1f us\n", medianOf(updates) * 1e6);
  printf("task.start.ms %.2f ms\n", medianOf(measureStart(share)) * 1e3);
  printf("task.list.ms %.2f ms\n", medianOf(measureList(share)) * 1e3);
  printf("task.status.thousand.ms %.2f ms\n", medianOf(measureStatus(share)) * 1e3);
  removeAll();
  return 0;
}
