#include "webapi/batch/compound/EntryLimit.h"

#include <algorithm>

#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/APIRunner.h"
#include "webapi/JsonHelper.h"
#include "webapi/platform/Core.h"

namespace QELO::EntryLimit {
namespace {

constexpr char kMark[] = "compoundEntries";

/// @return null when the request is none within another
const Json::Value& markOf(APIRequest& request) {
  return JsonHelper::member(JsonHelper::member(request.Serialize(), "private"), kMark);
}

unsigned asCount(int number) {
  return static_cast<unsigned>(std::max(number, 0));
}

bool isLoggedIn(const APIRequest& request) {
  return request.IsAuthorized() && !request.GetLoginUserName().empty();
}

}  // namespace

unsigned Most(APIRequest& request) {
  const Json::Value& mark = markOf(request);
  return asCount(mark.isNull()
                     ? std::max(QLIBCConfGetCompoundEntries(0), QLIBCConfGetCompoundEntries(1))
                     : JsonHelper::asInt(mark));
}

unsigned Count(const Json::Value& list, unsigned most) {
  unsigned count = 0;
  if (!list.isArray() && !list.isObject()) {
    return 0;
  }
  for (const Json::Value& entry : list) {
    if (++count > most) {
      break;
    }
    count += Count(JsonHelper::member(entry, "compound"), most - count);
  }
  return count;
}

bool AllowsCaller(APIRequest& request, unsigned entries, APIRunner& runner) {
  if (!markOf(request).isNull() || entries <= asCount(QLIBCConfGetCompoundEntries(0)) ||
      isLoggedIn(request)) {
    return true;
  }
  // Asked with a copy: what the check says of the outer call is no answer to anybody.
  APIRequest asked(request);
  APIResponse answer(&asked);
  runner.CheckPermission(&asked, &answer);
  return isLoggedIn(asked);
}

void Mark(APIRequest& entry, unsigned most) {
  const unsigned within = Count(entry.GetParamRef("compound", Json::Value::nullSingleton()), most);
  entry.Serialize()["private"][kMark] = within;
}

}  // namespace QELO::EntryLimit
