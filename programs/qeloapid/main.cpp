// The API daemon: makes the calls of APIs whose descriptions name a socket, each in a process of
// its own.

#include <syslog.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <string>
#include <utility>
#include <vector>

#include "programs/qeloapid/DaemonService.h"
#include "programs/server/Limits.h"
#include "programs/server/Options.h"
#include "programs/server/Server.h"
#include "programs/server/ServiceManager.h"
#include "programs/server/Surroundings.h"
#include "programs/server/metrics/Metrics.h"
#include "webapi/platform/Paths.h"

namespace {

constexpr char kUsage[] =
    "usage: qeloapid [--calls N] [--queue N] [--time-limit SECONDS]\n"
    "  --calls N       calls at once (32)\n"
    "  --queue N       calls that wait for their turn (256)\n"
    "  --time-limit S  longest time of a call (300)\n"
    "  --help, -h      show this\n";

bool readOptions(int argc, char** argv, QELO::ServerLimits& limits) {
  QELO::Options options;
  options.Number("calls", 1, 4096, [&](unsigned number) { limits.atOnce = number; });
  options.Number("queue", 0, 65536, [&](unsigned number) { limits.queued = number; });
  options.Number("time-limit", 1, 86400,
                 [&](unsigned number) { limits.request = std::chrono::seconds(number); });
  std::string error;
  if (!options.Read(argc, argv, error)) {
    fprintf(stderr, "%s\n%s", error.c_str(), kUsage);
    return false;
  }
  return true;
}

}  // namespace

int main(int argc, char** argv) {
  if (QELO::Options::AskForHelp(argc, argv)) {
    fputs(kUsage, stdout);
    return 0;
  }
  QELO::ServerLimits limits;
  if (!readOptions(argc, argv, limits)) {
    return 2;
  }
  const std::vector<int> handed = QELO::PrepareServer();
  openlog("qeloapid", LOG_PID | LOG_CONS, 0);
  if (chdir(QELO::Paths::kDescriptionDir) != 0) {
    perror(QELO::Paths::kDescriptionDir);
    return 1;
  }
  setenv("in_qeloapid", "1", 1);
  QELO::DaemonService service(argc, argv);
  QELO::Metrics metrics;
  QELO::Server server(service, limits, metrics);
  if (!server.Open()) {
    perror("qeloapid");
    return 1;
  }
  for (const int descriptor : handed) {
    auto listener = QELO::Listener::Handed(descriptor);
    if (listener) {
      server.Listen(std::move(*listener));
    }
  }
  service.Listen(server);
  QELO::ServiceManager::Tell("READY=1");
  server.Run();
  return 0;
}
