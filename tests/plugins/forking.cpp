// Goes on in a process of its own making, for as many seconds as the parameter "seconds" says,
// while its method answers. Whether the client waits depends on what that process has kept.
//
// Tests: test_own_processes.py

#include <fcntl.h>
#include <unistd.h>
#include <webapi/JsonHelper.h>

#include <cstdlib>
#include <string>

#include "PluginTable.h"

static unsigned secondsOf(const QELO::APIRequest& request) {
  return static_cast<unsigned>(QELO::JsonHelper::asInt(request.GetParam("seconds")));
}

/// A process that keeps all it has got.
static void keeping(QELO::APIRequest* request, QELO::APIResponse* response) {
  if (fork() == 0) {
    sleep(secondsOf(*request));
    _exit(0);
  }
  response->SetSuccess();
}

/// A process that lets go of everything.
static void lettingGo(QELO::APIRequest* request, QELO::APIResponse* response) {
  if (fork() == 0) {
    const int null = open("/dev/null", O_RDWR);
    for (int descriptor = 0; descriptor < 3; ++descriptor) {
      dup2(null, descriptor);
    }
    close_range(3, ~0U, 0);
    sleep(secondsOf(*request));
    _exit(0);
  }
  response->SetSuccess();
}

/// A program in the background.
static void program(QELO::APIRequest* request, QELO::APIResponse* response) {
  const std::string command = "sleep " + std::to_string(secondsOf(*request)) + " &";
  [[maybe_unused]] const int status = std::system(command.c_str());
  response->SetSuccess();
}

PLUGIN_EXPORT QELO::_tag_API_TABLE* GetAPITable() {
  static QELO::_tag_API_TABLE table[] = {{"QELO.Test.Forking", 1, "keeping", keeping},
                                         {"QELO.Test.Forking", 1, "lettingGo", lettingGo},
                                         {"QELO.Test.Forking", 1, "program", program},
                                         {nullptr, 0, nullptr, nullptr}};
  return table;
}
