// Leaves work for after the answer: a second later a callback marks the file that the parameter
// "mark" names. The client must not wait for it.
//
// Tests: test_callbacks.py

#include <unistd.h>

#include <fstream>
#include <iostream>
#include <string>

#include "PluginTable.h"

static std::string markPath;

static void workLate(void* argument) {
  std::cout << "late" << std::endl;
  sleep(1);
  std::ofstream(markPath, std::ios::app) << static_cast<const char*>(argument) << getpid() << "\n";
}

static void run(QELO::APIRequest* request, QELO::APIResponse* response) {
  static char first[] = "first ";
  static char second[] = "second ";
  markPath = request->GetAndCheckString("mark").Get();
  response->SetCallbackFunc(workLate, first);
  response->SetCallbackFunc(workLate, second);
  response->SetSuccess(getpid());
}

PLUGIN_EXPORT QELO::_tag_API_TABLE* GetAPITable() {
  static QELO::_tag_API_TABLE table[] = {{"QELO.Test.Call", 1, "run", run},
                                         {nullptr, 0, nullptr, nullptr}};
  return table;
}
