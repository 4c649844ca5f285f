// Prints to standard output, where the answer goes, in every way there is: while it is loaded, in
// its method and when it is closed.
//
// Tests: ExecutionTest.cpp, PreloadTest.cpp, test_faulty_libraries.py

#include <unistd.h>

#include <cstdio>
#include <iostream>

#include "PluginTable.h"

static void print() {
  std::cout << "<C++ stream>";
  std::printf("<C stream>");
  [[maybe_unused]] const ssize_t count = write(STDOUT_FILENO, "<descriptor>", 12);
}

static void run(QELO::APIRequest*, QELO::APIResponse* response) {
  print();
  response->SetSuccess("printed");
}

namespace {
struct Printer {
  Printer() { print(); }
  ~Printer() { print(); }
} printer;
}  // namespace

PLUGIN_EXPORT QELO::_tag_API_TABLE* GetAPITable() {
  static QELO::_tag_API_TABLE table[] = {{"QELO.Test.Call", 1, "run", run},
                                         {nullptr, 0, nullptr, nullptr}};
  return table;
}
