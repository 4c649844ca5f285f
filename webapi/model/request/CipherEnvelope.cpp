#include "webapi/model/request/CipherEnvelope.h"

#include <cstring>

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

bool openText(std::string text, Json::Value& section, std::string* opened) {
  if (QeloCgiDecryptParam(text.data()) == 0) {
    return false;
  }
  text.resize(strlen(text.c_str()));
  const bool isAdded = addLine(text, section);
  if (opened != nullptr) {
    opened->swap(text);
  }
  return isAdded;
}

bool openAes(Json::Value& section, std::string* opened) {
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
  if (!CredRequestUtil::GetDecryptAESString(key, text, plain)) {
    return false;
  }
  const bool isAdded = addLine(plain, section);
  if (opened != nullptr) {
    opened->swap(plain);
  }
  return isAdded;
}

}  // namespace QELO::CipherEnvelope
