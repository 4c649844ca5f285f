#include "programs/webapi-exec/Names.h"

#include <unistd.h>

#include <cstdio>
#include <set>

#include "webapi/APIRunner.h"
#include "webapi/JsonHelper.h"
#include "webapi/platform/Paths.h"

namespace QELO::ExecProgram {
namespace {

/// The methods of all versions, or of one.
std::set<std::string> methodsOf(const Json::Value& description, int version) {
  std::set<std::string> names;
  const Json::Value& versions = JsonHelper::member(description, "methods");
  for (const std::string& key : versions.getMemberNames()) {
    if (!versions[key].isArray() || (version != 0 && key != std::to_string(version))) {
      continue;
    }
    for (const Json::Value& entry : versions[key]) {
      if (entry.isString()) {
        names.insert(entry.asString());
      } else if (entry.isObject()) {
        const std::vector<std::string> listed = entry.getMemberNames();
        names.insert(listed.begin(), listed.end());
      }
    }
  }
  return names;
}

/// @return false, with a message, when the options name a version that the API does not have
bool checkVersion(const Options& options, const Json::Value& description) {
  const Json::Value& versions = JsonHelper::member(description, "methods");
  if (options.version == 0 ||
      JsonHelper::member(versions, std::to_string(options.version)).isArray()) {
    return true;
  }
  std::string known;
  for (const std::string& key : versions.getMemberNames()) {
    known += (known.empty() ? "" : ", ") + key;
  }
  fprintf(stderr, "webapi-exec: no such version: %s has %s\n", options.api.c_str(),
          known.empty() ? "none" : known.c_str());
  return false;
}

}  // namespace

ExitCode listNames(const Options& options) {
  APIRunner runner;
  Json::Value catalogue(Json::objectValue);
  if (chdir(Paths::kDescriptionDir) != 0 || !runner.InitLibDesc(catalogue)) {
    fprintf(stderr, "webapi-exec: there are no APIs in %s\n", Paths::kDescriptionDir);
    return kFailed;
  }
  std::set<std::string> names;
  if (options.api.empty()) {
    const std::vector<std::string> apis = catalogue.getMemberNames();
    names.insert(apis.begin(), apis.end());
  } else if (!JsonHelper::hasMember(catalogue, options.api)) {
    fprintf(stderr, "webapi-exec: there is no API %s\n", options.api.c_str());
    return kFailed;
  } else if (!checkVersion(options, catalogue[options.api])) {
    return kFailed;
  } else {
    names = methodsOf(catalogue[options.api], options.version);
  }
  for (const std::string& name : names) {
    printf("%s\n", name.c_str());
  }
  return kDone;
}

}  // namespace QELO::ExecProgram
