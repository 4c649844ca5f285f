#include "webapi/JsonHelper.h"
#include "webapi/model/APIRequestPrivate.h"
#include "webapi/platform/Cgi.h"
#include "webapi/platform/Credential.h"
#include "webapi/platform/Token.h"
#include "webapi/platform/WebAPIUtil.h"

namespace QELO {
namespace {

constexpr char kCipherText[] = "__cIpHeRtExT";
constexpr char kAesToken[] = "__nEkOtReHpIc";
constexpr char kAesText[] = "__tXeTrEhPiC";
constexpr int kAesKeySize = 33;  // with its NUL

/// The member's text; the member is removed.
std::string take(Json::Value& section, const char* key) {
  Json::Value value;
  section.removeMember(key, &value);
  return JsonHelper::asString(value);
}

/// Undoes the envelope of the platform's own cipher on one level.
bool decryptCipherText(Json::Value& section) {
  std::string text = take(section, kCipherText);
  // The text ends at its first NUL, before and after.
  return QeloCgiDecryptParam(text.data()) != 0 &&
         WebAPIUtil::strPairToJsonObj(text.c_str(), section, true, true);
}

}  // namespace

bool APIRequestPrivate::DecryptParam(Json::Value& section) {
  Json::Value* level = &section;
  while (true) {
    if (JsonHelper::hasMember(*level, kCipherText) && !decryptCipherText(*level)) {
      return false;
    }
    if (!level->empty() && !DecryptAESParam(*level)) {
      return false;
    }
    if (!JsonHelper::hasMember(*level, "webapi")) {
      return true;
    }
    level = &(*level)["webapi"];
  }
}

bool APIRequestPrivate::DecryptAESParam(Json::Value& section) {
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
  return CredRequestUtil::GetDecryptAESString(key, text, plain) &&
         WebAPIUtil::strPairToJsonObj(plain, section, true, true);
}

}  // namespace QELO
