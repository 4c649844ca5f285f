// Reads standard input, where the request's body may still wait, in every way there is, and answers
// what it got.
//
// Tests: ExecutionTest.cpp, test_faulty_libraries.py

#include <unistd.h>

#include <cstdio>
#include <iostream>
#include <string>

#include "PluginTable.h"

static void run(QELO::APIRequest*, QELO::APIResponse* response) {
  Json::Value data;
  std::string text;
  std::cin >> text;
  data["stream"] = text;
  char buffer[64] = {};
  data["file"] = static_cast<int>(std::fread(buffer, 1, sizeof buffer - 1, stdin));
  data["descriptor"] = static_cast<int>(read(STDIN_FILENO, buffer, sizeof buffer - 1));
  response->SetSuccess(data);
}

PLUGIN_EXPORT QELO::_tag_API_TABLE* GetAPITable() {
  static QELO::_tag_API_TABLE table[] = {{"QELO.Test.Call", 1, "run", run},
                                         {nullptr, 0, nullptr, nullptr}};
  return table;
}
