#include "tests/harness/Tables.h"

#include <unistd.h>

#include <vector>

#include "webapi/APIRequest.h"
#include "webapi/APITable.h"

/// The API's, which a test program need not have.
extern "C" QELO::_tag_API_TABLE* GetAPITable() __attribute__((weak));

namespace QELO {
namespace {

/// The entries as the library has them.
std::vector<_tag_API_TABLE>& originals() {
  static std::vector<_tag_API_TABLE> entries;
  return entries;
}

void call(APIRequest* request, APIResponse* response) {
  for (const _tag_API_TABLE& entry : originals()) {
    if (request->GetAPIClass() == entry.api && request->GetAPIVersion() == entry.version &&
        request->GetAPIMethod() == entry.method) {
      Tables::Run() = {true, geteuid(), getegid()};
      entry.function(request, response);
      return;
    }
  }
}

}  // namespace

Tables::Tables() {
  Run() = {};
  originals().clear();
  _tag_API_TABLE* entry = GetAPITable != nullptr ? GetAPITable() : nullptr;
  for (; entry != nullptr && entry->api != nullptr; ++entry) {
    originals().push_back(*entry);
    entry->function = entry->function != nullptr ? call : nullptr;
  }
}

Tables::~Tables() {
  _tag_API_TABLE* entry = GetAPITable != nullptr ? GetAPITable() : nullptr;
  for (const _tag_API_TABLE& original : originals()) {
    (entry++)->function = original.function;
  }
}

Tables::Seen& Tables::Run() {
  static Seen seen{};
  return seen;
}

}  // namespace QELO
