#include "tests/support/FakePlatform.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <stdexcept>

#include "webapi/platform/Cgi.h"
#include "webapi/platform/Core.h"
#include "webapi/platform/Credential.h"
#include "webapi/platform/Session.h"
#include "webapi/platform/Token.h"
#include "webapi/platform/WebServer.h"

namespace {

constexpr int kNoSessionId = -2;  ///< QeloCgiIsAuthorizedEx: the context has none

FakePlatform& fake() {
  return FakePlatform::Get();
}

template <typename... Args>
void note(const char* name, const Args&... args) {
  std::string call = std::string(name) + "(";
  [[maybe_unused]] const char* separator = "";
  ((call += separator, call += args, separator = ", "), ...);
  fake().calls.push_back(call + ")");
}

pid_t forkAsTold() {
  fflush(nullptr);
  if (fake().forkResult != -2) {
    return fake().forkResult;
  }
  if (fake().forksLeft == 0) {
    errno = EAGAIN;
    return -1;
  }
  fake().forksLeft -= fake().forksLeft > 0 ? 1 : 0;
  return fork();
}

int fill(const std::string& text, char* buffer, int size) {
  snprintf(buffer, static_cast<size_t>(size), "%s", text.c_str());
  return 1;
}

int preferenceDir(char* path, int size) {
  if (fake().preferenceDir.empty()) {
    return -1;
  }
  fill(fake().preferenceDir, path, size);
  return fake().preferenceResult;
}

/// Marks a context that was started and has taken no cookies since. The mark is the context's own,
/// behind the word that is not the CGI library's.
void empty(QeloCgiContext* context, bool isEmpty) {
  if (context != nullptr) {
    context->block[sizeof(void*)] = isEmpty ? 1 : 0;
  }
}

bool isEmpty(const QeloCgiContext* context) {
  return context != nullptr && context->block[sizeof(void*)] != 0;
}

}  // namespace

FakePlatform& FakePlatform::Get() {
  static FakePlatform instance;
  return instance;
}

FakePlatform& FakePlatform::Reset() {
  return Get() = FakePlatform();
}

extern "C" {

int QLIBCFileExist(const char* path) {
  note("QLIBCFileExist", path);
  return access(path, F_OK) == 0 ? 1 : 0;
}

int QLIBCFileTouch(const char* path) {
  note("QLIBCFileTouch", path);
  const int fd = open(path, O_WRONLY | O_CREAT | O_CLOEXEC, 0600);
  if (fd < 0) {
    return -1;
  }
  const int result = futimens(fd, nullptr);
  close(fd);
  return result;
}

int QLIBCFileLockTimeByFile(const char* path, int type, int seconds, int* fd) {
  note("QLIBCFileLockTimeByFile", path, std::to_string(type), std::to_string(seconds));
  if (fake().lockResult < 0) {
    return fake().lockResult;
  }
  *fd = open(path, O_RDWR | O_CREAT | O_CLOEXEC, 0600);
  return *fd >= 0 ? flock(*fd, LOCK_EX) : -1;
}

int QLIBCFileUnlockByFile(int fd) {
  note("QLIBCFileUnlockByFile");
  return close(fd);
}

int QLIBCFileCheckKeyValue(const char* file, const char* key, const char* value, int) {
  note("QLIBCFileCheckKeyValue", file, key);
  const auto found = fake().settings.find(key);
  return found != fake().settings.end() && found->second == value ? 1 : 0;
}

int QELOFSMkdirP(const char* path, int first, int second, uid_t uid, gid_t gid, mode_t mode) {
  note("QELOFSMkdirP", path, std::to_string(first), std::to_string(second),
       std::to_string(static_cast<int>(uid)), std::to_string(static_cast<int>(gid)),
       std::to_string(mode));
  if (fake().mkdirResult == 0) {
    std::error_code error;
    std::filesystem::create_directories(path, error);
  }
  return fake().mkdirResult;
}

pid_t QLIBCProcFork(void) {
  note("QLIBCProcFork");
  return forkAsTold();
}

pid_t QLIBCProcForkEx(int flags) {
  note("QLIBCProcForkEx", std::to_string(flags));
  return forkAsTold();
}

int QELOUserGetUGID(const char* name, uid_t* uid, gid_t* gid) {
  return fake().userGetUGID ? fake().userGetUGID(name, uid, gid) : -1;
}

int QLIBCINFOSetKeyValue(const char* key, const char* value) {
  note("QLIBCINFOSetKeyValue", key, value);
  return fake().setKeyValue ? fake().setKeyValue(key, value) : 0;
}

int QLIBGroupIsAdminGroupMem(const char* user, int) {
  note("QLIBGroupIsAdminGroupMem", user);
  return fake().isAdmin;
}

int QLIBAppPrivUserHas(const char* user, const char* application, const char* address) {
  note("QLIBAppPrivUserHas", user, application, address);
  return fake().appPriv;
}

int QELOUserPreferenceDirGet(const char* user, char* path, int size) {
  note("QELOUserPreferenceDirGet", user);
  return preferenceDir(path, size);
}

int QELOGroupPreferenceDirGet(const char* group, char* path, int size) {
  note("QELOGroupPreferenceDirGet", group);
  return preferenceDir(path, size);
}

int QLIBCConfGetCompoundEntries(int loggedIn) {
  return loggedIn != 0 ? fake().compoundEntries : fake().compoundEntriesAnonymous;
}

void QLIBCConfGetBodyLimits(QLIBCTransferLimits* limits) {
  *limits = fake().bodyLimits;
}

int QLIBCConfGetARDOTimeout(void) {
  return fake().timeoutSetting;
}

int QeloCgiInit(const char* program, QeloCgiContext* context) {
  note("QeloCgiInit", program);
  empty(context, true);
  return 1;
}

int QeloCgiInitEx(const char* userStore, QeloCgiContext* context) {
  note("QeloCgiInitEx", userStore);
  if (fake().cgiInitEx == 1) {
    empty(context, false);
  }
  return fake().cgiInitEx;
}

int QeloCgiLoadInCookies(QeloCgiContext* context) {
  const char* cookies = getenv("HTTP_COOKIE");
  fake().loadedCookies = cookies != nullptr ? cookies : "";
  note("QeloCgiLoadInCookies");
  empty(context, false);
  return 1;
}

const char* QeloCgiGetLang(QeloCgiContext* context) {
  return isEmpty(context) ? "enu" : fake().language.c_str();
}

int QeloCgiIsTokenEnable(QeloCgiContext*) {
  return fake().tokenEnable;
}

int QeloCgiGetRemoteIP(char* address, int size) {
  if (fake().remoteAddress.empty()) {
    return -1;
  }
  fill(fake().remoteAddress, address, size);
  return 0;
}

int QeloCgiIsAuthorizedEx(QeloCgiContext* context, const QeloCgiAuthFlags* flags, char* user,
                          int size, int allowTimeout, int checkAddress) {
  note("QeloCgiIsAuthorizedEx", std::to_string(flags->sessionFromParameter),
       std::to_string(allowTimeout),
       std::to_string(checkAddress) + (flags->keepIdle != 0 ? ", idle" : ""));
  fill(isEmpty(context) ? "" : fake().authorizedUser, user, size);
  return isEmpty(context) ? kNoSessionId : fake().authorized;
}

int QeloCgiGetOption(QeloCgiContext* context, const char* name, char* value, int size) {
  const auto found = fake().options.find(name);
  const bool isFound = !isEmpty(context) && found != fake().options.end();
  fill(isFound ? found->second : "", value, size);
  return isFound ? 1 : 0;
}

unsigned int QeloCgiUIDGet(const char* sessionId, const char* user) {
  note("QeloCgiUIDGet", sessionId, user);
  return fake().uid;
}

int QeloCgiKeepsVariable(const char* name) {
  return fake().keptVariable == name ? 1 : 0;
}

int QeloCgiDetectAndDecryptParamLine(char* line) {
  note("QeloCgiDetectAndDecryptParamLine", line);
  return fake().detectResult;
}

int QeloCgiDecryptParam(char* text) {
  note("QeloCgiDecryptParam", text);
  return fake().decryptParam ? fake().decryptParam(text) : 0;
}

int QeloCgiGetPublicKey(char* text, int size) {
  note("QeloCgiGetPublicKey");
  const std::string& key = fake().publicKey;
  text[key.copy(text, static_cast<size_t>(size) - 1)] = '\0';
  return key.empty() ? -1 : 0;
}

int QeloLoginAttempt(const char* address, const char* account) {
  note("QeloLoginAttempt", address, account);
  return fake().loginAttempt;
}

void QeloLoginSucceeded(const char* address, const char* account) {
  note("QeloLoginSucceeded", address, account);
}

int QeloLoginPasswordCheck(const char* account, const char*, const char* address, char* user,
                           int size) {
  note("QeloLoginPasswordCheck", account, address);
  fill(account, user, size);
  return fake().passwordCheck;
}

int QeloSessionCreate(const char* user, const char* address, char* id, char* token) {
  note("QeloSessionCreate", user, address);
  memset(id, 'i', QELO_SESSION_ID_LENGTH);
  memset(token, 't', QELO_SESSION_ID_LENGTH);
  id[QELO_SESSION_ID_LENGTH] = token[QELO_SESSION_ID_LENGTH] = '\0';
  return fake().sessionCreate;
}

int QeloSessionRemove(const char* id) {
  note("QeloSessionRemove", id);
  return fake().sessionRemove;
}

int QeloSessionRefresh(const char* id) {
  note("QeloSessionRefresh", id);
  return fake().sessionRefresh;
}

long QeloSessionSecondsLeft(const char* id) {
  note("QeloSessionSecondsLeft", id);
  return fake().secondsLeft;
}

int QeloAccessTokenGrant(const char* token, const char* api, const char* method, char* user,
                         int size) {
  note("QeloAccessTokenGrant", token, api, method);
  fill(fake().tokenUser, user, size);
  return fake().tokenGrant;
}

int QELOCloudServiceZttokenGenerateToken(const char* token, char* key, int size) {
  note("QELOCloudServiceZttokenGenerateToken", token, std::to_string(size));
  fill("key", key, size);
  return fake().aesKeyResult;
}

}  // extern "C"

bool ResetCredentialsByName(const char* name, bool keepPrivilege) {
  note("ResetCredentialsByName", name, keepPrivilege ? "keep" : "drop");
  return fake().resetCredentials ? fake().resetCredentials(name, keepPrivilege)
                                 : fake().credentialResult;
}

bool InitCredentialsByExecutable(const char* path, bool keepPrivilege) {
  note("InitCredentialsByExecutable", path, keepPrivilege ? "keep" : "drop");
  return fake().executableCredentials ? fake().executableCredentials(path, keepPrivilege)
                                      : fake().credentialResult;
}

bool QELO::CredRequestUtil::GetDecryptAESString(const std::string& key, const std::string& cipher,
                                                std::string& plain) {
  note("GetDecryptAESString", key, cipher);
  return fake().decryptAES && fake().decryptAES(key, cipher, plain);
}

namespace qelow3 {

struct EnginePrivate {};

Engine::Engine() : private_(std::make_shared<EnginePrivate>()) {
  note("Engine");
  if (fake().engineThrows) {
    throw std::runtime_error("no engine");
  }
}
Engine::~Engine() = default;

ARDO::ARDO(const Engine& engine) : engine_(engine) {}
ARDO::~ARDO() = default;

bool ARDO::RestartService() {
  note("RestartService");
  return true;
}

}  // namespace qelow3
