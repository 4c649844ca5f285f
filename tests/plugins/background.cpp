// A method that goes on in the background, as its parameters ask: results, a crash, an exception, a
// fork of its own. One function serves several methods, which their description gives different
// credentials.
//
// Tests: test_task_start.py, QELO.Test.Background.lib

#include <signal.h>
#include <unistd.h>
#include <webapi/APIPolling.h>
#include <webapi/JsonHelper.h>

#include <cstdio>
#include <string>

#include "PluginTable.h"

using QELO::APIPolling;
using QELO::APIRequest;
using QELO::APIResponse;
using QELO::JsonHelper::asBool;
using QELO::JsonHelper::asInt;
using QELO::JsonHelper::asString;

static void tell(APIResponse* response, int step) {
  Json::Value data;
  data["pid"] = getpid();
  data["uid"] = getuid();
  data["step"] = step;
  response->SetSuccess(data);
}

/// With a stream that the method had opened it writes to that first, more than a page.
///
/// "silent" tenths of a second without a result, then "steps" results, "pause" milliseconds each.
static void work(APIRequest* request, APIResponse* response, void* stream) {
  if (stream != nullptr) {
    fputs(std::string(8192, 'x').c_str(), static_cast<FILE*>(stream));
    fflush(static_cast<FILE*>(stream));
  }
  usleep(static_cast<useconds_t>(asInt(request->GetParam("silent"))) * 100000);
  const int steps = asInt(request->GetParam("steps"), 1);
  for (int step = 1; step <= steps; ++step) {
    tell(response, step);
    usleep(static_cast<useconds_t>(asInt(request->GetParam("pause"))) * 1000);
  }
}

static void start(APIRequest* request, APIResponse* response) {
  APIPolling polling(request);
  polling.SetPrefixAttr(asString(request->GetParam("prefix")));
  polling.SetRemoveAttr(!asBool(request->GetParam("keep"), true));
  if (!polling.SetGroupAttr(asString(request->GetParam("group")))) {
    response->SetError(105);
    return;
  }
  // Opened before the task store is, so that its number is the lower one.
  FILE* stream = asBool(request->GetParam("stream")) ? popen("cat > /dev/null", "w") : nullptr;
  polling.Start(response, work, stream);
  if (asBool(request->GetParam("die"))) {
    kill(getpid(), SIGKILL);
  }
}

static QELO::_tag_API_TABLE table[] = {{"QELO.Test.Background", 1, "start", start},
                                       {"QELO.Test.Background", 1, "asUser", start},
                                       {"QELO.Test.Background", 1, "asRoot", start},
                                       {nullptr, 0, nullptr, nullptr}};

PLUGIN_EXPORT QELO::_tag_API_TABLE* GetAPITable() {
  return table;
}
