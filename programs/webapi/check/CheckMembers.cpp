#include "programs/webapi/check/CheckMembers.h"

#include <sys/types.h>

#include <algorithm>
#include <iterator>
#include <vector>

#include "programs/webapi/check/CheckSchema.h"
#include "programs/webapi/check/TypeName.h"
#include "programs/webapi/check/Words.h"
#include "webapi/APIDescription.h"
#include "webapi/platform/Core.h"

namespace QELO::AuthorProgram {
namespace {

using DescriptionKeys::Key;
using DescriptionKeys::Type;

const char* nameOf(Type type) {
  switch (type) {
    case Type::kText:
      return "a text";
    case Type::kTextOrNull:
      return "a text or null";
    case Type::kInteger:
      return "an integer";
    case Type::kBoolean:
      return "true or false";
    case Type::kList:
      return "a list";
    case Type::kObject:
      return "an object";
    default:
      return "a schema";
  }
}

bool fits(const Json::Value& value, Type type) {
  switch (type) {
    case Type::kText:
      return value.isString();
    case Type::kTextOrNull:
      return value.isString() || value.isNull();
    case Type::kInteger:
      return value.isInt() && value.type() != Json::realValue;
    case Type::kBoolean:
      return value.isBool();
    case Type::kList:
      return value.type() == Json::arrayValue;
    case Type::kObject:
      return value.type() == Json::objectValue;
    default:
      return true;
  }
}

void checkClasses(const Json::Value& list, Findings& findings) {
  const std::vector<std::string_view> known(std::begin(DescriptionKeys::kUserClasses),
                                            std::end(DescriptionKeys::kUserClasses));
  if (list.empty()) {
    findings.Add(Findings::kWarning, list, "an empty list lets nobody call");
  }
  for (const Json::Value& entry : list) {
    const std::string name = entry.isString() ? entry.asString() : "";
    if (!entry.isString()) {
      findings.Add(Findings::kError, entry,
                   std::string("a user class is a text, not ") + NameOfType(entry));
    } else if (std::find(known.begin(), known.end(), name) == known.end()) {
      findings.Add(Findings::kError, entry,
                   "there is no user class " + Quoted(name) + Suggestion(name, known));
    }
  }
}

void checkAccount(const Json::Value& value, const CheckOptions& options, Findings& findings) {
  const std::string name = value.isString() ? value.asString() : "";
  uid_t uid = 0;
  gid_t gid = 0;
  if (name.empty()) {
    findings.Add(Findings::kError, value, "the account has no name, and calls answer 117");
  } else if (options.hasAccounts && QELOUserGetUGID(name.c_str(), &uid, &gid) != 0) {
    findings.Add(Findings::kError, value,
                 "there is no account " + Quoted(name) + " here, and calls answer 117");
  }
}

void checkIsolation(const Json::Value& value, Findings& findings) {
  const std::vector<std::string_view> known(std::begin(DescriptionKeys::kIsolations),
                                            std::end(DescriptionKeys::kIsolations));
  const std::string name = value.isString() ? value.asString() : "";
  if (std::find(known.begin(), known.end(), name) == known.end()) {
    findings.Add(Findings::kError, value,
                 "there is no isolation " + Quoted(name) + Suggestion(name, known));
  }
}

void checkNumber(const Json::Value& value, int lowest, int highest, Findings& findings) {
  const int number = value.isInt() ? value.asInt() : 0;
  if (!value.isInt() || number < lowest || number > highest) {
    findings.Add(
        Findings::kError, value,
        "it must be an integer from " + std::to_string(lowest) + " to " + std::to_string(highest));
  }
}

void checkValue(const Key& key, const Json::Value& value, const CheckOptions& options,
                Findings& findings) {
  if (key.type == Type::kSchema) {
    key.name == "params" ? CheckObjectSchema(value, findings) : CheckSchema(value, findings);
  } else if (key.name == "allowUser") {
    checkClasses(value, findings);
  } else if (key.name == "runAs") {
    checkAccount(value, options, findings);
  } else if (key.name == "isolation") {
    checkIsolation(value, findings);
  } else if (key.name == "authLevel") {
    checkNumber(value, APIDescription::AUTH_NONE, APIDescription::AUTH_SKIP, findings);
  } else if (key.name == "priority") {
    checkNumber(value, -DescriptionKeys::kMaxPriority, DescriptionKeys::kMaxPriority, findings);
  }
}

}  // namespace

void CheckMembers(const Json::Value& object, std::span<const Key> keys, Others others,
                  const std::string& where, const CheckOptions& options, Findings& findings) {
  std::vector<std::string_view> known;
  std::transform(keys.begin(), keys.end(), std::back_inserter(known),
                 [](const Key& key) { return key.name; });
  for (auto it = object.begin(); it != object.end() && !findings.IsFull(); ++it) {
    const std::string name = it.name();
    const auto key =
        std::find_if(keys.begin(), keys.end(), [&](const Key& each) { return each.name == name; });
    if (key == keys.end()) {
      // An API's own members are for its methods; one that looks like the framework's is none.
      if (others == Others::kNone || !Resembling(name, known).empty()) {
        findings.AddAtName(
            Findings::kError, *it,
            "there is no " + Quoted(name) + " in " + where + Suggestion(name, known));
      }
    } else if (!fits(*it, key->type)) {
      findings.Add(Findings::kError, *it,
                   Quoted(name) + " is " + nameOf(key->type) + ", not " + NameOfType(*it));
    } else {
      checkValue(*key, *it, options, findings);
    }
  }
}

}  // namespace QELO::AuthorProgram
