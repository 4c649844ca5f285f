#include "programs/webapi/diff/CompareAPI.h"

#include <algorithm>
#include <string>
#include <vector>

#include "programs/webapi/check/Words.h"
#include "programs/webapi/diff/CompareSchema.h"
#include "webapi/APIDescription.h"
#include "webapi/JsonHelper.h"

namespace QELO::AuthorProgram {
namespace {

using JsonHelper::find;
using JsonHelper::member;

/// Without what such an attribute allows, calls that were good are refused.
constexpr const char* kAllowances[] = {"allowUpload",        "allowTimeout", "skipCheckIP",
                                       "readOnly",           "allowDemo",    "allowSharing",
                                       "skipSharingAppCheck"};

const Json::Value& nothing() {
  return Json::Value::nullSingleton();
}

/// The user classes that may call; as lib.def is installed when nothing is said.
Json::Value classesOf(const APIDescription& api, const Json::Value& attributes,
                      const Json::Value& description) {
  if (find(attributes, "allowUser") == nullptr && find(description, "allowUser") == nullptr) {
    Json::Value usual(Json::arrayValue);
    for (const char* name : {"admin.local", "admin.domain", "admin.ldap"}) {
      usual.append(name);
    }
    return usual;
  }
  const Json::Value& list = api.GetAllowUser(attributes);
  return list.isArray() ? list : Json::Value(Json::arrayValue);
}

std::string accountOf(const APIDescription& api, const Json::Value& attributes) {
  if (APIDescription::IsSet(attributes, "grantByDefault")) {
    return "root";
  }
  return APIDescription::IsSet(attributes, "grantByUser") ? "the caller" : api.GetRunAs(attributes);
}

class Comparison {
 public:
  Comparison(const Json::Value& before, const Json::Value& after, Changes& changes)
      : before_(before), after_(after), old_(before), new_(after), changes_(changes) {}

  void All() {
    Login();
    for (const int version : old_.Versions()) {
      const Json::Value& list = listOf(before_, version);
      if (!Has(new_, version)) {
        changes_.AddAtName(Changes::kBreaks, Changes::kOld, list,
                           "version " + std::to_string(version) + " is gone");
        continue;
      }
      for (const std::string& method : old_.Methods(version)) {
        Method(version, method);
      }
    }
    for (const int version : new_.Versions()) {
      for (const std::string& method : new_.Methods(version)) {
        if (!old_.Lists(version, method) || !Has(old_, version)) {
          changes_.Add(Changes::kNew, Changes::kNewer, placeOf(after_, version, method),
                       "method " + named(version, method));
        }
      }
    }
  }

 private:
  static bool Has(const APIDescription& api, int version) {
    const std::vector<int> versions = api.Versions();
    return std::find(versions.begin(), versions.end(), version) != versions.end();
  }

  static const Json::Value& listOf(const Json::Value& description, int version) {
    return member(member(description, "methods"), std::to_string(version));
  }

  /// A method's entry in its list.
  static const Json::Value& placeOf(const Json::Value& description, int version,
                                    const std::string& method) {
    const Json::Value& list = listOf(description, version);
    for (const Json::Value& entry : list) {
      if (JsonHelper::isText(entry, method) || JsonHelper::hasMember(entry, method)) {
        return entry;
      }
    }
    return list;
  }

  static std::string named(int version, const std::string& method) {
    return Quoted(method) + " of version " + std::to_string(version);
  }

  void Login() {
    const int now = new_.GetAuthLevel();
    const int then = old_.GetAuthLevel();
    const bool wasOpen = then == APIDescription::AUTH_NONE || then == APIDescription::AUTH_SKIP;
    const bool isOpen = now == APIDescription::AUTH_NONE || now == APIDescription::AUTH_SKIP;
    const Json::Value* level = find(after_, "authLevel");
    if (wasOpen && !isOpen) {
      changes_.Add(Changes::kBreaks, Changes::kNewer, level != nullptr ? *level : after_,
                   "callers must be logged in now");
    }
    const Json::Value& privilege = new_.GetAppPriv();
    if (!privilege.isNull() && !JsonHelper::isText(privilege, "") &&
        privilege != old_.GetAppPriv()) {
      changes_.Add(Changes::kBreaks, Changes::kNewer, privilege,
                   "callers need another privilege than before");
    }
  }

  void Method(int version, const std::string& method) {
    if (!new_.Lists(version, method)) {
      return changes_.Add(Changes::kBreaks, Changes::kOld, placeOf(before_, version, method),
                          "method " + named(version, method) + " is gone");
    }
    const Json::Value* then = old_.Attributes(version, method);
    const Json::Value* now = new_.Attributes(version, method);
    place_ = &placeOf(after_, version, method);
    method_ = named(version, method);
    Attributes(then != nullptr ? *then : nothing(), now != nullptr ? *now : nothing());
  }

  void Break(const std::string& text) {
    changes_.Add(Changes::kBreaks, Changes::kNewer, *place_, method_ + ": " + text);
  }

  void Attributes(const Json::Value& then, const Json::Value& now) {
    for (const char* key : kAllowances) {
      if (APIDescription::IsSet(then, key) && !APIDescription::IsSet(now, key)) {
        Break(std::string("it has no \"") + key + "\" any more");
      }
    }
    if (APIDescription::IsSet(then, "allowDownload") !=
        APIDescription::IsSet(now, "allowDownload")) {
      Break("\"allowDownload\" is another, and so is the form of the answer");
    }
    const std::string account = accountOf(new_, now);
    const std::string former = accountOf(old_, then);
    if (account != former) {
      changes_.Add(Changes::kChanges, Changes::kNewer, *place_,
                   method_ + ": it runs as " + Quoted(account) + ", and did as " + Quoted(former));
    }
    if (new_.GetAuthLevel() != APIDescription::AUTH_NONE) {
      Classes(then, now);
    }
    Schemas(then, now);
  }

  void Classes(const Json::Value& then, const Json::Value& now) {
    if (old_.GetAuthLevel() == APIDescription::AUTH_NONE) {
      return;  // told already
    }
    const Json::Value classes = classesOf(new_, now, after_);
    for (const Json::Value& name : classesOf(old_, then, before_)) {
      if (std::find(classes.begin(), classes.end(), name) == classes.end()) {
        Break("users of the class " + Quoted(JsonHelper::asString(name)) + " may not call it");
      }
    }
  }

  void Schemas(const Json::Value& then, const Json::Value& now) {
    const Json::Value* params = find(now, "params");
    if (params != nullptr && find(then, "params") == nullptr) {
      Break("parameters are checked now, and were not");
    } else if (params != nullptr) {
      CompareParameters(member(then, "params"), *params, "", changes_);
    }
    const Json::Value* returns = find(now, "returns");
    if (returns != nullptr) {
      CompareResults(member(then, "returns"), *returns, "", changes_);
    }
  }

  const Json::Value& before_;
  const Json::Value& after_;
  const APIDescription old_;
  const APIDescription new_;
  Changes& changes_;
  const Json::Value* place_ = nullptr;  // of the method that is compared
  std::string method_;
};

}  // namespace

void CompareAPI(const Json::Value& before, const Json::Value& after, Changes& changes) {
  Comparison(before, after, changes).All();
}

}  // namespace QELO::AuthorProgram
