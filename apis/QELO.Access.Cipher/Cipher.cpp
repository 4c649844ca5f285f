// QELO.Access.Cipher: what clients need to encipher parameters.

#include <time.h>
#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>
#include <webapi/APITable.h>
#include <webapi/CipherKey.h>

#include <string>

namespace {

using QELO::APIRequest;
using QELO::APIResponse;

constexpr int kNoKey = 400;

void Get(APIRequest*, APIResponse* response) {
  std::string key;
  if (!QELO::CipherKey::GetPublic(key)) {
    response->SetError(kNoKey);
    return;
  }
  Json::Value data(Json::objectValue);
  data["key"] = key;
  data["alg"] = "RSA-OAEP-256";
  data["enc"] = "A256CBC-HS512";
  data["time"] = static_cast<Json::Int64>(time(nullptr));
  response->SetSuccess(data);
}

QELO::_tag_API_TABLE table[] = {
    {"QELO.Access.Cipher", 1, "get", Get},
    {nullptr, 0, nullptr, nullptr},
};

}  // namespace

extern "C" WEBAPI_API QELO::_tag_API_TABLE* GetAPITable() {
  return table;
}
