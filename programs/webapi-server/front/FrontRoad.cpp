#include "programs/webapi-server/front/FrontRoad.h"

#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>

#include "programs/webapi-server/workers/WorkerCalls.h"
#include "programs/webapi-server/workers/WorkerMessage.h"
#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/JsonHelper.h"
#include "webapi/WebAPIError.h"
#include "webapi/base/Log.h"
#include "webapi/runner/CompoundCall.h"
#include "webapi/runner/execution/MethodAccount.h"

namespace QELO {
namespace {

constexpr char kSource[] = "FrontRoad.cpp";
/// For an answer: what most calls take is a tenth of it, and who takes longer pays for a process.
constexpr std::chrono::milliseconds kPatience{10};
/// Longest call in bytes: it goes into a worker's socket as a whole.
constexpr size_t kLongestCall = size_t{96} << 10;
/// Longest answer in bytes that a client's socket takes at once, whoever reads it.
constexpr size_t kPromptAnswer = size_t{64} << 10;
constexpr size_t kPiece = size_t{16} << 10;
constexpr char kRoot[] = "root";

bool hasToken(const APIRequest& request) {
  const char* token = request.GetQeloAccessTokenID();
  return token != nullptr && *token != '\0';
}

}  // namespace

/// Links and tokens are looked up in databases, and checked by foreign libraries: a front that
/// other callers need waits for neither.
bool FrontRoad::Takes(APIRequest& request, const Json::Value& attributes) {
  const bool taken = mayFork_ && WorkerCalls::Fit(attributes) && !request.IsUploadRequest() &&
                     !request.IsSharing() && !hasToken(request) &&
                     request.GetAPIClass() != kCompoundAPI &&
                     JsonHelper::asString(request.GetAPIInfo("socket", "")).empty();
  if (!taken) {
    Leave();
  }
  return taken;
}

bool FrontRoad::Run(APIRequest& request, APIResponse& response, const Json::Value& attributes) {
  const std::string account = MethodAccount(request, attributes);
  if (account.empty() || account == kRoot) {
    Leave();
    return false;
  }
  const std::string key =
      WorkerMessage::KeyOf(JsonHelper::asInt(request.GetAPIInfo("priority", 0)), account);
  const std::string call = WorkerMessage::Call(request, response);
  std::string text;
  if (call.size() > kLongestCall || !Ask(key, call, text)) {
    if (state_ == State::kHere) {
      Leave();
    }
    if (state_ != State::kWaiter) {
      return false;
    }
  }
  response.SetError(WEBAPI_ERR_NO_ANSWER);
  Json::Value answer;
  if (text.empty() || !DaemonMessage::Read(text, answer)) {
    WEBAPI_LOG(kSource, "a worker of %s gave no answer", LogText(account).c_str());
    return false;
  }
  response.Deserialize(answer);
  return true;
}

/// @param answer  receives the record's text; "" when the worker had the call and gave none
/// @return false when nobody has begun the call, and in the front when another waits for it
bool FrontRoad::Ask(const std::string& key, const std::string& call, std::string& answer) {
  constexpr int kTries = 3;
  for (int i = 0; i < kTries; ++i) {
    WorkerLink* worker = workers_.Get(key);
    if (worker == nullptr) {
      return false;
    }
    const bool isSent = worker->Send(call);
    const auto coming = isSent ? worker->Await(kPatience) : WorkerLink::Coming::kUntaken;
    if (coming != WorkerLink::Coming::kUntaken) {
      workers_.Used(key);
      return TakeAnswer(*worker, coming, key, answer);
    }
    workers_.Drop(key);  // it has ended, and not got the call as a whole
  }
  return false;
}

bool FrontRoad::TakeAnswer(WorkerLink& worker, WorkerLink::Coming coming, const std::string& key,
                           std::string& answer) {
  if (coming == WorkerLink::Coming::kLater && HandOver()) {
    workers_.Drop(key);
    return false;
  }
  const bool came = worker.Recv(answer);
  if (!came || answer.empty()) {
    workers_.Drop(key);
  }
  return !came || !answer.empty();
}

/// @return whether the request is another process's now
bool FrontRoad::HandOver() {
  std::fflush(nullptr);
  const pid_t pid = fork();
  if (pid == 0) {
    // A call's worker is killed in time; whoever reads the answer may be slow for as long again.
    alarm(static_cast<unsigned>(2 * limits_.call.count()));
    state_ = State::kWaiter;
    return false;
  }
  if (pid > 0) {
    state_ = State::kHandedOver;
    waiter_ = pid;
  }
  return pid > 0;
}

void FrontRoad::Answer(size_t bytes) {
  TakeBody();
  if (bytes > kPromptAnswer && state_ == State::kHere) {
    HandOver();
  }
}

/// Closed with something unread, the connection might lose the answer.
void FrontRoad::TakeBody() {
  char piece[kPiece];
  while (bodyLength_ > 0) {
    const size_t wanted = std::min(static_cast<size_t>(bodyLength_), sizeof piece);
    const ssize_t count = TEMP_FAILURE_RETRY(recv(connection_, piece, wanted, MSG_DONTWAIT));
    if (count <= 0) {
      return;
    }
    bodyLength_ -= count;
  }
}

}  // namespace QELO
