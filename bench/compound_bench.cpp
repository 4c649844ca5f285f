// Measures compound requests and calls from code, in the private root that it was built for.
//
//   compound_bench SECONDS   prints "name value unit" lines
//   compound_bench floor     measures the floor of a forked entry: fork, write, read and wait in a
//                            process that has the same libraries loaded and does nothing else;
//                            prints one median in microseconds
//
// Floor and forked entry are taken in turn, in slices, so that a machine whose speed drifts slows
// both alike.

#include <dlfcn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <functional>
#include <string>
#include <vector>

#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/APIRunner.h"
#include "webapi/CompoundHandler.h"
#include "webapi/JsonHelper.h"
#include "webapi/platform/Paths.h"

namespace {

using Clock = std::chrono::steady_clock;
using Microseconds = std::chrono::duration<double, std::micro>;

constexpr char kAPI[] = "QELO.Bench.Compound";
constexpr char kUser[] = "root";
constexpr int kForked = 1;     ///< version whose methods run in a child
constexpr int kInProcess = 2;  ///< version whose methods run in the process
constexpr int kFloorRuns = 200;
constexpr unsigned kParallel = 32;

[[noreturn]] void fail(const std::string& what) {
  fprintf(stderr, "compound_bench: %s failed\n", what.c_str());
  exit(1);
}

double median(std::vector<double> values) {
  const auto middle = values.begin() + static_cast<std::ptrdiff_t>(values.size() / 2);
  std::nth_element(values.begin(), middle, values.end());
  return *middle;
}

/// How long each run takes, in microseconds, of as many as fit into the time.
std::vector<double> timesOf(double seconds, const std::function<void()>& operation) {
  std::vector<double> times;
  const auto end = Clock::now() + std::chrono::duration<double>(seconds);
  do {
    const auto start = Clock::now();
    operation();
    times.push_back(Microseconds(Clock::now() - start).count());
  } while (Clock::now() < end);
  return times;
}

/// The description of the measured API, there while it lives.
class Description {
 public:
  Description() : file_(std::string(QELO::Paths::kDescriptionDir) + kAPI + ".lib") {
    std::ofstream(file_) << R"({")" << kAPI << R"(": {"minVersion": 1, "maxVersion": 2,
      "runAs": "root", "lib": ")" BENCH_API_LIBRARY R"(", "methods": {
      "1": ["nothing", "slow"], "2": [{"nothing": {"grantable": true}}]}}})";
  }
  ~Description() { unlink(file_.c_str()); }

 private:
  std::string file_;
};

/// Runs compound requests of one entry, or the same entry many times.
class Batch {
 public:
  Batch(const char* method, int version, unsigned entries, const char* mode) {
    Json::Value init;
    Json::Value& params = init["postParam"];
    params["api"] = "QELO.Entry.Request";
    params["version"] = 1;
    params["method"] = "request";
    params["mode"] = mode;
    for (unsigned i = 0; i < entries; ++i) {
      params["compound"][i]["api"] = kAPI;
      params["compound"][i]["version"] = version;
      params["compound"][i]["method"] = method;
    }
    init["environ"]["REQUEST_METHOD"] = "POST";
    init["session"]["username"] = kUser;
    request_ = std::make_unique<QELO::APIRequest>(init);
  }

  /// The handler, the answers and the children's ends.
  void Run(QELO::APIRunner& runner) {
    QELO::APIResponse response(request_.get());
    QELO::CompoundHandler(request_.get(), &response, &runner).Process();
    while (wait(nullptr) > 0) {
    }
    if (QELO::JsonHelper::asBool(response.GetBody()["data"]["has_fail"], true)) {
      fail("an entry");
    }
  }

 private:
  std::unique_ptr<QELO::APIRequest> request_;
};

int measureFloor() {
  if (dlopen(BENCH_API_LIBRARY, RTLD_LAZY) == nullptr) {
    fail("loading the API library");
  }
  std::vector<double> times;
  for (int i = 0; i < kFloorRuns; ++i) {
    const auto start = Clock::now();
    int ends[2];
    char byte = 0;
    const pid_t child = pipe(ends) == 0 ? fork() : -1;
    if (child == 0) {
      _exit(write(ends[1], "x", 1) == 1 ? 0 : 1);
    }
    close(ends[1]);
    int status = -1;
    if (read(ends[0], &byte, 1) != 1 || waitpid(child, &status, 0) != child || status != 0) {
      fail("the floor");
    }
    close(ends[0]);
    times.push_back(Microseconds(Clock::now() - start).count());
  }
  printf("%.3f\n", median(times));
  return 0;
}

/// The median of one slice, measured in a process of its own.
double floorSlice(const char* program) {
  const std::string command = "'" + std::string(program) + "' floor";
  FILE* output = popen(command.c_str(), "re");
  double value = 0;
  if (output == nullptr || fscanf(output, "%lf", &value) != 1 || pclose(output) != 0) {
    fail("the floor");
  }
  return value;
}

void measureFork(double seconds, const char* program, QELO::APIRunner& runner) {
  Batch forked("nothing", kForked, 1, "sequential");
  std::vector<double> floors, forks, ratios;
  const auto end = Clock::now() + std::chrono::duration<double>(seconds);
  do {
    floors.push_back(floorSlice(program));
    forks.push_back(median(timesOf(0.1, [&] { forked.Run(runner); })));
    ratios.push_back(forks.back() / floors.back());
  } while (Clock::now() < end);
  printf("compound.fork.us %.1f us\nfork.floor.us %.1f us\ncompound.fork.ratio %.3f ratio\n",
         median(forks), median(floors), median(ratios));
}

void measureParallel(double seconds, QELO::APIRunner& runner) {
  Batch one("slow", kForked, 1, "parallel");
  Batch many("slow", kForked, kParallel, "parallel");
  std::vector<double> ratios;
  timesOf(seconds, [&] {
    const double single = median(timesOf(0, [&] { one.Run(runner); }));
    ratios.push_back(median(timesOf(0, [&] { many.Run(runner); })) / single);
  });
  printf("compound.parallel.ratio %.3f ratio\n", median(ratios));
}

}  // namespace

int main(int argc, char** argv) {
  if (argc == 2 && strcmp(argv[1], "floor") == 0) {
    return measureFloor();
  }
  const double seconds = argc == 2 ? strtod(argv[1], nullptr) : 0;
  if (seconds <= 0) {
    fprintf(stderr, "usage: compound_bench SECONDS|floor\n");
    return 2;
  }
  const Description description;
  if (chdir(QELO::Paths::kDescriptionDir) != 0) {
    fail(QELO::Paths::kDescriptionDir);
  }
  QELO::APIRunner runner;
  measureFork(seconds / 2, argv[0], runner);
  Batch inProcess("nothing", kInProcess, 1, "sequential");
  printf("compound.inproc.us %.1f us\n",
         median(timesOf(seconds / 8, [&] { inProcess.Run(runner); })));
  measureParallel(seconds / 4, runner);
  printf("exec.us %.1f us\n", median(timesOf(seconds / 8, [] {
           Json::Value answer;
           QELO::APIRunner::Exec(answer, kAPI, kForked, "nothing", Json::Value(), kUser);
           if (!QELO::JsonHelper::asBool(answer["success"])) {
             fail("a call");
           }
         })));
  return 0;
}
