// A method that takes an upload and answers how large its files are.

#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>
#include <webapi/APITable.h>
#include <webapi/APIUpload.h>

static void put(QELO::APIRequest* request, QELO::APIResponse* response) {
  Json::Value data;
  for (const Json::Value& file : QELO::APIUpload(request).GetFiles()) {
    data["size"] = file["size"];
  }
  response->SetSuccess(data);
}

extern "C" __attribute__((visibility("default"))) QELO::_tag_API_TABLE* GetAPITable() {
  static QELO::_tag_API_TABLE table[] = {{"QELO.Bench.Upload", 1, "put", put},
                                         {nullptr, 0, nullptr, nullptr}};
  return table;
}
