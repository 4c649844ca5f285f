#include "calls/ReadExisting.h"

#include <string>

namespace files {

bool readExisting(const QELO::APIRequest& request, Existing& existing) {
  const auto word = request.GetAndCheckString("existing", QELO::APIRequest::PARAM_OPTIONAL);
  const std::string text = word.Get("refuse");
  existing = text == "replace" ? Existing::kReplace
             : text == "skip"  ? Existing::kSkip
                               : Existing::kRefuse;
  return !word.IsInvalid() && (existing != Existing::kRefuse || text == "refuse");
}

}  // namespace files
