#include "webapi/base/DescriptionFile.h"

#include <string_view>

namespace QELO {
namespace {

constexpr int kMaxCandidates = 4;

/// Nothing that leads out of the directory, and nothing that ends a path before its suffix.
bool isFileName(const std::string& api) {
  return api.find_first_of(std::string_view("/\0", 2)) == std::string::npos;
}

}  // namespace

std::string DescriptionFile(const std::string& api,
                            const std::function<bool(const std::string& file)>& exists) {
  std::string found;
  size_t dot = api.find('.');
  for (int candidate = 0; candidate < kMaxCandidates && isFileName(api); ++candidate) {
    dot = dot == std::string::npos ? dot : api.find('.', dot + 1);
    const std::string file = api.substr(0, dot) + ".lib";
    if (exists(file)) {
      found = file;
    }
    if (dot == std::string::npos) {
      break;
    }
  }
  return found;
}

}  // namespace QELO
