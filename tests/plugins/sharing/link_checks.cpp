// A sharing check library: its check does what the parameter "check" says, right or wrong.
//
// Tests: ApplicationTest.cpp, LibraryTest.cpp, SharingCheckerTest.cpp, sharing.py

#include <unistd.h>

#include <cstdio>
#include <iostream>
#include <stdexcept>

#include "../PluginTable.h"

/// Leaves the ids that it ran with, and how often it was asked, in attributes of the request.
static bool check(QELO::APIRequest* request, QELO::APIResponse* response) {
  static int asked = 0;
  request->SetAttr("asked", ++asked);
  request->SetAttr("euid", static_cast<int>(geteuid()));
  request->SetAttr("egid", static_cast<int>(getegid()));
  const std::string told = request->GetParam("check", "").asString();
  if (told == "throw") {
    throw std::runtime_error("no check today");
  }
  if (told == "print") {
    std::cout << "printed" << std::flush;
    printf("printed");
    fflush(stdout);
  }
  if (told == "wander") {
    [[maybe_unused]] const int result = chdir("/");
  }
  if (told == "answer") {
    response->SetError(499);
  }
  return told != "refuse" && told != "answer";
}

PLUGIN_EXPORT QELO::_tag_API_SHARING_CHECK_TABLE* GetAPISharingCheckTable() {
  static QELO::_tag_API_SHARING_CHECK_TABLE table[] = {
      {"^QELO[.]Test[.]Good$", 7, "*", nullptr},
      {"^QELO[.]Test[.]Good$", 0, "silent", nullptr},
      {"^QELO[.]Test[.](Good|Open)$", 1, "^(echo|whoami|asRoot)$", check},
      {nullptr, 0, nullptr, nullptr}};
  return table;
}
