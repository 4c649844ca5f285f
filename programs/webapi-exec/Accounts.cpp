#include "programs/webapi-exec/Accounts.h"

#include <pwd.h>
#include <unistd.h>

#include <cstdio>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "webapi/APIDescription.h"
#include "webapi/APIRunner.h"
#include "webapi/JsonHelper.h"
#include "webapi/platform/Core.h"
#include "webapi/platform/Paths.h"

namespace QELO::ExecProgram {
namespace {

constexpr bool kIsHost = sizeof WEBAPI_ROOT_PREFIX == 1;
constexpr char kPasswd[] = WEBAPI_ROOT_PREFIX "/etc/passwd";
constexpr std::string_view kNoLogin = "nologin";

bool mayCallAs(uid_t uid) {
  return geteuid() == 0 || uid == geteuid();
}

bool isLogin(std::string_view shell) {
  return shell.size() < kNoLogin.size() || shell.substr(shell.size() - kNoLogin.size()) != kNoLogin;
}

/// The account that a method without grantByDefault runs as.
std::string accountOf(const Json::Value& description, const Json::Value& attributes,
                      const std::string& user) {
  return APIDescription::IsSet(attributes, "grantByUser")
             ? user
             : APIDescription(description).GetRunAs(attributes);
}

}  // namespace

std::vector<std::string> callableUsers() {
  std::vector<std::string> names;
  const std::unique_ptr<FILE, int (*)(FILE*)> file(kIsHost ? nullptr : fopen(kPasswd, "re"),
                                                   fclose);
  while (const passwd* account = file ? fgetpwent(file.get()) : nullptr) {
    if (mayCallAs(account->pw_uid) && isLogin(account->pw_shell)) {
      names.emplace_back(account->pw_name);
    }
  }
  return names;
}

std::string missingRights(const std::string& api, int version, const std::string& method,
                          const std::string& user) {
  APIRunner runner;
  Json::Value found(Json::objectValue);
  if (chdir(Paths::kDescriptionDir) != 0 || !runner.InitLibDesc(found, api)) {
    return "";
  }
  const Json::Value& attributes = runner.GetMethod(api, version, method);
  if (APIDescription::IsSet(attributes, "grantByDefault")) {
    return geteuid() == 0 ? "" : "the method runs as root: call it as root";
  }
  const std::string account = accountOf(JsonHelper::member(found, api), attributes, user);
  uid_t uid = 0;
  gid_t gid = 0;
  if (QELOUserGetUGID(account.c_str(), &uid, &gid) != 0) {
    return "the method runs as " + account + ", and there is no such account";
  }
  const bool isOwn = uid == geteuid() && gid == getegid();
  return geteuid() == 0 || isOwn ? "" : "the method runs as " + account + ": call it as root";
}

}  // namespace QELO::ExecProgram
