#include "programs/webapi-exec/Call.h"

#include <fcntl.h>
#include <pwd.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "programs/webapi-exec/Accounts.h"
#include "webapi/ExecHandler.h"
#include "webapi/ExecParam.h"
#include "webapi/platform/Core.h"

namespace QELO::ExecProgram {
namespace {

constexpr char kBatchAPI[] = "QELO.Entry.Request";
constexpr char kBatchMethod[] = "request";
constexpr mode_t kOutputMode = 0666;  // less the umask, as files that programs make are

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

/// What a downloading method prints is never mixed with the answer.
int openOutput(const std::string& file) {
  return open(file.empty() ? "/dev/null" : file.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC,
              kOutputMode);
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
  const int output = openOutput(options.output);
  if (output < 0) {
    return options.output + ": " + strerror(errno);
  }
  const bool isBatch = !options.batch.empty();
  ExecParam param;
  param.SetParams(options.params)
      .SetAPI(isBatch ? kBatchAPI : options.api)
      .SetVersion(options.version != 0 ? options.version : 1)
      .SetMethod(isBatch ? kBatchMethod : options.method)
      .SetRunner(user)
      .SetOutputFd(output);
  ExecHandler handler(param);
  answer = handler.Process();
  int error = handler.GetOutputError();
  if (close(output) != 0 && error == 0) {
    error = errno;
  }
  return error == 0 ? "" : options.output + ": " + strerror(error);
}

}  // namespace QELO::ExecProgram
