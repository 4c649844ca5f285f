// A background task that the test leads while it watches: it sets the results that its parameters
// list, and before each but the first waits for a file that the test makes.
//
// Tests: exec_follow.py

#include <unistd.h>
#include <webapi/APIPolling.h>
#include <webapi/JsonHelper.h>

#include <string>

#include "PluginTable.h"

using QELO::APIPolling;
using QELO::APIRequest;
using QELO::APIResponse;
using QELO::JsonHelper::asBool;
using QELO::JsonHelper::asInt;
using QELO::JsonHelper::asString;
using QELO::JsonHelper::member;

/// Waits for the file, a minute at the longest: a test that failed leaves nothing behind.
static void waitFor(const std::string& file) {
  for (int i = 0; i < 12000 && access(file.c_str(), F_OK) != 0; ++i) {
    usleep(5000);
  }
}

/// "results": a list of {"data"}, which get the process id, and of {"code", "errors"}; "gates": the
/// directory of the files "1", "2" and so on. The task ends behind the last file.
static void work(APIRequest* request, APIResponse* response, void*) {
  const Json::Value results = request->GetParam("results");
  const std::string gates = asString(request->GetParam("gates"));
  for (Json::ArrayIndex i = 0; i < results.size(); ++i) {
    Json::Value data = member(results[i], "data");
    if (data.isObject()) {
      data["pid"] = getpid();
      response->SetSuccess(data);
    } else {
      response->SetError(asInt(member(results[i], "code")), member(results[i], "errors"));
    }
    waitFor(gates + "/" + std::to_string(i + 1));
  }
}

static void start(APIRequest* request, APIResponse* response) {
  APIPolling polling(request);
  polling.SetRemoveAttr(!asBool(request->GetParam("keep"), true));
  polling.Start(response, work, nullptr);
}

static QELO::_tag_API_TABLE table[] = {{"QELO.Test.Following", 1, "start", start},
                                       {nullptr, 0, nullptr, nullptr}};

PLUGIN_EXPORT QELO::_tag_API_TABLE* GetAPITable() {
  return table;
}
