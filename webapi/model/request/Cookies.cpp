#include <string_view>

#include "webapi/JsonHelper.h"
#include "webapi/model/request/APIRequestPrivate.h"
#include "webapi/platform/WebAPIUtil.h"

namespace QELO {

void APIRequestPrivate::InitCookie() {
  const Json::Value* header = Find("environ", "HTTP_COOKIE");
  Json::Value* cookies = FindSection("cookie");
  const char* begin = nullptr;
  const char* end = nullptr;
  if (header == nullptr || !header->getString(&begin, &end) || cookies == nullptr) {
    return;
  }
  const Json::Value pieces = WebAPIUtil::ParseToArray(begin, ";");
  for (const Json::Value& piece : pieces) {
    piece.getString(&begin, &end);
    const std::string_view text(begin, static_cast<size_t>(end - begin));
    const size_t equals = text.find('=');
    if (equals != std::string_view::npos) {
      const std::string value(text.substr(equals + 1));
      *cookies->demand(begin, begin + equals) = WebAPIUtil::URLDecode(value, true);
    }
  }
}

}  // namespace QELO
