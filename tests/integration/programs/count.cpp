// Counts one method: count DIRECTORY TIMES. Prints how many of the counts were written.

#include <cstdio>
#include <cstdlib>

#include "webapi/runner/counter/UsageCounter.h"

int main(int argc, char** argv) {
  if (argc != 3) {
    std::fprintf(stderr, "usage: count DIRECTORY TIMES\n");
    return 2;
  }
  QELO::UsageCounter counter(argv[1]);
  int written = 0;
  for (int left = std::atoi(argv[2]); left > 0; --left) {
    written += counter.Increase("QELO.Test.Count.Api.Long", "run", 1) ? 1 : 0;
  }
  std::printf("%d\n", written);
  return 0;
}
