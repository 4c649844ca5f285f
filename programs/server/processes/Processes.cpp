// The server's processes: those that serve a connection, and those that stay.

#include <sys/socket.h>
#include <sys/wait.h>
#include <syslog.h>
#include <unistd.h>

#include <cstdio>
#include <utility>

#include "programs/server/OpenFiles.h"
#include "programs/server/Server.h"
#include "webapi/base/Log.h"

namespace QELO {
namespace {

using std::chrono::duration_cast;
using std::chrono::microseconds;

constexpr char kSource[] = "Server.cpp";

}  // namespace

void Server::Start(Held connection) {
  Jobs::Job job;
  job.note = Jobs::MakeNote(service_.UsesNotes());
  std::fflush(nullptr);
  const ServerClock::time_point begin = ServerClock::now();
  job.pid = job.note == nullptr ? -1 : fork();
  if (job.pid < 0) {
    WEBAPI_LOG(kSource, "cannot start a process [%m]");
    Refuse(std::move(connection), Service::Refusal::kBusy);
    return;
  }
  if (job.pid == 0) {
    RunChild(std::move(connection), *job.note);
  }
  job.started = ServerClock::now();
  metrics_.waiting.Add(duration_cast<microseconds>(begin - connection->arrived));
  metrics_.forking.Add(duration_cast<microseconds>(job.started - begin));
  job.deadline = job.started + limits_.request;
  job.connection = std::move(connection);
  job.connection->Forget();
  jobs_.Add(std::move(job));
}

void Server::RunChild(Held connection, Note& note) {
  setsid();
  SignalQueue::Reset();
  KeepAlone(connection->socket);
  const int status = service_.Serve(*connection, note);
  std::fflush(nullptr);
  _exit(status);
}

/// Processes that stay serve other clients than those whose requests are here.
void Server::ForgetRequests() {
  for (const auto& [descriptor, connection] : arriving_) {
    connection->Forget();
  }
  for (const Held& connection : waiting_) {
    connection->Forget();
  }
}

pid_t Server::Spawn(UniqueFd kept, const std::function<int(UniqueFd)>& run) {
  std::fflush(nullptr);
  const pid_t pid = fork();
  if (pid == 0) {
    ForgetRequests();
    setsid();
    SignalQueue::Reset();
    KeepAlone(kept);
    const int status = run(std::move(kept));
    std::fflush(nullptr);
    _exit(status);
  }
  return pid;
}

void Server::CountServed(const Connection& connection) {
  ++metrics_.served;
  metrics_.serving.Add(duration_cast<microseconds>(ServerClock::now() - connection.arrived));
}

void Server::EndJob(Jobs::Job job, int status) {
  const int descriptor = job.connection->socket.Get();
  const auto lasted = duration_cast<microseconds>(ServerClock::now() - job.started);
  ++(job.isKilled ? metrics_.killed : WIFSIGNALED(status) ? metrics_.crashed : metrics_.served);
  metrics_.serving.Add(lasted);
  metrics_.processor += job.processor;
  service_.Ended(*job.note,
                 {job.pid, status, job.isKilled,
                  duration_cast<microseconds>(job.started - job.connection->accepted), lasted});
  if (job.isSilent) {
    Refuse(std::move(job.connection), Service::Refusal::kTimedOut);
    return;
  }
  shutdown(descriptor, SHUT_RDWR);  // whoever else may hold it: the answer ends here
}

}  // namespace QELO
