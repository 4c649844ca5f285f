#include "programs/webapi-exec/Call.h"

#include <pwd.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>

#include "programs/webapi-exec/Accounts.h"
#include "programs/webapi-exec/Program.h"
#include "programs/webapi-exec/transfer/OutputFile.h"
#include "programs/webapi-exec/transfer/TransferCall.h"
#include "programs/webapi-exec/transfer/UploadBody.h"
#include "webapi/ExecParam.h"
#include "webapi/JsonHelper.h"
#include "webapi/platform/Core.h"

namespace QELO::ExecProgram {
namespace {

constexpr char kBatchAPI[] = "QELO.Entry.Request";
constexpr char kBatchMethod[] = "request";

/// The name of the calling account, "" when it has none.
std::string ownName() {
  const passwd* account = getpwuid(geteuid());
  return account != nullptr ? account->pw_name : "";
}

/// What to do about a user who does not exist. The accounts of a private root are few, and none of
/// the host's.
std::string adviceOnUsers() {
  std::string names;
  for (const std::string& name : callableUsers()) {
    names += (names.empty() ? "" : ", ") + name;
  }
  return names.empty() ? "--user names another" : "--user takes one of " + names;
}

/// Has an upload go on where the same call was ended before.
void resume(const Options& options, const std::string& user, UploadBody& upload) {
  uid_t uid = 0;
  gid_t gid = 0;
  if (upload.IsEmpty() || QELOUserGetUGID(user.c_str(), &uid, &gid) != 0) {
    return;
  }
  upload.Resume(uid, options.api + " " + std::to_string(options.version) + " " + options.method);
  if (upload.There() > 0) {
    fprintf(stderr, "webapi-exec: %s: goes on behind %llu bytes that are there\n",
            options.uploads.front().second.c_str(),
            static_cast<unsigned long long>(upload.There()));
  }
}

/// Whether the caller may call as this user. No permission is checked behind this.
/// @return why not, or ""
std::string checkUser(const std::string& user) {
  uid_t uid = 0;
  gid_t gid = 0;
  if (user.empty()) {
    return "the calling account has no name; " + adviceOnUsers();
  }
  if (QELOUserGetUGID(user.c_str(), &uid, &gid) != 0) {
    return "there is no user " + user + " here; " + adviceOnUsers();
  }
  return geteuid() == 0 || uid == geteuid() ? "" : "only root may call as another user";
}

/// The call's request: with a form, for what is not there yet.
Json::Value requestOf(const UploadBody& upload, const OutputFile& output) {
  Json::Value request(Json::objectValue);
  if (!upload.IsEmpty()) {
    request = upload.Request();
  }
  if (output.There() > 0) {
    request["HTTP_RANGE"] = "bytes=" + std::to_string(output.There()) + "-";
    request["HTTP_IF_RANGE"] = output.Mark();
  }
  return request;
}

}  // namespace

std::string findUser(const Options& options, std::string& user) {
  user = options.user.empty() ? ownName() : options.user;
  return checkUser(user);
}

std::string makeCall(const Options& options, Json::Value& answer) {
  std::string user;
  const std::string wrong = findUser(options, user);
  if (!wrong.empty()) {
    return wrong;
  }
  UploadBody upload;
  const std::string unreadable = upload.Open(options.uploads);
  if (!unreadable.empty()) {
    return unreadable;
  }
  resume(options, user, upload);
  // What a downloading method prints is never mixed with the answer.
  OutputFile output;
  const int closed = output.Open(options.output);
  if (closed != 0) {
    return options.output + ": " + strerror(closed);
  }
  const bool isBatch = !options.batch.empty();
  Json::Value attributes(Json::objectValue);
  if (!isBatch && options.api != kBatchAPI) {  // whose entries have parameters of their own
    attributes["_sent_texts"] = options.sent;
  }
  ExecParam param;
  param.SetParams(options.params)
      .SetAPI(isBatch ? kBatchAPI : options.api)
      .SetVersion(options.version != 0 ? options.version : 1)
      .SetMethod(isBatch ? kBatchMethod : options.method)
      .SetEnv(requestOf(upload, output))
      .SetAttr(attributes)
      .SetRunner(user)
      .SetOutputFd(output.Descriptor());
  TransferCall call(param, output, !options.output.empty());
  if (!upload.IsEmpty() && !upload.Start()) {
    return std::string("the files cannot be sent: ") + strerror(errno);
  }
  answer = call.Process();
  int error = call.GetOutputError();
  const bool isWhole =
      error == 0 && call.IsWhole() && JsonHelper::asBool(JsonHelper::member(answer, "success"));
  const int lost = output.Finish(isWhole);
  error = error != 0 ? error : lost;
  if (!output.Left().empty()) {
    fprintf(stderr, "%s: %s\n", programName, output.Left().c_str());
  }
  if (error != 0) {
    return options.output + ": " + strerror(error);
  }
  return call.IsWhole() ? "" : options.output + ": the download broke off";
}

}  // namespace QELO::ExecProgram
