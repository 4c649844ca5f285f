#include "webapi/model/APIBase.h"

#include <algorithm>
#include <utility>

#include "webapi/JsonHelper.h"
#include "webapi/json/Literal.h"

namespace QELO {
namespace {

bool takesMembers(const Json::Value& value) {
  return value.type() == Json::objectValue || value.type() == Json::nullValue;
}

bool holdsStringsAlone(const Json::Value& members) {
  return std::all_of(members.begin(), members.end(),
                     [](const Json::Value& member) { return member.type() == Json::stringValue; });
}

}  // namespace

APIBase::APIBase() : store_(Json::objectValue) {}

APIBase::~APIBase() = default;

const Json::Value* APIBase::Find(std::string_view section, std::string_view key) const {
  const Json::Value* found = JsonHelper::find(store_, section);
  return found != nullptr ? JsonHelper::find(*found, key) : nullptr;
}

Json::Value* APIBase::FindSection(std::string_view section) {
  // The store is ours to change; the JSON library finds members of constant values only.
  Json::Value* found = const_cast<Json::Value*>(JsonHelper::find(store_, section));
  return found != nullptr && takesMembers(*found) ? found : nullptr;
}

void APIBase::AddSection(const char* section) {
  store_[Literal(section)] = Json::Value(Json::objectValue);
}

bool APIBase::Put(std::string_view section, const char* key, Json::Value value) {
  Json::Value* target = FindSection(section);
  if (target == nullptr) {
    return false;
  }
  (*target)[Literal(key)].swap(value);
  return true;
}

bool APIBase::HasData(const std::string& section, const std::string& key) const {
  return Find(section, key) != nullptr;
}

bool APIBase::SetData(const std::string& section, const Json::Value& members, bool stringOnly) {
  Json::Value* target = FindSection(section);
  if (target == nullptr || members.type() != Json::objectValue || members.size() == 0) {
    return false;
  }
  if (target->size() == 0 && (!stringOnly || holdsStringsAlone(members))) {
    *target = members;  // as the loop below, without a look-up for each
    return true;
  }
  for (auto it = members.begin(); it != members.end(); ++it) {
    if (!stringOnly || it->type() == Json::stringValue) {
      const char* end = nullptr;
      const char* name = it.memberName(&end);
      *target->demand(name, end) = *it;
    }
  }
  return true;
}

bool APIBase::TakeData(const std::string& section, Json::Value&& members, bool stringOnly) {
  Json::Value* target = FindSection(section);
  if (target != nullptr && target->size() == 0 && members.type() == Json::objectValue &&
      members.size() != 0 && (!stringOnly || holdsStringsAlone(members))) {
    target->swap(members);
    return true;
  }
  if (target == nullptr || members.empty() || !members.isObject()) {
    return false;
  }
  for (auto it = members.begin(); it != members.end(); ++it) {
    if (!stringOnly || it->isString()) {
      (*target)[it.name()].swap(*it);
    }
  }
  return true;
}

bool APIBase::ReplaceData(const std::string& section, Json::Value&& members) {
  Json::Value* target = FindSection(section);
  if (target != nullptr && members.type() == Json::objectValue && members.size() != 0) {
    target->swap(members);
    return true;
  }
  ClearData(section, "");
  return false;
}

bool APIBase::SetData(const std::string& section, const std::string& key, const Json::Value& value,
                      bool stringOnly) {
  Json::Value* target = FindSection(section);
  if (target == nullptr || key.empty() || (stringOnly && value.type() != Json::stringValue)) {
    return false;
  }
  *target->demand(key.data(), key.data() + key.size()) = value;
  return true;
}

const Json::Value& APIBase::GetData(const std::string& section, const std::string& key,
                                    const Json::Value& defaultValue) const {
  const Json::Value* found = JsonHelper::find(store_, section);
  if (found == nullptr) {
    return defaultValue;
  }
  if (key.empty()) {
    return *found;
  }
  const Json::Value* member = JsonHelper::find(*found, key);
  return member != nullptr ? *member : defaultValue;
}

bool APIBase::ClearData(const std::string& section, const std::string& key) {
  if (section.empty() || !JsonHelper::hasMember(store_, section)) {
    return false;
  }
  Json::Value& found = store_[section];
  if (key.empty()) {
    const bool clearable = found.isObject() || found.isArray() || found.isNull();
    if (clearable) {
      found.clear();
    }
    return clearable;
  }
  if (!JsonHelper::hasMember(found, key)) {
    return false;
  }
  found.removeMember(key);
  return true;
}

const Json::Value& APIBase::GetData(const std::string& section,
                                    const Json::Value& defaultValue) const {
  return GetData(section, "", defaultValue);
}

bool APIBase::InitField(const std::string& section) {
  if (section.empty() || !takesMembers(store_)) {
    return false;
  }
  const Json::ArrayIndex former = store_.size();
  Json::Value& field = store_[section];
  const bool isNew = store_.size() != former;
  if (isNew) {
    field = Json::Value(Json::objectValue);
  }
  return isNew;
}

}  // namespace QELO
