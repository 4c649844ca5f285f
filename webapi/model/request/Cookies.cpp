#include "webapi/JsonHelper.h"
#include "webapi/model/request/APIRequestPrivate.h"
#include "webapi/platform/WebAPIUtil.h"

namespace QELO {

void APIRequestPrivate::InitCookie() {
  const Json::Value& header = GetData("environ", "HTTP_COOKIE", Json::Value::nullSingleton());
  Json::Value* cookies = FindSection("cookie");
  if (!header.isString() || cookies == nullptr) {
    return;
  }
  for (const Json::Value& piece : WebAPIUtil::ParseToArray(header.asCString(), ";")) {
    const std::string text = JsonHelper::asString(piece);
    const size_t equals = text.find('=');
    if (equals != std::string::npos) {
      (*cookies)[text.substr(0, equals)] = WebAPIUtil::URLDecode(text.substr(equals + 1), true);
    }
  }
}

}  // namespace QELO
