#include "programs/webapi-server/worker/Worker.h"

#include <errno.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <syslog.h>
#include <unistd.h>

#include <chrono>
#include <exception>
#include <utility>
#include <vector>

#include "programs/webapi-server/EntryName.h"
#include "programs/webapi-server/worker/GiveUpRights.h"
#include "programs/webapi-server/workers/WorkerMessage.h"
#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/APIRunner.h"
#include "webapi/JsonHelper.h"
#include "webapi/WebEntry.h"
#include "webapi/base/Log.h"
#include "webapi/base/NullDevice.h"

namespace QELO {

/// Keeps the libraries open from call to call.
class WorkerRunner : public APIRunner {
 public:
  using APIRunner::ProcessPermitted;
};

namespace {

constexpr char kSource[] = "Worker.cpp";
constexpr std::chrono::seconds kSendLimit{30};
constexpr int kTimers = 1;
char* noEnvironment[] = {nullptr};

/// The environment of one call. What the method changes goes with it.
class CallEnvironment {
 public:
  explicit CallEnvironment(const Json::Value& texts) {
    for (const Json::Value& text : texts) {
      texts_.push_back(JsonHelper::asString(text));
    }
    for (std::string& text : texts_) {
      entries_.push_back(text.data());
    }
    entries_.push_back(nullptr);
    environ = entries_.data();
    tzset();
  }
  CallEnvironment(const CallEnvironment&) = delete;
  CallEnvironment& operator=(const CallEnvironment&) = delete;
  ~CallEnvironment() { environ = noEnvironment; }

 private:
  std::vector<std::string> texts_;
  std::vector<char*> entries_;
};

bool isSame(const struct stat& left, const struct stat& right) {
  return left.st_dev == right.st_dev && left.st_ino == right.st_ino &&
         left.st_size == right.st_size && left.st_mtim.tv_sec == right.st_mtim.tv_sec &&
         left.st_mtim.tv_nsec == right.st_mtim.tv_nsec &&
         left.st_ctim.tv_sec == right.st_ctim.tv_sec &&
         left.st_ctim.tv_nsec == right.st_ctim.tv_nsec;
}

}  // namespace

Worker::Worker(UniqueFd socket, std::string key, CallClock clock, const WorkerLimits& limits,
               int argc, char** argv)
    : socket_(socket.Get()),
      front_(std::move(socket), {std::chrono::seconds(0), kSendLimit, limits.idle}),
      key_(std::move(key)),
      clock_(std::move(clock)),
      limits_(limits),
      argc_(argc),
      argv_(argv),
      remains_(limits.memory, kTimers) {}

Worker::~Worker() = default;

bool Worker::Prepare() {
  int priority = 0;
  std::string account;
  if (!WorkerMessage::ReadKey(key_, priority, account)) {
    return false;
  }
  errno = 0;
  if ((getpriority(PRIO_PROCESS, 0) != priority && setpriority(PRIO_PROCESS, 0, priority) != 0) ||
      !GiveUpRights(account)) {
    syslog(LOG_AUTH | LOG_ERR, "%s:%d no worker for %s: its rights cannot be taken for good [%m]",
           kSource, __LINE__, LogText(account).c_str());
    return false;
  }
  // A method's time is the kernel's to watch: nothing that it does to its own process stops that.
  sigevent end{};
  end.sigev_notify = SIGEV_SIGNAL;
  end.sigev_signo = SIGKILL;
  TakeEntryName();
  environ = noEnvironment;
  if (!PutNullOver({STDIN_FILENO, STDOUT_FILENO}) || prctl(PR_SET_CHILD_SUBREAPER, 1) != 0 ||
      prctl(PR_SET_DUMPABLE, 0) != 0 || timer_create(CLOCK_MONOTONIC, &end, &timer_) != 0) {
    WEBAPI_LOG(kSource, "no worker: the process cannot be set up [%m]");
    return false;
  }
  runner_ = std::make_unique<WorkerRunner>();
  runner_->SetArgs(argc_, argv_);
  return remains_.Keep();
}

void Worker::SetTimer(bool runs) const {
  itimerspec time{};
  time.it_value.tv_sec = runs ? limits_.call.count() : 0;
  timer_settime(timer_, 0, &time, nullptr);
}

/// A call that the front has sent is not lost to the end of a worker that nobody needed so far.
bool Worker::Receive(std::string& text) {
  const auto begin = std::chrono::steady_clock::now();
  if (front_.Recv(text)) {
    return true;
  }
  if (std::chrono::steady_clock::now() - begin >= limits_.idle) {
    ending_ = Ending::kIdle;
  }
  shutdown(socket_, SHUT_RD);  // the front is refused from here on
  return front_.Await(std::chrono::milliseconds(0)) == WorkerLink::Coming::kWhole &&
         front_.Recv(text);
}

int Worker::Run() {
  if (!Prepare()) {
    return static_cast<int>(Ending::kFailed);
  }
  std::string text;
  Remains::Left left = Remains::Left::kNothing;
  for (unsigned calls = 0;; ++calls) {
    if (calls == limits_.calls) {
      ending_ = Ending::kCalls;
      break;
    }
    if (!front_.Send("") || !Receive(text)) {
      break;
    }
    if (Serve(text) == After::kEnd) {
      break;
    }
    left = remains_.PutBack();
    if (left != Remains::Left::kNothing) {
      break;
    }
  }
  SetTimer(true);  // what libraries do when they are closed is foreign as well
  runner_.reset();
  return left == Remains::Left::kNothing
             ? static_cast<int>(ending_)
             : static_cast<int>(Ending::kRemains) + static_cast<int>(left);
}

/// What is open is what the file was. A front that is told nothing has the call made elsewhere.
bool Worker::IsSameLibrary(const std::string& path) {
  struct stat now {};
  if (stat(path.c_str(), &now) != 0 || access(path.c_str(), R_OK) != 0) {
    return false;  // others load it before they give up root
  }
  const auto known = libraries_.find(path);
  if (known == libraries_.end()) {
    libraries_.emplace(path, now);
    return true;
  }
  return isSame(known->second, now);
}

Worker::After Worker::Serve(std::string& text) {
  Json::Value message;
  const bool isRead = DaemonMessage::Read(text, message) &&
                      JsonHelper::member(message, DaemonMessage::kRequest).isObject() &&
                      JsonHelper::member(message, DaemonMessage::kResponse).isObject();
  explicit_bzero(text.data(), text.size());
  if (!isRead) {
    WEBAPI_LOG(kSource, "the message is no call");
    return After::kEnd;
  }
  const CallEnvironment environment(JsonHelper::member(message, WorkerMessage::kEnvironment));
  APIRequest request;
  APIResponse response(&request);
  request.Deserialize(message[DaemonMessage::kRequest]);
  response.Deserialize(message[DaemonMessage::kResponse]);
  if (!IsSameLibrary(JsonHelper::asString(request.GetAPIInfo("lib", "")))) {
    front_.Send("");
    return After::kEnd;
  }
  clock_.Begin();
  SetTimer(true);
  runner_->ProcessPermitted(&request, &response);
  SetTimer(false);
  clock_.End();
  if (!front_.Send(JsonHelper::toString(response.Serialize()))) {
    WEBAPI_LOG(kSource, "the answer was not taken [%m]");
    return After::kEnd;
  }
  if (response.GetHttpdRestart()) {
    response.SetCallbackFunc(RestartHttpd, nullptr);
  }
  return runner_->HandleCallback(&response) ? After::kEnd : After::kGoOn;
}

}  // namespace QELO
