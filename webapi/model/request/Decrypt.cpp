#include <utility>

#include "webapi/JsonHelper.h"
#include "webapi/model/request/APIRequestPrivate.h"
#include "webapi/model/request/CipherEnvelope.h"

namespace QELO {

bool APIRequestPrivate::DecryptParam(Json::Value& section) {
  Json::Value* level = &section;
  std::string opened;
  while (true) {
    if (JsonHelper::hasMember(*level, CipherEnvelope::kCipherText) &&
        !CipherEnvelope::openText(CipherEnvelope::take(*level, CipherEnvelope::kCipherText), *level,
                                  &opened)) {
      return false;
    }
    Keep(level == &section, opened);
    if (level->size() != 0 && !CipherEnvelope::openAes(*level, &opened)) {
      return false;
    }
    Keep(level == &section, opened);
    if (!JsonHelper::hasMember(*level, "webapi")) {
      return true;
    }
    level = &(*level)["webapi"];
  }
}

/// Of parameters alone; what is opened within "webapi" is a part of that one.
void APIRequestPrivate::Keep(bool isOfParameters, std::string& opened) {
  if (isOfParameters && !opened.empty()) {
    sent_.AddLine(std::move(opened));
  }
  opened.clear();
}

bool APIRequestPrivate::DecryptAESParam(Json::Value& section) {
  return CipherEnvelope::openAes(section);
}

}  // namespace QELO
