// Times whole processes against each other: from start to end, taken in turn, so that a machine
// whose speed drifts slows both alike. The medians of the two are compared.
//
//   process_bench pair SECONDS PROGRAM OTHER           two programs
//   process_bench link SECONDS PROGRAM LINK DIR OTHER  one program, while LINK points to DIR or
//   OTHER
//
// Prints the two medians in microseconds, their ratio and the first program's peak memory in KiB,
// each on a line of its own. A process that fails ends the measurement with status 1.

#include <fcntl.h>
#include <spawn.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

extern char** environ;

namespace {

using Clock = std::chrono::steady_clock;

struct Samples {
  std::vector<double> microseconds;
  long peakKib = 0;

  double Median() {
    const auto middle = microseconds.begin() + static_cast<long>(microseconds.size() / 2);
    std::nth_element(microseconds.begin(), middle, microseconds.end());
    return *middle;
  }
};

/// Runs the program once with its output thrown away.
void measure(const char* program, Samples& samples) {
  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  posix_spawn_file_actions_addopen(&actions, STDOUT_FILENO, "/dev/null", O_WRONLY, 0);
  char* arguments[] = {const_cast<char*>(program), nullptr};
  pid_t child = 0;
  int status = 0;
  rusage usage{};
  const auto start = Clock::now();
  const bool started = posix_spawn(&child, program, &actions, nullptr, arguments, environ) == 0 &&
                       wait4(child, &status, 0, &usage) == child;
  const std::chrono::duration<double, std::micro> taken = Clock::now() - start;
  posix_spawn_file_actions_destroy(&actions);
  if (!started || status != 0) {
    std::fprintf(stderr, "%s failed with status %d\n", program, status);
    std::exit(1);
  }
  samples.microseconds.push_back(taken.count());
  samples.peakKib = std::max(samples.peakKib, usage.ru_maxrss);
}

void point(const std::string& link, const std::string& target) {
  const std::string fresh = link + ".new";
  if (symlink(target.c_str(), fresh.c_str()) != 0 || rename(fresh.c_str(), link.c_str()) != 0) {
    std::perror(link.c_str());
    std::exit(1);
  }
}

}  // namespace

int main(int argc, char** argv) {
  const std::string mode = argc > 1 ? argv[1] : "";
  if (!(mode == "pair" && argc == 5) && !(mode == "link" && argc == 7)) {
    std::fprintf(stderr,
                 "usage: process_bench pair SECONDS PROGRAM OTHER\n"
                 "       process_bench link SECONDS PROGRAM LINK DIR OTHER\n");
    return 2;
  }
  const auto end = Clock::now() + std::chrono::duration<double>(std::atof(argv[2]));
  Samples first, second;
  while (Clock::now() < end || first.microseconds.size() < 20) {
    if (mode == "link") {
      point(argv[4], argv[5]);
    }
    measure(argv[3], first);
    if (mode == "link") {
      point(argv[4], argv[6]);
    }
    measure(mode == "link" ? argv[3] : argv[4], second);
  }
  const double median = first.Median();
  const double other = second.Median();
  std::printf("%.1f\n%.1f\n%.3f\n%ld\n", median, other, median / other, first.peakKib);
  return 0;
}
