// The fork server: serves requests that web servers pass on by SCGI as entry.cgi does, in processes
// that are forked from one with everything loaded.

#include <grp.h>
#include <pwd.h>
#include <syslog.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "programs/server/Limits.h"
#include "programs/server/Options.h"
#include "programs/server/Server.h"
#include "programs/server/ServiceManager.h"
#include "programs/server/Surroundings.h"
#include "programs/server/metrics/Metrics.h"
#include "programs/webapi-server/WebService.h"
#include "programs/webapi-server/workers/WorkerHub.h"
#include "webapi/platform/Core.h"
#include "webapi/platform/Paths.h"

namespace {

constexpr char kBindAtStart[] = "LD_BIND_NOW";
constexpr char kNoAccount[] = "no such account";
constexpr char kUsage[] =
    "usage: webapi-server [--socket PATH] [--port N] [--client ACCOUNT]\n"
    "                     [--metrics PATH [--reader ACCOUNT]] [LIMITS]\n"
    "  --socket PATH      local socket to serve, made as the client's\n"
    "  --port N           port of the loopback address to serve\n"
    "  --client ACCOUNT   the web server's account: it may use the socket, beside root\n"
    "  --metrics PATH     local socket that the server's figures are read by\n"
    "  --reader ACCOUNT   may read them, beside root\n"
    "  --help, -h         shows this\n"
    "limits:\n"
    "  --requests N       requests at once (32)\n"
    "  --queue N          requests that wait for their turn (256)\n"
    "  --arriving N       requests that are on their way (256)\n"
    "  --header-limit S   seconds until a request's header is here (10)\n"
    "  --queue-limit S    seconds that a request waits for its turn (30)\n"
    "  --time-limit S     seconds that a request may take (3600)\n"
    "workers, for methods whose description lets calls share a process:\n"
    "  --fronts N         processes that take requests in for workers (0: no workers)\n"
    "  --workers N        workers (64), a quarter of them for one account\n"
    "  --worker-calls N   calls that a worker serves (1000)\n"
    "  --worker-idle S    seconds that a worker waits for a call (60)\n"
    "  --worker-memory M  MiB that a worker may have (64)\n";

struct Settings {
  QELO::ServerLimits limits;
  QELO::WorkerLimits workers;
  std::string socket;
  unsigned port = 0;
  QELO::WebService::Peers peers;
};

bool findAccount(const std::string& name, uid_t& uid) {
  const passwd* account = getpwnam(name.c_str());
  if (account != nullptr) {
    uid = account->pw_uid;
  }
  return account != nullptr;
}

auto place(std::string& setting) {
  return [&setting](const std::string& path) {
    setting = path;
    return !path.empty() && path[0] == '/';
  };
}

auto account(uid_t& uid) {
  return [&uid](const std::string& name) { return findAccount(name, uid); };
}

bool readOptions(int argc, char** argv, Settings& settings) {
  QELO::ServerLimits& limits = settings.limits;
  limits.request = std::chrono::hours(1);  // of a large upload, too
  const auto seconds = [](std::chrono::seconds& limit) {
    return [&limit](unsigned number) { limit = std::chrono::seconds(number); };
  };
  const auto count = [](unsigned& limit) { return [&limit](unsigned number) { limit = number; }; };
  QELO::Options options;
  options.Text("socket", place(settings.socket));
  options.Number("port", 1, 65535, count(settings.port));
  options.Text("client", account(settings.peers.client), kNoAccount);
  options.Text("metrics", place(settings.peers.figures));
  options.Text("reader", account(settings.peers.reader), kNoAccount);
  options.Number("requests", 1, 4096, count(limits.atOnce));
  options.Number("queue", 0, 65536, count(limits.queued));
  options.Number("arriving", 1, 65536, count(limits.arriving));
  options.Number("header-limit", 1, 3600, seconds(limits.arrival));
  options.Number("queue-limit", 1, 3600, seconds(limits.turn));
  options.Number("time-limit", 1, 86400, seconds(limits.request));
  QELO::WorkerLimits& workers = settings.workers;
  options.Number("fronts", 0, 64, count(workers.fronts));
  options.Number("workers", 1, 1024, count(workers.workers));
  options.Number("worker-calls", 1, 1000000, count(workers.calls));
  options.Number("worker-idle", 1, 86400, seconds(workers.idle));
  options.Number("worker-memory", 1, 4096,
                 [&](unsigned number) { workers.memory = size_t{number} << 20; });
  std::string error;
  if (!options.Read(argc, argv, error)) {
    fprintf(stderr, "%s\n%s", error.c_str(), kUsage);
    return false;
  }
  workers.call = limits.request;
  return true;
}

/// Has the loader bind everything before the first request, and not each request's process anew.
void bindAtStart(char** argv) {
  if (getenv(kBindAtStart) == nullptr) {
    setenv(kBindAtStart, "1", 1);
    execv("/proc/self/exe", argv);
  }
}

/// @return whether it listens at all; what cannot be had is told
bool listen(QELO::Server& server, const Settings& settings, const std::vector<int>& handed) {
  bool good = true;
  const auto add = [&](std::optional<QELO::Listener> listener, const std::string& name) {
    if (!listener || !server.Listen(std::move(*listener))) {
      perror(name.c_str());
      good = false;
    }
  };
  for (const int descriptor : handed) {
    add(QELO::Listener::Handed(descriptor), "handed socket");
  }
  const auto addPath = [&](const std::string& path, uid_t owner) {
    QELO::Listener::Access access;
    access.owner = owner;
    add(QELO::Listener::AtPath(path, access), path);
  };
  if (!settings.socket.empty()) {
    addPath(settings.socket, settings.peers.client);
  }
  if (settings.port != 0) {
    add(QELO::Listener::AtPort(static_cast<unsigned short>(settings.port)),
        "port " + std::to_string(settings.port));
  }
  if (good && server.Paths().empty()) {
    fprintf(stderr, "nowhere to listen\n%s", kUsage);
    good = false;
  }
  if (good && !settings.peers.figures.empty()) {
    addPath(settings.peers.figures, settings.peers.reader);
  }
  return good;
}

}  // namespace

int main(int argc, char** argv) {
  if (QELO::Options::AskForHelp(argc, argv)) {
    fputs(kUsage, stdout);
    return 0;
  }
  Settings settings;
  if (!readOptions(argc, argv, settings)) {
    return 2;
  }
  bindAtStart(argv);
  const std::vector<int> handed = QELO::PrepareServer();
  openlog("webapi-server", LOG_PID | LOG_CONS, 0);
  if (chdir(QELO::Paths::kDescriptionDir) != 0) {
    perror(QELO::Paths::kDescriptionDir);
    return 1;
  }
  QELO::WebService::LoadLibraries();
  QLIBGroupIsAdminGroupMem("root", 0);  // what accounts are looked up with is loaded now
  QELO::Metrics metrics;
  QELO::WebService service(settings.peers, metrics, argc, argv);
  QELO::Server server(service, settings.limits, metrics);
  if (!server.Open() || !listen(server, settings, handed)) {
    return 1;
  }
  QELO::WorkerHub workers(server, settings.workers, metrics, argc, argv);
  if (settings.workers.fronts > 0) {
    if (!workers.Open()) {
      perror("workers");
      return 1;
    }
    service.Use(&workers);
    server.Use(&workers);
  }
  QELO::ServiceManager::Tell("READY=1");
  server.Run();
  return 0;
}
