#include "webapi/JsonHelper.h"
#include "webapi/model/request/APIRequestPrivate.h"
#include "webapi/model/request/CipherEnvelope.h"

namespace QELO {

bool APIRequestPrivate::DecryptParam(Json::Value& section) {
  Json::Value* level = &section;
  while (true) {
    if (JsonHelper::hasMember(*level, CipherEnvelope::kCipherText) &&
        !CipherEnvelope::openText(CipherEnvelope::take(*level, CipherEnvelope::kCipherText),
                                  *level)) {
      return false;
    }
    if (level->size() != 0 && !DecryptAESParam(*level)) {
      return false;
    }
    if (!JsonHelper::hasMember(*level, "webapi")) {
      return true;
    }
    level = &(*level)["webapi"];
  }
}

bool APIRequestPrivate::DecryptAESParam(Json::Value& section) {
  return CipherEnvelope::openAes(section);
}

}  // namespace QELO
