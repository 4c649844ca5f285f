// Leaves something of itself in its process, each method something else. "state" answers what a
// call finds there.
//
// Tests: scgi.py

#include <fcntl.h>
#include <grp.h>
#include <locale.h>
#include <pthread.h>
#include <sched.h>
#include <signal.h>
#include <sys/file.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/time.h>
#include <time.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <iostream>
#include <locale>
#include <stdexcept>
#include <string>

#include "PluginTable.h"

using QELO::APIRequest;
using QELO::APIResponse;

static int calls = 0;
static std::string last = "nothing";  // NOLINT

static Json::Value ids() {
  uid_t user[3];
  gid_t group[3];
  gid_t groups[64];
  Json::Value all(Json::arrayValue);
  getresuid(&user[0], &user[1], &user[2]);
  getresgid(&group[0], &group[1], &group[2]);
  for (int i = 0; i < 3; ++i) {
    all.append(user[i]);
    all.append(group[i]);
  }
  for (int i = 0, count = getgroups(64, groups); i < count; ++i) {
    all.append(groups[i]);
  }
  return all;
}

static int descriptors() {
  int count = 0;
  for (const auto& entry : std::filesystem::directory_iterator("/proc/self/fd")) {
    count += entry.path().empty() ? 0 : 1;
  }
  return count;
}

/// Answers what a call finds in its process, but not which process that is.
static void state(APIRequest* request, APIResponse* response) {
  Json::Value data;
  char directory[4096] = "";
  struct sigaction handler {};
  sigset_t blocked;
  itimerval timer{};
  rlimit limit{};
  sigaction(SIGUSR1, nullptr, &handler);
  sigprocmask(SIG_SETMASK, nullptr, &blocked);
  getitimer(ITIMER_REAL, &timer);
  getrlimit(RLIMIT_NOFILE, &limit);
  const mode_t mask = umask(0);
  umask(mask);
  const char* added = getenv("HTTP_X_LEFT");
  data["directory"] = getcwd(directory, sizeof directory) != nullptr ? directory : "";
  data["variable"] = added != nullptr ? added : "none";
  data["path"] = getenv("PATH");
  data["umask"] = mask;
  data["handled"] = handler.sa_handler != SIG_DFL;
  data["blocked"] = sigismember(&blocked, SIGUSR1);
  data["alarm"] = static_cast<Json::Int64>(timer.it_value.tv_sec);
  data["limit"] = static_cast<Json::UInt64>(limit.rlim_cur);
  data["nice"] = getpriority(PRIO_PROCESS, 0);
  data["locale"] = setlocale(LC_ALL, nullptr);
  data["format"] = static_cast<int>(std::cout.flags());
  data["cout"] = std::cout.good();
  data["stdout"] = ferror(stdout) == 0 && fileno(stdout) == STDOUT_FILENO;
  data["null"] = isatty(STDOUT_FILENO) == 0 && fcntl(STDIN_FILENO, F_GETFD) >= 0;
  data["decimal"] = std::to_string(0.5);
  data["ids"] = ids();
  data["user"] = request->GetLoginUserName();
  data["mark"] = request->GetParam("mark", "");
  response->SetSuccess(data);
}

/// Answers who this is, whose call came before, and who calls.
static void who(APIRequest* request, APIResponse* response) {
  Json::Value data;
  data["pid"] = getpid();
  data["calls"] = ++calls;
  data["last"] = last;
  data["ids"] = ids();
  data["user"] = request->GetLoginUserName();
  data["variable"] = getenv("QELO_WEBAPI_USERNAME");
  data["session"] = request->GetSessionID();
  data["cookie"] = getenv("HTTP_COOKIE") != nullptr ? getenv("HTTP_COOKIE") : "";
  data["parameters"] = request->GetParam("");
  data["descriptors"] = descriptors();
  last = request->GetLoginUserName() + request->GetParam("mark", "").asString();
  response->SetSuccess(data);
}

static void handle(int) {}

static void* sleepOn(void*) {
  sleep(30);
  return nullptr;
}

static bool leaveOutside(const std::string& what, const std::string& file) {
  if (what == "directory") {
    return chdir("/") == 0;
  }
  if (what == "environment") {
    return setenv("HTTP_X_LEFT", "left", 1) == 0 && setenv("PATH", "/left", 1) == 0;
  }
  if (what == "umask") {
    umask(0);
  } else if (what == "descriptor") {
    return open("/dev/null", O_RDONLY) >= 0;
  } else if (what == "high descriptor") {
    return fcntl(STDIN_FILENO, F_DUPFD, 200) >= 0;
  } else if (what == "other descriptor") {  // in the place of one that is not its own
    for (int number = 3; number < 16; ++number) {
      const int other = open("/dev/zero", O_RDONLY);
      dup2(other, number);
      if (other != number) {
        close(other);
      }
    }
  } else if (what == "lock") {
    return flock(open(file.c_str(), O_RDWR), LOCK_EX) == 0;
  } else if (what == "limit") {
    const rlimit limit{20, 20};
    return setrlimit(RLIMIT_NOFILE, &limit) == 0;
  } else {
    return false;
  }
  return true;
}

static bool leaveProcess(const std::string& what) {
  if (what == "child" || what == "grandchild") {
    const bool isFirst = what == "child";
    const pid_t pid = fork();
    if (pid == 0) {
      if (isFirst || fork() == 0) {
        sleep(30);
      }
      _exit(0);
    }
    usleep(isFirst ? 0 : 50000);
  } else if (what == "thread") {
    pthread_t thread;
    return pthread_create(&thread, nullptr, sleepOn, nullptr) == 0;
  } else if (what == "priority") {
    return setpriority(PRIO_PROCESS, 0, 7) == 0;
  } else if (what == "schedule") {
    const sched_param none{};
    return sched_setscheduler(0, SCHED_BATCH, &none) == 0;
  } else if (what == "memory") {
    char* memory = static_cast<char*>(malloc(size_t{100} << 20));
    memset(memory, 1, size_t{100} << 20);
    asm volatile("" : : "r"(memory) : "memory");
  } else {
    return false;
  }
  return true;
}

static bool leaveSignal(const std::string& what) {
  if (what == "handler") {
    signal(SIGUSR1, handle);
  } else if (what == "mask") {
    sigset_t all;
    sigfillset(&all);
    sigprocmask(SIG_SETMASK, &all, nullptr);
  } else if (what == "pending") {
    sigset_t one;
    sigemptyset(&one);
    sigaddset(&one, SIGUSR1);
    sigprocmask(SIG_BLOCK, &one, nullptr);
    raise(SIGUSR1);
  } else if (what == "alarm") {
    alarm(1);
  } else if (what == "timer") {
    sigevent event{};
    event.sigev_notify = SIGEV_SIGNAL;
    event.sigev_signo = SIGALRM;
    timer_t timer{};
    const itimerspec soon{{0, 0}, {1, 0}};
    return timer_create(CLOCK_MONOTONIC, &event, &timer) == 0 &&
           timer_settime(timer, 0, &soon, nullptr) == 0;
  } else {
    return false;
  }
  return true;
}

struct Comma : std::numpunct<char> {
  char do_decimal_point() const override { return ','; }
};

static bool leaveStream(const std::string& what) {
  if (what == "locale") {
    return setlocale(LC_ALL, "C.UTF-8") != nullptr;
  }
  if (what == "thread locale") {
    return uselocale(newlocale(LC_ALL_MASK, "C.UTF-8", nullptr)) != nullptr;
  }
  if (what == "C++ locale") {
    std::locale::global(std::locale(std::locale::classic(), new Comma));
    std::cout.imbue(std::locale());
  } else if (what == "format") {
    std::cout << std::hex << std::showbase;
  } else if (what == "stream errors") {
    std::cout.setstate(std::ios::badbit);
    std::cout.exceptions(std::ios::goodbit);
  } else if (what == "streams closed") {
    fclose(stdout);
    close(STDIN_FILENO);
  } else if (what == "name") {
    prctl(PR_SET_NAME, "left");
    prctl(PR_SET_DUMPABLE, 1);
  } else {
    return false;
  }
  return true;
}

/// Leaves "what" behind.
static void leave(APIRequest* request, APIResponse* response) {
  const std::string what = request->GetParam("what", "").asString();
  const std::string file = request->GetParam("file", "").asString();
  if (leaveOutside(what, file) || leaveProcess(what) || leaveSignal(what) || leaveStream(what)) {
    response->SetSuccess();
  } else {
    response->SetError(400);
  }
}

/// Answers by how many ways it could become root, or the user with the id "uid".
static void escape(APIRequest* request, APIResponse* response) {
  constexpr uid_t kSame = static_cast<uid_t>(-1);
  const uid_t uid = request->GetParam("uid", 0).asUInt();
  const gid_t gid = 0;
  Json::Value ways(Json::arrayValue);
  const auto attempt = [&](const char* way, bool done) {
    if (done) {
      ways.append(way);
    }
  };
  attempt("setuid", setuid(uid) == 0);
  attempt("seteuid", seteuid(uid) == 0);
  attempt("setreuid", setreuid(uid, kSame) == 0);
  attempt("setresuid", setresuid(kSame, uid, kSame) == 0);
  attempt("setresuid saved", setresuid(kSame, kSame, uid) == 0);
  attempt("setgid", setgid(gid) == 0);
  attempt("setresgid", setresgid(kSame, gid, kSame) == 0);
  attempt("setgroups", setgroups(1, &gid) == 0);
  attempt("nice", setpriority(PRIO_PROCESS, 0, -5) == 0);
  attempt("shadow", access("/etc/shadow", R_OK) == 0);
  attempt("parent", kill(getppid(), 0) == 0);
  attempt("parent's memory",
          open(("/proc/" + std::to_string(getppid()) + "/mem").c_str(), O_RDONLY) >= 0);
  Json::Value data;
  data["ways"] = ways;
  data["ids"] = ids();
  response->SetSuccess(data);
}

static void crash(APIRequest*, APIResponse*) {
  abort();
}

static void finish(APIRequest*, APIResponse*) {
  exit(0);
}

static void fail(APIRequest*, APIResponse*) {
  throw std::runtime_error("as told");
}

static void silent(APIRequest*, APIResponse*) {}

static void echo(APIRequest* request, APIResponse* response) {
  response->SetHeader("X-Echo", request->GetParam("header", "").asString());
  response->AddCookie("echo", "1");
  response->SetSuccess(request->GetParam(""));
}

static void large(APIRequest* request, APIResponse* response) {
  response->SetSuccess(std::string(request->GetParam("size", 1).asUInt(), 'x'));
}

static void bytes(APIRequest*, APIResponse* response) {
  Json::Value data;
  data["invalid"] = std::string("a\xff\xc3(\x01\x7f\"\\/\0z", 12);
  data["utf8"] = "\xc3\xa4\xe2\x82\xac\xf0\x9f\x98\x80";
  data["numbers"].append(-1);
  data["numbers"].append(1.0);
  data["numbers"].append(0.1);
  data["numbers"].append(1e300);
  data["numbers"].append(Json::UInt64{UINT64_MAX});
  data["numbers"].append(Json::Int64{INT64_MIN});
  data["empty"]["list"] = Json::Value(Json::arrayValue);
  data["empty"]["object"] = Json::Value(Json::objectValue);
  data["empty"]["null"] = Json::Value();
  response->SetSuccess(data);
}

static void slow(APIRequest* request, APIResponse* response) {
  usleep(request->GetParam("ms", 0).asUInt() * 1000);
  response->SetSuccess(request->GetLoginUserName());
}

static void touch(void* file) {
  FILE* opened = fopen(static_cast<const char*>(file), "a");
  if (opened != nullptr) {
    fputs("ran\n", opened);
    fclose(opened);
  }
}

/// Has a callback write to "file".
static void later(APIRequest* request, APIResponse* response) {
  response->SetCallbackFunc(touch, strdup(request->GetParam("file", "").asCString()));
  response->SetSuccess();
}

static int refuse(APIRequest*, APIResponse* response) {
  response->SetError(455);
  return 0;
}

constexpr char kApi[] = "QELO.Test.Staying";
static QELO::_tag_API_TABLE table[] = {
    {kApi, 1, "state", state},   {kApi, 1, "who", who},         {kApi, 1, "asUser", who},
    {kApi, 1, "leave", leave},   {kApi, 1, "escape", escape},   {kApi, 1, "crash", crash},
    {kApi, 1, "finish", finish}, {kApi, 1, "fail", fail},       {kApi, 1, "silent", silent},
    {kApi, 1, "echo", echo},     {kApi, 1, "large", large},     {kApi, 1, "bytes", bytes},
    {kApi, 1, "slow", slow},     {kApi, 1, "later", later},     {kApi, 1, "refused", echo},
    {kApi, 1, "asAlice", who},   {kApi, 1, "apart", who},       {kApi, 1, "asRoot", who},
    {kApi, 1, "userSlow", slow}, {nullptr, 0, nullptr, nullptr}};
static QELO::_tag_API_CHECK_TABLE checks[] = {{kApi, 1, "refused", refuse, {nullptr, nullptr}},
                                              {nullptr, 0, nullptr, nullptr, {nullptr, nullptr}}};

PLUGIN_EXPORT QELO::_tag_API_TABLE* GetAPITable() {
  return table;
}
PLUGIN_EXPORT QELO::_tag_API_CHECK_TABLE* GetAPICheckTable() {
  return checks;
}
