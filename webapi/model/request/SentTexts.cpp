#include "webapi/model/request/SentTexts.h"

#include <utility>

#include "webapi/platform/WebAPIUtil.h"

namespace QELO {

void SentTexts::AddLine(std::string&& line) {
  for (std::string& kept : lines_) {
    if (kept.empty()) {
      kept = std::move(line);
      return;
    }
  }
  Json::Value texts(Json::objectValue);
  WebAPIUtil::strPairToJsonObj(line, texts, true, false);
  AddTexts(std::move(texts));
}

void SentTexts::AddTexts(Json::Value&& texts) {
  if (!texts_.isObject()) {
    texts_ = Json::Value(Json::objectValue);
  }
  for (auto it = texts.begin(); texts.isObject() && it != texts.end(); ++it) {
    texts_[it.name()].swap(*it);
  }
}

Json::Value SentTexts::Read() const {
  Json::Value all(Json::objectValue);
  for (const std::string& line : lines_) {
    WebAPIUtil::strPairToJsonObj(line, all, true, false);
  }
  for (auto it = texts_.begin(); texts_.isObject() && it != texts_.end(); ++it) {
    all[it.name()] = *it;
  }
  return all;
}

void SentTexts::Forget() {
  for (std::string& kept : lines_) {
    std::string().swap(kept);
  }
  texts_ = Json::Value();
}

}  // namespace QELO
