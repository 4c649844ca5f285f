// Sends the file that the parameter "path" names.

#include <webapi/APIDownload.h>
#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>
#include <webapi/APITable.h>

static void get(QELO::APIRequest* request, QELO::APIResponse* response) {
  if (QELO::APIDownload(response).Output(request->GetParam("path", "").asString()) == 0) {
    response->SetSuccess();
  }
}

extern "C" __attribute__((visibility("default"))) QELO::_tag_API_TABLE* GetAPITable() {
  static QELO::_tag_API_TABLE table[] = {{"QELO.Bench.Download", 1, "get", get},
                                         {nullptr, 0, nullptr, nullptr}};
  return table;
}
