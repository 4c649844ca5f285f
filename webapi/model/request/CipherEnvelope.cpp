#include "webapi/model/request/CipherEnvelope.h"

#include "webapi/JsonHelper.h"
#include "webapi/platform/Cgi.h"
#include "webapi/platform/Credential.h"
#include "webapi/platform/Token.h"
#include "webapi/platform/WebAPIUtil.h"

namespace QELO::CipherEnvelope {
namespace {

constexpr char kAesToken[] = "__nEkOtReHpIc";
constexpr char kAesText[] = "__tXeTrEhPiC";
constexpr int kAesKeySize = 33;  // bytes of the key's text with its NUL

}  // namespace

std::string take(Json::Value& section, const char* name) {
  Json::Value value;
  section.removeMember(name, &value);
  return JsonHelper::asString(value);
}

bool addLine(const std::string& line, Json::Value& section) {
  return WebAPIUtil::strPairToJsonObj(line, section, true, true);
}

bool openText(std::string text, Json::Value& section) {
  return QeloCgiDecryptParam(text.data()) != 0 && addLine(text.c_str(), section);
}

bool openAes(Json::Value& section) {
  if (!JsonHelper::hasMember(section, kAesToken) || !JsonHelper::hasMember(section, kAesText)) {
    return true;
  }
  const std::string token = take(section, kAesToken);
  const std::string text = take(section, kAesText);
  if (token.empty() || text.empty()) {
    return false;
  }
  char key[kAesKeySize] = {};
  if (QELOCloudServiceZttokenGenerateToken(token.c_str(), key, kAesKeySize) < 0) {
    return false;
  }
  std::string plain;
  return CredRequestUtil::GetDecryptAESString(key, text, plain) && addLine(plain, section);
}

}  // namespace QELO::CipherEnvelope
