#include "webapi/platform/StringHash.h"

#include <map>
#include <new>
#include <string>
#include <utility>

#include "platform/parameters/JsonText.h"
#include "webapi/platform/WebAPIUtil.h"

struct QLIBSZHASH {
  std::map<std::string, std::string, std::less<>> values;
};

extern "C" {

QLIBSZHASH* QLIBCSzHashAlloc(int) {
  return new (std::nothrow) QLIBSZHASH;
}

void QLIBCSzHashFree(QLIBSZHASH* hash) {
  delete hash;
}

void QLIBCHashRemoveAll(QLIBSZHASH* hash) {
  if (hash != nullptr) {
    hash->values.clear();
  }
}

int QLIBCSzHashSetValue(QLIBSZHASH** hash, const char* name, const char* value) {
  if (*hash == nullptr) {
    *hash = QLIBCSzHashAlloc(0);
  }
  if (*hash == nullptr) {
    return -1;
  }
  try {
    (*hash)->values.insert_or_assign(name, value);
    return 0;
  } catch (const std::bad_alloc&) {
    return -1;
  }
}

const char* QLIBCSzHashGetValue(const QLIBSZHASH* hash, const char* name) {
  if (hash == nullptr) {
    return nullptr;
  }
  const auto found = hash->values.find(name);
  return found == hash->values.end() ? nullptr : found->second.c_str();
}

const char* QLIBCSzHashNext(const QLIBSZHASH* hash, const char* name, const char** value) {
  if (hash == nullptr) {
    return nullptr;
  }
  const auto next = name == nullptr ? hash->values.begin() : hash->values.upper_bound(name);
  if (next == hash->values.end()) {
    return nullptr;
  }
  if (value != nullptr) {
    *value = next->second.c_str();
  }
  return next->first.c_str();
}

}  // extern "C"

namespace QELO::WebAPIUtil {
namespace {

/// @return false when there are more values than are left
bool read(const std::string& text, Json::Value& value, size_t& valuesLeft) {
  const Platform::JsonText found = Platform::readJsonText(text, value, valuesLeft);
  if (found != Platform::JsonText::kOther) {
    return found == Platform::JsonText::kValue;
  }
  if (valuesLeft == 0) {
    return false;
  }
  --valuesLeft;
  value = Json::Value(text);
  return true;
}

}  // namespace

bool SzHashToJsonObj(const QLIBSZHASH* hash, Json::Value& object) {
  const Json::ValueType type = object.type();
  if (hash == nullptr || (type != Json::nullValue && type != Json::objectValue) ||
      hash->values.size() > kMostParameters) {
    return false;
  }
  Json::Value copied(Json::objectValue);
  size_t valuesLeft = kMostValues;
  for (const auto& [name, text] : hash->values) {
    if (!read(text, *copied.demand(name.data(), name.data() + name.size()), valuesLeft)) {
      return false;
    }
  }
  if (object.empty()) {
    object.swap(copied);
    return true;
  }
  for (auto each = copied.begin(); each != copied.end(); ++each) {
    object[each.name()].swap(*each);
  }
  return true;
}

}  // namespace QELO::WebAPIUtil
