#include "programs/qeloapid/DaemonService.h"

#include <sys/socket.h>
#include <sys/wait.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <cstring>
#include <exception>
#include <set>
#include <utility>

#include "programs/qeloapid/CallRunner.h"
#include "programs/server/Listener.h"
#include "programs/server/Server.h"
#include "programs/server/ServiceManager.h"
#include "webapi/JsonHelper.h"
#include "webapi/base/Log.h"
#include "webapi/platform/Daemon.h"
#include "webapi/runner/daemon/Message.h"

namespace QELO {
namespace {

constexpr char kSource[] = "DaemonService.cpp";
/// For the message to arrive, and for the answer to be taken.
constexpr qelodaemon::Limits kLimits{std::chrono::seconds(0), std::chrono::seconds(30),
                                     std::chrono::seconds(30)};

/// The sockets of all descriptions that do not turn them off.
std::set<std::string> describedSockets() {
  APIRunner runner;
  Json::Value catalogue(Json::objectValue);
  runner.InitLibDesc(catalogue);
  std::set<std::string> paths;
  for (const Json::Value& description : catalogue) {
    const Json::Value& socket = JsonHelper::member(description, "socket");
    if (socket.isString() &&
        !JsonHelper::asBool(JsonHelper::member(description, "disableSocket"))) {
      paths.insert(JsonHelper::asString(socket));
    }
  }
  paths.erase("");
  return paths;
}

std::string endText(const Service::End& end) {
  if (end.isTimedOut) {
    return "timed-out";
  }
  if (WIFSIGNALED(end.status)) {
    return "signal-" + std::to_string(WTERMSIG(end.status));
  }
  return end.status == 0 ? "answered" : "failed";
}

std::string shown(const char* text, size_t size) {
  return LogText(std::string_view(text, strnlen(text, size)));
}

}  // namespace

void DaemonService::Listen(Server& server) {
  const std::set<std::string> wanted = describedSockets();
  const std::vector<std::string> present = server.Paths();
  for (const std::string& path : present) {
    if (wanted.count(path) == 0) {
      server.StopListening(path);
    }
  }
  for (const std::string& path : wanted) {
    if (std::find(present.begin(), present.end(), path) != present.end()) {
      continue;
    }
    auto listener = Listener::AtPath(path, {});
    if (!listener || !server.Listen(std::move(*listener))) {
      WEBAPI_LOG(kSource, "cannot listen at %s [%m]", LogText(path).c_str());
    }
  }
}

void DaemonService::Reload(Server& server) {
  ServiceManager::TellReloading();
  Listen(server);
  ServiceManager::Tell("READY=1");
}

/// The front has root's rights when it asks; in a private root without, it has ours.
bool DaemonService::Admits(const Connection& connection) {
  ucred peer{};
  socklen_t size = sizeof peer;
  if (getsockopt(connection.socket.Get(), SOL_SOCKET, SO_PEERCRED, &peer, &size) == 0 &&
      (peer.uid == 0 || peer.uid == geteuid())) {
    return true;
  }
  syslog(LOG_AUTH | LOG_NOTICE, "%s:%d refused a message of the user %d", kSource, __LINE__,
         static_cast<int>(peer.uid));
  return false;
}

Service::Arrival DaemonService::Take(Connection&) {
  return Arrival::kWhole;  // its process reads the message: whoever sends it is trusted
}

int DaemonService::Serve(Connection& connection, Note& note) {
  qelodaemon::SockConnection peer(connection.socket.Release(), kLimits);
  try {
    std::string text;
    Json::Value message;
    if (!peer.Recv(text)) {
      WEBAPI_LOG(kSource, "no message came [%m]");
      return 1;
    }
    const bool isRead = DaemonMessage::Read(text, message);
    text = std::string();
    CallRunner runner;
    runner.SetArgs(argc_, argv_);
    const std::string answer = isRead ? runner.Answer(message, connection.listener, note) : "";
    if (answer.empty()) {
      WEBAPI_LOG(kSource, "the message is no call");
      return 1;
    }
    if (!peer.Send(answer)) {
      WEBAPI_LOG(kSource, "the answer was not taken [%m]");
      return 1;
    }
    return 0;
  } catch (const std::exception& error) {
    WEBAPI_LOG(kSource, "%s", LogText(error.what()).c_str());
  }
  return 1;
}

std::string DaemonService::Refuse(Refusal) {
  return "";
}

void DaemonService::Ended(const Note& note, const End& end) {
  syslog(LOG_INFO, "%s:%d call=\"%s\" user=\"%s\" end=%s code=%d pid=%d us=%lld waited_us=%lld",
         kSource, __LINE__, LogText(shown(note.call, sizeof note.call)).c_str(),
         LogText(shown(note.user, sizeof note.user)).c_str(), LogText(endText(end)).c_str(),
         note.code.load(), end.pid, static_cast<long long>(end.lasted.count()),
         static_cast<long long>(end.waited.count()));
}

}  // namespace QELO
