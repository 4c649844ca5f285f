// Well-behaved methods for compound requests to call. Versions 1 and 2 are the same, so that a
// description can give them different attributes.
//
// Tests: CompoundHandlerTest.cpp, test_compound.py

#include <fcntl.h>
#include <unistd.h>

#include <string>

#include "PluginTable.h"

/// Answers the parameters.
static void echo(QELO::APIRequest* request, QELO::APIResponse* response) {
  response->SetSuccess(request->GetParam(""));
}

/// Answers the process and what the request says of its origin.
static void process(QELO::APIRequest* request, QELO::APIResponse* response) {
  Json::Value data;
  data["pid"] = getpid();
  data["requestMethod"] = request->GetEnv("REQUEST_METHOD");
  data["hasQuery"] = request->HasEnv("QUERY_STRING");
  data["user"] = request->GetLoginUserName();
  response->SetSuccess(data);
}

/// Answers the error "code", with the server error "word" if given.
static void fail(QELO::APIRequest* request, QELO::APIResponse* response) {
  if (request->HasParam("word")) {
    response->SetServerError(request->GetParam("word").asString());
  }
  response->SetError(request->GetParam("code", 400).asInt());
}

/// Answers a text of "size" bytes.
static void large(QELO::APIRequest* request, QELO::APIResponse* response) {
  response->SetSuccess(std::string(request->GetParam("size").asUInt(), 'x'));
}

/// Answers that many "levels" of lists, one within the other.
static void deep(QELO::APIRequest* request, QELO::APIResponse* response) {
  Json::Value data(Json::arrayValue);
  for (unsigned level = request->GetParam("levels").asUInt(); level > 1; --level) {
    Json::Value outer;
    outer[0].swap(data);
    data.swap(outer);
  }
  response->SetSuccess(data);
}

/// Takes "ms" milliseconds.
static void slow(QELO::APIRequest* request, QELO::APIResponse* response) {
  usleep(request->GetParam("ms").asUInt() * 1000);
  response->SetSuccess();
}

static void restart(QELO::APIRequest*, QELO::APIResponse* response) {
  response->SetHttpdRestart(true);
  response->SetSuccess();
}

/// Sets the header "X-Mark".
static void mark(QELO::APIRequest*, QELO::APIResponse* response) {
  response->SetHeader("X-Mark", "set");
  response->SetSuccess();
}

/// Answers what it finds set in the response.
static void found(QELO::APIRequest*, QELO::APIResponse* response) {
  Json::Value data;
  data["serverError"] = response->GetServerError();
  data["mark"] = response->GetHeader("X-Mark", "");
  data["restart"] = response->GetHttpdRestart();
  response->SetSuccess(data);
}

/// Answers how many descriptors its process has open.
static void descriptors(QELO::APIRequest*, QELO::APIResponse* response) {
  int count = 0;
  for (int fd = 0; fd < 4096; ++fd) {
    count += fcntl(fd, F_GETFD) >= 0 ? 1 : 0;
  }
  response->SetSuccess(count);
}

/// Answers attributes and the session's state of the request.
static void forged(QELO::APIRequest* request, QELO::APIResponse* response) {
  Json::Value data;
  data["mark"] = request->GetAttr("mark");
  data["isTimeout"] = request->IsTimeout();
  response->SetSuccess(data);
}

static void silent(QELO::APIRequest*, QELO::APIResponse*) {}

namespace {
struct Callback {
  std::string file;
  unsigned milliseconds;
};
}  // namespace

/// Adds a line to the file at the end of the time.
static void leaveTrace(void* argument) {
  const auto* callback = static_cast<const Callback*>(argument);
  usleep(callback->milliseconds * 1000);
  const int fd = open(callback->file.c_str(), O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0666);
  [[maybe_unused]] const ssize_t count = write(fd, "ran\n", 4);
  close(fd);
}

/// Registers a callback that takes "ms" milliseconds and then adds a line to "file".
static void later(QELO::APIRequest* request, QELO::APIResponse* response) {
  static Callback callback;
  callback = {request->GetParam("file").asString(), request->GetParam("ms", 0).asUInt()};
  response->SetCallbackFunc(leaveTrace, &callback);
  response->SetSuccess();
}

/// Refuses "refused" without an error of its own.
static int check(QELO::APIRequest*, QELO::APIResponse*) {
  return 0;
}

#define BOTH_VERSIONS(method)                  \
  {"QELO.Test.Entries", 1, #method, method}, { \
    "QELO.Test.Entries", 2, #method, method    \
  }

PLUGIN_EXPORT QELO::_tag_API_TABLE* GetAPITable() {
  static QELO::_tag_API_TABLE table[] = {BOTH_VERSIONS(echo),
                                         BOTH_VERSIONS(process),
                                         BOTH_VERSIONS(fail),
                                         BOTH_VERSIONS(large),
                                         BOTH_VERSIONS(deep),
                                         BOTH_VERSIONS(mark),
                                         BOTH_VERSIONS(found),
                                         BOTH_VERSIONS(forged),
                                         BOTH_VERSIONS(descriptors),
                                         BOTH_VERSIONS(slow),
                                         BOTH_VERSIONS(restart),
                                         BOTH_VERSIONS(silent),
                                         BOTH_VERSIONS(later),
                                         {"QELO.Test.Entries", 1, "refused", echo},
                                         {"QELO.Test.Entries", 2, "refused", echo},
                                         {nullptr, 0, nullptr, nullptr}};
  return table;
}

PLUGIN_EXPORT QELO::_tag_API_CHECK_TABLE* GetAPICheckTable() {
  static QELO::_tag_API_CHECK_TABLE table[] = {{"QELO.Test.Entries", 1, "refused", check, {}},
                                               {"QELO.Test.Entries", 2, "refused", check, {}},
                                               {nullptr, 0, nullptr, nullptr, {}}};
  return table;
}
