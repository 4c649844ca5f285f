#include "programs/webapi-server/WebService.h"

#include <errno.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <syslog.h>
#include <unistd.h>

#include <cstdint>
#include <cstdlib>
#include <set>
#include <vector>

#include "programs/entry/RestEntry.h"
#include "programs/entry/RestPath.h"
#include "programs/entry/ServeRequest.h"
#include "programs/server/ServiceManager.h"
#include "programs/server/metrics/Page.h"
#include "programs/webapi-server/EntryName.h"
#include "programs/webapi-server/RequestInput.h"
#include "programs/webapi-server/ScgiHeader.h"
#include "programs/webapi-server/workers/WorkerHub.h"
#include "webapi/APIRunner.h"
#include "webapi/JsonHelper.h"
#include "webapi/base/Log.h"

namespace QELO {
namespace {

constexpr char kSource[] = "WebService.cpp";
constexpr std::chrono::seconds kLookPause{1};

std::set<std::string> describedLibraries() {
  APIRunner runner;
  Json::Value catalogue(Json::objectValue);
  runner.InitLibDesc(catalogue);
  std::set<std::string> paths;
  for (const Json::Value& description : catalogue) {
    const std::string path = JsonHelper::asString(JsonHelper::member(description, "lib"));
    if (path.find('/') != std::string::npos) {
      paths.insert(path);
    }
  }
  return paths;
}

/// Of the request whose variables are the environment.
bool isForRest() {
  const char* script = getenv("SCRIPT_NAME");
  const char* path = getenv("PATH_INFO");
  return script != nullptr && RestPath::IsAddress(script, path != nullptr ? path : "");
}

std::string refusal(const char* status, const char* text) {
  return std::string("Status: ") + status +
         "\r\nContent-Type: text/plain\r\nCache-Control: no-store\r\n\r\n" + text + "\n";
}

}  // namespace

void WebService::LoadLibraries() {
  for (const std::string& path : describedLibraries()) {
    APIRunner::PreloadLibrary(path);
  }
}

void WebService::Reload(Server&) {
  ServiceManager::TellReloading();
  LoadLibraries();
  if (workers_ != nullptr) {
    workers_->Reload();
  }
  ServiceManager::Tell("READY=1");
}

/// Whoever connects says from where a request came, as a web server does to a CGI program.
bool WebService::Admits(const Connection& connection) {
  int domain = AF_UNIX;
  socklen_t size = sizeof domain;
  const int socket = connection.socket.Get();
  if (getsockopt(socket, SOL_SOCKET, SO_DOMAIN, &domain, &size) == 0 && domain != AF_UNIX) {
    return true;  // of the loopback address, where nobody can be told
  }
  ucred peer{};
  size = sizeof peer;
  const bool isKnown = getsockopt(socket, SOL_SOCKET, SO_PEERCRED, &peer, &size) == 0;
  const uid_t other = IsReading(connection) ? peers_.reader : peers_.client;
  if (isKnown && (peer.uid == 0 || peer.uid == geteuid() || peer.uid == other)) {
    return true;
  }
  syslog(LOG_AUTH | LOG_NOTICE, "%s:%d refused a connection of the user %d", kSource, __LINE__,
         static_cast<int>(peer.uid));
  return false;
}

bool WebService::IsReading(const Connection& connection) const {
  return !peers_.figures.empty() && connection.listener == peers_.figures;
}

Service::Arrival WebService::Take(Connection& connection) {
  if (IsReading(connection)) {
    connection.isQuiet = true;
    return MetricsPage::Take(connection, metrics_);
  }
  return ScgiHeader::Take(connection);
}

int WebService::Serve(Connection& connection, Note&) {
  std::vector<char*> environment;
  int64_t bodyLength = 0;
  const int socket = connection.socket.Get();
  if (!ScgiHeader::Parse(connection.header, environment, bodyLength)) {
    const std::string text = Refuse(Refusal::kMalformed);
    send(socket, text.data(), text.size(), MSG_NOSIGNAL);
    return 1;
  }
  if (!PutBodyOnInput(socket, bodyLength) || dup2(socket, STDOUT_FILENO) != STDOUT_FILENO) {
    WEBAPI_LOG(kSource, "cannot hand over a request [%m]");
    return 1;
  }
  environ = environment.data();
  const bool isRest = isForRest();
  TakeEntryName(isRest);
  return ServeRequest(argc_, argv_, isRest ? RestEntry::Make : nullptr);
}

std::string WebService::Refuse(Refusal reason) {
  switch (reason) {
    case Refusal::kSlow:
      return refusal("408 Request Timeout", "The request did not come in time.");
    case Refusal::kMalformed:
      return refusal("400 Bad Request", "The request is malformed.");
    case Refusal::kTooLarge:
      return refusal("431 Request Header Fields Too Large", "The request's header is too long.");
    case Refusal::kTimedOut:
      return refusal("503 Service Unavailable", "The request took too long.");
    default:
      return refusal("503 Service Unavailable", "Too many requests at present.");
  }
}

void WebService::Ended(const Note&, const End& end) {
  if (end.isTimedOut || WIFSIGNALED(end.status)) {
    WEBAPI_LOG(kSource, "the process %d ended by signal %d after %lld us, time over: %d", end.pid,
               WTERMSIG(end.status), static_cast<long long>(end.lasted.count()), end.isTimedOut);
  }
  const ServerClock::time_point now = ServerClock::now();
  if (now >= nextLook_) {
    nextLook_ = now + kLookPause;
    APIRunner::RefreshLibraries();
  }
}

}  // namespace QELO
