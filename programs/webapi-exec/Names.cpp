#include "programs/webapi-exec/Names.h"

#include <unistd.h>

#include <cstdio>
#include <set>
#include <string>
#include <vector>

#include "programs/webapi-exec/Program.h"
#include "webapi/APIDescription.h"
#include "webapi/APIRunner.h"
#include "webapi/JsonHelper.h"
#include "webapi/platform/Paths.h"

namespace QELO::ExecProgram {
namespace {

/// The methods of all versions that can be called, or of one.
std::set<std::string> methodsOf(const APIDescription& description, int version) {
  std::set<std::string> names;
  for (const int known : description.Versions()) {
    if (version == 0 || version == known) {
      const std::vector<std::string> listed = description.Methods(known);
      names.insert(listed.begin(), listed.end());
    }
  }
  return names;
}

/// @return false, with a message, when the options name a version that the API does not have
bool checkVersion(const Options& options, const APIDescription& description) {
  std::string known;
  for (const int version : description.Versions()) {
    if (options.version == version) {
      return true;
    }
    known += (known.empty() ? "" : ", ") + std::to_string(version);
  }
  if (options.version == 0) {
    return true;
  }
  fprintf(stderr, "%s: no such version: %s has %s\n", programName, options.api.c_str(),
          known.empty() ? "none" : known.c_str());
  return false;
}

}  // namespace

ExitCode listNames(const Options& options) {
  APIRunner runner;
  Json::Value catalogue(Json::objectValue);
  if (chdir(Paths::kDescriptionDir) != 0 || !runner.InitLibDesc(catalogue)) {
    fprintf(stderr, "%s: there are no APIs in %s\n", programName, Paths::kDescriptionDir);
    return kFailed;
  }
  std::set<std::string> names;
  if (options.api.empty()) {
    for (auto it = catalogue.begin(); it != catalogue.end(); ++it) {
      names.insert(it.name());
    }
  } else if (!JsonHelper::hasMember(catalogue, options.api)) {
    fprintf(stderr, "%s: there is no API %s\n", programName, options.api.c_str());
    return kFailed;
  } else if (!checkVersion(options, APIDescription(catalogue[options.api]))) {
    return kFailed;
  } else {
    names = methodsOf(APIDescription(catalogue[options.api]), options.version);
  }
  for (const std::string& name : names) {
    printf("%s\n", name.c_str());
  }
  return kDone;
}

}  // namespace QELO::ExecProgram
