// Overwrites its request's or response's record in place: the parameter "value" stands afterwards
// where the record has something of another type.
//
// Tests: RecordTest.cpp

#include "PluginTable.h"

static void body(QELO::APIRequest* request, QELO::APIResponse* response) {
  response->SetSuccess();
  response->Serialize()["body"] = request->GetParam("value");
}

static void response(QELO::APIRequest* request, QELO::APIResponse* response) {
  response->SetSuccess();
  response->Serialize() = request->GetParam("value");
}

static void call(QELO::APIRequest* request, QELO::APIResponse* response) {
  request->Serialize()["private"] = request->GetParam("value");
  response->SetSuccess();
}

static void params(QELO::APIRequest* request, QELO::APIResponse* response) {
  request->Serialize()["param"] = request->GetParam("value");
  response->SetSuccess();
}

static void request(QELO::APIRequest* request, QELO::APIResponse* response) {
  const Json::Value value = request->GetParam("value");
  request->Serialize() = value;
  response->SetSuccess();
}

#define BOTH_VERSIONS(method)                   \
  {"QELO.Test.Mangling", 1, #method, method}, { \
    "QELO.Test.Mangling", 2, #method, method    \
  }

PLUGIN_EXPORT QELO::_tag_API_TABLE* GetAPITable() {
  static QELO::_tag_API_TABLE table[] = {BOTH_VERSIONS(body),    BOTH_VERSIONS(response),
                                         BOTH_VERSIONS(call),    BOTH_VERSIONS(params),
                                         BOTH_VERSIONS(request), {nullptr, 0, nullptr, nullptr}};
  return table;
}
