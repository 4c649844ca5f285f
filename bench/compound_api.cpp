// The API library that compound_bench calls: a method that does nothing, and one that takes 50 ms.

#include <unistd.h>
#include <webapi/APIResponse.h>
#include <webapi/APITable.h>

static void nothing(QELO::APIRequest*, QELO::APIResponse* response) {
  response->SetSuccess();
}

static void slow(QELO::APIRequest*, QELO::APIResponse* response) {
  usleep(50'000);
  response->SetSuccess();
}

extern "C" __attribute__((visibility("default"))) QELO::_tag_API_TABLE* GetAPITable() {
  static QELO::_tag_API_TABLE table[] = {{"QELO.Bench.Compound", 1, "nothing", nothing},
                                         {"QELO.Bench.Compound", 1, "slow", slow},
                                         {"QELO.Bench.Compound", 2, "nothing", nothing},
                                         {nullptr, 0, nullptr, nullptr}};
  return table;
}
