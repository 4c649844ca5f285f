#include "webapi/testing/TestHost.h"

#include <dlfcn.h>
#include <fcntl.h>
#include <signal.h>
#include <sys/mman.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <map>
#include <sstream>

#include "tests/harness/Capture.h"
#include "tests/harness/Clock.h"
#include "tests/harness/Ids.h"
#include "tests/harness/Tables.h"
#include "tests/support/FakePlatform.h"
#include "tests/support/FakeTask.h"
#include "tests/support/SyslogCapture.h"
#include "webapi/APIAuth.h"
#include "webapi/APIDescription.h"
#include "webapi/JsonHelper.h"
#include "webapi/WebEntry.h"
#include "webapi/platform/WebAPIUtil.h"

namespace QELO {
namespace {

namespace fs = std::filesystem;

constexpr uid_t kSystemId = 900;
constexpr int kLooks = 1000;  ///< at a task that is waited for
constexpr useconds_t kPauseUs = 10000;
constexpr int kAuthorized = 1;
constexpr int kNoSession = -2;
/// What a request may have left in the process, or the test program's starter.
constexpr const char* kVariables[] = {
    "REQUEST_METHOD",   "QUERY_STRING",         "CONTENT_LENGTH",   "CONTENT_TYPE",
    "HTTP_COOKIE",      "HTTP_X_QELO_SHARING",  "HTTP_X_TYPE_NAME", "HTTP_TUS_RESUMABLE",
    "HTTP_HOST",        "REQUEST_URI",          "QELO_REMOTE_IP",   "HTTP_USER_AGENT",
    "qeloAccessToken",  "QELO_WEBAPI_USERNAME", "in_qeloapid",      "HTTP_TRANSFER_ENCODING",
    "HTTP_X_QELO_TOKEN"};

struct Account {
  uid_t uid;
  bool isAdmin;
};

/// Where the file with this code is in memory.
void* fileWith(void* code) {
  Dl_info info{};
  return dladdr(code, &info) != 0 ? info.dli_fbase : nullptr;
}

/// A test program with the shared library too may have its functions from there, and its calls
/// would go to the host itself.
void expectOneFramework() {
  if (fileWith(reinterpret_cast<void*>(&APIAuth::GetUserClass)) !=
      fileWith(reinterpret_cast<void*>(&AnswerOf))) {
    std::fputs("link webapi::testing in place of webapi::webapi, not beside it\n", stderr);
    std::abort();
  }
}

/// A value as careful clients send it: a text that is declared one arrives as it was sent, any
/// other stands in quotes.
std::string wireTextOf(const Json::Value& value, const Json::Value& declared) {
  const bool isText = JsonHelper::isText(JsonHelper::member(declared, "type"), "string");
  return isText && value.isString() ? value.asString() : JsonHelper::toString(value);
}

bool isIn(const std::string& line, const std::string& text) {
  return line.find(text) != std::string::npos;
}

}  // namespace

struct TestHost::State {
  fs::path directory;
  fs::path former = fs::current_path();
  std::map<std::string, Account> accounts = {{"root", {0, true}}, {"system", {kSystemId, false}}};
  std::map<std::string, std::string> variables;
  std::map<std::string, Json::Value> descriptions;
  std::string user;  ///< who is logged in; "": nobody
  bool hasUpload = false;
  int log = -1;

  bool Become(const std::string& name, bool keepPrivilege) const;
  void PrepareAccounts();
  void PrepareEnvironment(const std::string& query, const std::string& body);
  TestAnswer Serve();
};

bool TestHost::State::Become(const std::string& name, bool keepPrivilege) const {
  const auto account = accounts.find(name);
  if (account == accounts.end()) {
    errno = ENOENT;
    return false;
  }
  Ids::Become(account->second.uid, account->second.uid, keepPrivilege);
  return true;
}

void TestHost::State::PrepareAccounts() {
  FakePlatform& platform = FakePlatform::Get();
  platform.resetCredentials = [this](const std::string& name, bool keepPrivilege) {
    return Become(name, keepPrivilege);
  };
  platform.userGetUGID = [this](const std::string& name, uid_t* uid, gid_t* gid) {
    const auto account = accounts.find(name);
    if (account == accounts.end()) {
      return -1;
    }
    *uid = *gid = account->second.uid;
    return 0;
  };
}

void TestHost::State::PrepareEnvironment(const std::string& query, const std::string& body) {
  for (const char* name : kVariables) {
    unsetenv(name);
  }
  const auto set = [](const std::string& name, const std::string& value) {
    setenv(name.c_str(), value.c_str(), 1);
  };
  set("REQUEST_METHOD", "POST");
  set("QUERY_STRING", query);
  set("CONTENT_LENGTH", std::to_string(body.size()));
  set("HTTP_HOST", "host.test");
  set("REQUEST_URI", "/webapi/entry.cgi");
  if (hasUpload) {
    set("CONTENT_TYPE", "multipart/form-data; boundary=x");
  }
  if (!user.empty()) {
    set("HTTP_COOKIE", "id=made-up-session");
  }
  for (const auto& [name, value] : variables) {
    set(name, value);
  }
}

TestAnswer TestHost::State::Serve() {
  Tables tables;
  fs::current_path(directory / "descriptions");
  TestAnswer answer = AnswerOf(PrintedBy([] {
    WebEntry entry;
    entry.Run(Json::Value());
  }));
  fs::current_path(former);
  answer.isCalled = Tables::Run().isCalled;
  if (answer.isCalled) {
    answer.uid = Tables::Run().uid;
    answer.gid = Tables::Run().gid;
    for (const auto& [name, account] : accounts) {
      answer.account = account.uid == answer.uid ? name : answer.account;
    }
  }
  Ids::Reset();
  return answer;
}

TestHost::TestHost() : state_(std::make_unique<State>()) {
  expectOneFramework();
  FakePlatform::Reset();
  FakeTask::Reset();
  SyslogCapture::Clear();
  Ids::Reset();
  Clock::Stopped() = 0;
  std::string pattern = fs::temp_directory_path() / "webapi-test.XXXXXX";
  state_->directory = mkdtemp(pattern.data());
  fs::create_directory(state_->directory / "descriptions");
  fs::permissions(state_->directory / "descriptions", fs::perms::owner_all);
  FakePlatform::Get().upload.volume = state_->directory;
  state_->log = memfd_create("log", MFD_CLOEXEC);
  SyslogCapture::Copy() = state_->log;
  state_->PrepareAccounts();
  LogOut();
}

TestHost::~TestHost() {
  for (const auto& [name, account] : state_->accounts) {
    for (const std::string& id : FakeTask::Get().Ids(name)) {
      const int pid =
          JsonHelper::asInt(JsonHelper::member(FakeTask::Get().Record(name, id), "pid"));
      if (pid > 0) {
        kill(pid, SIGKILL);
        waitpid(pid, nullptr, 0);
      }
    }
  }
  SyslogCapture::Copy() = -1;
  close(state_->log);
  Clock::Stopped() = 0;
  std::error_code error;
  fs::remove_all(state_->directory, error);
}

bool TestHost::Describe(const std::string& file) {
  Json::Value descriptions;
  if (!JsonHelper::fromFile(file, descriptions) || !descriptions.isObject()) {
    return false;
  }
  for (auto it = descriptions.begin(); it != descriptions.end(); ++it) {
    Describe(it.name(), *it);
  }
  return true;
}

void TestHost::Describe(const std::string& api, const Json::Value& description) {
  Json::Value file;
  file[api] = description;
  if (description.isObject()) {
    file[api]["lib"] = "the test program";
  }
  JsonHelper::toFile(state_->directory / "descriptions" / (api + ".lib"), file);
  state_->descriptions[api] = file[api];
}

void TestHost::AddUser(const std::string& name, uid_t uid, bool isAdmin) {
  state_->accounts[name] = {uid, isAdmin};
}

void TestHost::LogIn(const std::string& user, const std::string& address) {
  FakePlatform& platform = FakePlatform::Get();
  const auto account = state_->accounts.find(user);
  const bool isKnown = account != state_->accounts.end();
  state_->user = user;
  platform.authorized = kAuthorized;
  platform.authorizedUser = user;
  platform.remoteAddress = address;
  platform.isAdmin = isKnown && account->second.isAdmin ? 1 : 0;
  platform.uid = isKnown ? account->second.uid : static_cast<uid_t>(-1);
  platform.preferenceDir = PreferenceDirectory(user);
  fs::create_directories(platform.preferenceDir);
}

void TestHost::LogOut() {
  state_->user.clear();
  FakePlatform::Get().authorized = kNoSession;
  FakePlatform::Get().authorizedUser.clear();
  FakePlatform::Get().isAdmin = 0;
}

void TestHost::SetAppPrivilege(bool isHeld) {
  FakePlatform::Get().appPriv = isHeld ? 1 : 0;
}

void TestHost::AddUpload(const std::string& field, const std::string& name,
                         const std::string& content) {
  FakeUpload& upload = FakePlatform::Get().upload;
  const fs::path path = state_->directory / ("upload" + std::to_string(upload.files.size()));
  std::ofstream(path) << content;
  upload.parameters[field] = name;
  upload.files[field] = path;
  state_->hasUpload = true;
}

void TestHost::SetVariable(const std::string& name, const std::string& value) {
  state_->variables[name] = value;
}

void TestHost::SetClock(time_t now) {
  Clock::Stopped() = now;
}

TestAnswer TestHost::Call(const std::string& api, int version, const std::string& method,
                          const Params& params) {
  const Json::Value* attributes =
      APIDescription(state_->descriptions[api]).Attributes(version, method);
  const Json::Value none;
  const Json::Value& declared = JsonHelper::member(
      JsonHelper::member(attributes != nullptr ? *attributes : none, "params"), "properties");
  std::string line;
  for (const auto& [name, value] : params) {
    line += (line.empty() ? "" : "&") + WebAPIUtil::URLEncode(name) + "=" +
            WebAPIUtil::URLEncode(wireTextOf(value, JsonHelper::member(declared, name)));
  }
  return CallLine(api, version, method, line);
}

TestAnswer TestHost::CallLine(const std::string& api, int version, const std::string& method,
                              const std::string& line) {
  const std::string whole = "api=" + WebAPIUtil::URLEncode(api) +
                            "&version=" + std::to_string(version) +
                            "&method=" + WebAPIUtil::URLEncode(method) + "&" + line;
  const std::string body = state_->hasUpload ? "--x" : whole;
  state_->PrepareEnvironment(state_->hasUpload ? whole : "", body);
  const Input input(body);
  TestAnswer answer = state_->Serve();
  state_->hasUpload = false;
  FakePlatform::Get().upload.files.clear();
  FakePlatform::Get().upload.parameters.clear();
  return answer;
}

Json::Value TestHost::WaitForTask(const std::string& fullId) {
  const size_t slash = fullId.find('/');
  if (slash == std::string::npos) {
    return Json::Value();
  }
  for (int look = 0; look < kLooks; ++look) {
    const Json::Value record =
        FakeTask::Get().Record(fullId.substr(0, slash), fullId.substr(slash + 1));
    if (record.isNull() || JsonHelper::asBool(JsonHelper::member(record, "finished"))) {
      return JsonHelper::member(JsonHelper::member(record, "properties"), "body");
    }
    usleep(kPauseUs);
  }
  return Json::Value();
}

void TestHost::RefuseProcesses(bool areRefused) {
  FakePlatform::Get().forksLeft = areRefused ? 0 : -1;
}

std::vector<std::string> TestHost::Log() const {
  std::string text(static_cast<size_t>(lseek(state_->log, 0, SEEK_END)), '\0');
  text.resize(
      static_cast<size_t>(std::max<ssize_t>(0, pread(state_->log, text.data(), text.size(), 0))));
  std::vector<std::string> lines;
  std::istringstream stream(text);
  for (std::string line; std::getline(stream, line);) {
    const size_t end = line.find('>');
    lines.push_back(end == std::string::npos ? line : line.substr(end + 1));
  }
  return lines;
}

bool TestHost::HasLogged(const std::string& text) const {
  const std::vector<std::string> lines = Log();
  return std::any_of(lines.begin(), lines.end(),
                     [&](const std::string& line) { return isIn(line, text); });
}

const std::string& TestHost::Directory() const {
  return state_->directory.native();
}

std::string TestHost::PreferenceDirectory(const std::string& user) const {
  return state_->directory / "home" / user / ".webapi";
}

}  // namespace QELO
