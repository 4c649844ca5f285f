#include "programs/webapi/check/CheckAPI.h"

#include <algorithm>
#include <set>

#include "programs/webapi/Arguments.h"
#include "programs/webapi/check/TypeName.h"
#include "programs/webapi/check/Words.h"
#include "programs/webapi/text/Pointer.h"
#include "webapi/APIDescription.h"
#include "webapi/JsonHelper.h"
#include "webapi/MethodDescription.h"
#include "webapi/base/Number.h"
#include "webapi/base/Text.h"

namespace QELO::AuthorProgram {
namespace {

using JsonHelper::hasMember;
using JsonHelper::member;

class APICheck {
 public:
  APICheck(const Json::Value& description, const CheckOptions& options, Findings& findings)
      : description_(description), options_(options), findings_(findings) {}

  void All() {
    CheckMembers(description_, DescriptionKeys::kMembers, Others::kOwn, "an API", options_,
                 findings_);
    for (const char* key : {"lib", "minVersion", "maxVersion", "methods"}) {
      if (!hasMember(description_, key)) {
        findings_.AddAtName(Findings::kError, description_,
                            Quoted(key) + " is missing, and calls answer 102");
      }
    }
    Library();
    const Json::Value& methods = member(description_, "methods");
    for (auto it = methods.begin(); methods.isObject() && it != methods.end(); ++it) {
      Version(it.name(), *it);
    }
    Bounds(methods);
  }

 private:
  void Warn(const Json::Value& at, const std::string& text) {
    findings_.Add(Findings::kWarning, at, text);
  }
  void Refuse(const Json::Value& at, const std::string& text) {
    findings_.Add(Findings::kError, at, text);
  }

  void Library() {
    const Json::Value& library = member(description_, "lib");
    const std::string path = library.isString() ? library.asString() : "/";
    const bool isTemplate = path.starts_with("@");  // what the build puts in
    if (!path.empty() && !isTemplate && path.find("/") == std::string::npos) {
      Warn(library,
           "a name without \"/\" is looked for where the system keeps its libraries; "
           "write \"./" +
               Shown(path) + "\" for the description's directory");
    }
  }

  void Version(const std::string& name, const Json::Value& list) {
    int version = 0;
    const bool isNumber = ParseNumber(name, version) && version > 0 && IsDigit(name.front()) &&
                          std::to_string(version) == name;
    if (!isNumber) {
      findings_.AddAtName(Findings::kError, list,
                          "a version is a number from 1 on, not " + Quoted(name));
    } else if (!APIDescription(description_).HasVersion(version)) {
      findings_.AddAtName(Findings::kError, list,
                          "version " + name +
                              " is not within \"minVersion\" and \"maxVersion\", "
                              "and calls answer 104");
    }
    if (list.type() != Json::arrayValue) {
      Refuse(list, std::string("a version's methods are a list, not ") + NameOfType(list));
    } else if (list.empty()) {
      Refuse(list, "the version has no methods");
    }
    std::set<std::string> seen;
    for (Json::ArrayIndex i = 0; list.isArray() && i < list.size() && !findings_.IsFull(); ++i) {
      Entry(list[i], seen);
    }
  }

  void Entry(const Json::Value& entry, std::set<std::string>& seen) {
    std::string name = entry.isString() ? entry.asString() : "";
    if (!entry.isString()) {
      if (entry.type() != Json::objectValue || entry.size() != 1) {
        return Refuse(entry,
                      "a method is its name, or an object of one member: the name with the "
                      "method's attributes");
      }
      name = entry.begin().name();
      Attributes(*entry.begin());
    }
    if (name.empty()) {
      Refuse(entry, "a method without a name cannot be called");
    }
    if (!seen.insert(name).second) {
      Refuse(entry, "the method " + Quoted(name) + " is listed already, and that one counts");
    }
  }

  void Attributes(const Json::Value& attributes) {
    if (attributes.type() != Json::objectValue) {
      return Refuse(attributes, std::string("a method's attributes are an object, not ") +
                                    NameOfType(attributes));
    }
    const size_t errors = findings_.Errors();
    CheckMembers(attributes, DescriptionKeys::kAttributes, Others::kNone, "a method", options_,
                 findings_);
    if (findings_.Errors() == errors) {
      Told(attributes);
    }
    Contradictions(attributes);
  }

  /// What is told of parameters and results, as those see it who check calls by it.
  void Told(const Json::Value& attributes) {
    for (const MethodDescription::Fault& fault : MethodDescription(attributes).Faults()) {
      Refuse(ValueAt(attributes, fault.path), Quoted(fault.path) + " " + fault.message);
    }
  }

  /// Attributes of which one makes another useless.
  void Contradictions(const Json::Value& attributes) {
    const auto isSet = [&](const char* key) { return APIDescription::IsSet(attributes, key); };
    const Json::Value& runAs = member(attributes, "runAs");
    if (isSet("grantByDefault") && isSet("grantByUser")) {
      Warn(member(attributes, "grantByUser"),
           "\"grantByUser\" does nothing beside \"grantByDefault\": the method runs as root");
    }
    if (!runAs.isNull() && (isSet("grantByDefault") || isSet("grantByUser"))) {
      Warn(runAs, "\"runAs\" does nothing beside \"grantByUser\" or \"grantByDefault\"");
    }
    if (isSet("deferUpload") && !isSet("allowUpload")) {
      Warn(member(attributes, "deferUpload"),
           "\"deferUpload\" does nothing without \"allowUpload\"");
    }
    if (isSet("grantByUser") &&
        APIDescription(description_).GetAuthLevel() == APIDescription::AUTH_NONE) {
      Warn(member(attributes, "grantByUser"),
           "with \"authLevel\" 0 nobody is logged in, and the method answers 117");
    }
  }

  /// The versions that are promised.
  void Bounds(const Json::Value& methods) {
    const Json::Value& least = member(description_, "minVersion");
    const Json::Value& most = member(description_, "maxVersion");
    if (!least.isInt() || !most.isInt() || !methods.isObject()) {
      return;
    }
    const int first = JsonHelper::asInt(least);
    const int last = JsonHelper::asInt(most);
    if (first > last) {
      return Refuse(least, "\"minVersion\" is above \"maxVersion\": there is no version to call");
    }
    if (first < 1) {
      Refuse(least, "versions begin with 1");
    }
    if (static_cast<int64_t>(last) - first >= static_cast<int64_t>(kMostEntries)) {
      return Refuse(most, "that makes more than " + std::to_string(kMostEntries) + " versions");
    }
    for (int version = std::max(first, 1); version <= last; ++version) {
      if (!hasMember(methods, std::to_string(version))) {
        Refuse(methods, "version " + std::to_string(version) + " has no methods");
      }
    }
  }

  const Json::Value& description_;
  const CheckOptions& options_;
  Findings& findings_;
};

}  // namespace

void CheckAPI(const Json::Value& description, const CheckOptions& options, Findings& findings) {
  if (description.type() != Json::objectValue) {
    findings.Add(Findings::kError, description,
                 std::string("an API's description is an object, not ") + NameOfType(description));
    return;
  }
  APICheck(description, options, findings).All();
}

void CheckDefaults(const Json::Value& defaults, const CheckOptions& options, Findings& findings) {
  CheckMembers(defaults, DescriptionKeys::kDefaults, Others::kNone, "lib.def", options, findings);
  const Json::Value& attributes = member(defaults, "methods");
  if (attributes.isObject()) {
    CheckMembers(attributes, DescriptionKeys::kAttributes, Others::kNone, "a method", options,
                 findings);
  }
}

}  // namespace QELO::AuthorProgram
