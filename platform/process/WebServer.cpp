#include "webapi/platform/WebServer.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstring>
#include <stdexcept>
#include <string>

#include "platform/base/Paths.h"
#include "platform/settings/Settings.h"
#include "webapi/base/Log.h"
#include "webapi/base/Number.h"
#include "webapi/base/TextFile.h"

namespace qelow3 {

struct EnginePrivate {
  std::string pidFile;
  int signal;
};

namespace {

constexpr char kSource[] = "WebServer.cpp";

int restartSignal(const std::string& name) {
  if (name == "HUP") {
    return SIGHUP;
  }
  if (name == "USR1") {
    return SIGUSR1;
  }
  if (name == "USR2") {
    return SIGUSR2;
  }
  throw std::runtime_error("web_server_restart_signal is not HUP, USR1 or USR2");
}

/// The process that a pid file names. @return 0 when there is none, or others may write the file
pid_t readPid(const std::string& path) {
  constexpr size_t kLargest = 64;  // bytes
  QELO::UniqueFd file;
  struct stat info {};
  std::string text;
  if (QELO::OpenRegularFile(AT_FDCWD, path.c_str(), file, info) != 0 ||
      (info.st_uid != 0 && info.st_uid != geteuid()) || (info.st_mode & (S_IWGRP | S_IWOTH)) != 0 ||
      !QELO::ReadText(file.Get(), kLargest, text)) {
    return 0;
  }
  text.resize(text.find_last_not_of(" \n") + 1);
  pid_t pid = 0;
  return QELO::ParseNumber(text, pid) && pid > 1 ? pid : 0;
}

}  // namespace

Engine::Engine() {
  const QELO::Platform::Settings settings;
  const std::string pidFile = settings.Get("web_server_pid_file", "");
  if (pidFile.empty() || pidFile.front() != '/') {
    throw std::runtime_error("web_server_pid_file is not an absolute path");
  }
  const int signal = restartSignal(settings.Get("web_server_restart_signal", ""));
  private_ =
      std::make_shared<EnginePrivate>(EnginePrivate{QELO::Paths::kRootPrefix + pidFile, signal});
}

Engine::~Engine() = default;

ARDO::ARDO(const Engine& engine) : engine_(engine) {}

ARDO::~ARDO() = default;

bool ARDO::RestartService() {
  const EnginePrivate& settings = engine_.Settings();
  const pid_t pid = readPid(settings.pidFile);
  if (pid == 0) {
    WEBAPI_LOG(kSource, "no process in %s", settings.pidFile.c_str());
    return false;
  }
  if (kill(pid, settings.signal) != 0) {
    WEBAPI_LOG(kSource, "cannot signal the web server, process %d [%s]", pid, strerror(errno));
    return false;
  }
  return true;
}

}  // namespace qelow3
