// A check table that is easily searched wrongly. For "run" it has an entry without a function
// (version 1), two entries of which the first passes (version 2) and entries that differ from the
// call in one thing each (version 3); its terminating entry has a function, which refuses calls
// that have the parameter "refuse".
//
// Tests: CheckTableTest.cpp

#include "PluginTable.h"

static void run(QELO::APIRequest*, QELO::APIResponse* response) {
  response->SetSuccess("ran");
}

static void runNever(QELO::APIRequest*, QELO::APIResponse* response) {
  response->SetSuccess("ran the second of two entries");
}

static int pass(QELO::APIRequest*, QELO::APIResponse*) {
  return -1;
}

static int refuse(QELO::APIRequest*, QELO::APIResponse* response) {
  response->SetError(444);
  return 0;
}

static int refuseAtEnd(QELO::APIRequest* request, QELO::APIResponse* response) {
  response->SetError(445);
  return request->HasParam("refuse") ? 0 : 1;
}

PLUGIN_EXPORT QELO::_tag_API_TABLE* GetAPITable() {
  static QELO::_tag_API_TABLE table[] = {
      {"QELO.Test.Call", 1, "run", run},      {"QELO.Test.Call", 2, "run", run},
      {"QELO.Test.Call", 2, "run", runNever}, {"qelo.test.call", 3, "run", runNever},
      {"QELO.Test.Call", 3, "RUN", runNever}, {"QELO.Test.Call", 3, "run", run},
      {nullptr, 0, nullptr, nullptr}};
  return table;
}

PLUGIN_EXPORT QELO::_tag_API_CHECK_TABLE* GetAPICheckTable() {
  static QELO::_tag_API_CHECK_TABLE table[] = {
      {"QELO.Test.Call", 1, "run", nullptr, {nullptr, nullptr}},
      {"QELO.Test.Call", 1, "run", refuse, {nullptr, nullptr}},
      {"QELO.Test.Call", 2, "run", pass, {nullptr, nullptr}},
      {"QELO.Test.Call", 2, "run", refuse, {nullptr, nullptr}},
      {"qelo.test.call", 3, "run", refuse, {nullptr, nullptr}},
      {"QELO.Test.Cal", 3, "run", refuse, {nullptr, nullptr}},
      {"QELO.Test.Call", 3, "RUN", refuse, {nullptr, nullptr}},
      {"QELO.Test.Call", 3, "runs", refuse, {nullptr, nullptr}},
      {"QELO.Test.Call", 3, nullptr, refuse, {nullptr, nullptr}},
      {"QELO.Test.Call", 4, "run", refuse, {nullptr, nullptr}},
      {nullptr, 0, nullptr, refuseAtEnd, {nullptr, nullptr}}};
  return table;
}
