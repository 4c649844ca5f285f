#include "programs/webapi/check/CheckLibrary.h"

#include <unistd.h>

#include <string_view>
#include <vector>

#include "programs/webapi/Arguments.h"
#include "programs/webapi/check/Words.h"
#include "webapi/APIDescription.h"
#include "webapi/JsonHelper.h"
#include "webapi/base/OwnFile.h"

namespace QELO::AuthorProgram {
namespace {

using JsonHelper::member;

/// The compound request, which is no library's.
constexpr std::string_view kEntryAPI = "QELO.Entry.Request";

/// The library's path as calls would find it, if the description stood in its directory.
std::string pathOf(const std::string& file, const std::string& library) {
  const size_t slash = file.rfind('/');
  const bool isRelative = library.find('/') != std::string::npos && library.front() != '/';
  const std::string path =
      isRelative && slash != std::string::npos ? file.substr(0, slash + 1) + library : library;
  return path.find('/') == std::string::npos && access(path.c_str(), F_OK) == 0 ? "./" + path
                                                                                : path;
}

/// The place of a method in a version's list.
const Json::Value& placeOf(const Json::Value& list, const std::string& method) {
  for (const Json::Value& entry : list) {
    if (JsonHelper::isText(entry, method) || JsonHelper::hasMember(entry, method)) {
      return entry;
    }
  }
  return list;
}

}  // namespace

const LibraryCheck::Loaded& LibraryCheck::Load(const std::string& path) {
  const auto found = loaded_.find(path);
  if (found != loaded_.end()) {
    return found->second;
  }
  Loaded& loaded = loaded_[path];
  loaded.wrong = loaded.table.Read(path, options_.seconds);
  return loaded;
}

void LibraryCheck::Check(const std::string& file, const std::string& api,
                         const Json::Value& description, Findings& findings) {
  const Json::Value& library = member(description, "lib");
  const Json::Value& methods = member(description, "methods");
  if (!options_.hasLibraries || !library.isString() || !methods.isObject() || api == kEntryAPI) {
    return;
  }
  const std::string named = JsonHelper::asString(library);
  if (options_.library.empty() && named.empty()) {
    return findings.Add(Findings::kError, library, "no library is named, and calls answer 111");
  }
  const bool isNamed = options_.library.empty();
  const std::string path = isNamed ? pathOf(file, named) : options_.library;
  const Loaded& loaded = Load(path);
  if (!loaded.wrong.empty()) {
    return findings.Add(Findings::kError, library, Shown(path) + ": " + loaded.wrong);
  }
  if (isNamed && OthersMayChange(path)) {
    findings.Add(Findings::kError, library,
                 "others than root may write " + Shown(path) +
                     " or its directory, so it is not "
                     "loaded, and calls answer 111");
  }
  const APIDescription listed(description);
  std::vector<std::string_view> known;
  for (const LibraryTable::Entry& entry : loaded.table.Entries()) {
    known.push_back(entry.method);
    if (entry.api == api && !listed.Lists(entry.version, entry.method)) {
      findings.AddAtName(Findings::kError, methods,
                         "the library has " + Quoted(entry.method) + " of version " +
                             std::to_string(entry.version) +
                             ", which is not listed, and calls "
                             "answer 103");
    }
  }
  for (const int version : listed.Versions()) {
    const Json::Value& list = member(methods, std::to_string(version));
    for (const std::string& method : listed.Methods(version)) {
      if (!loaded.table.Has(api, version, method)) {
        findings.Add(Findings::kError, placeOf(list, method),
                     "the library's table has no " + Quoted(method) + " of version " +
                         std::to_string(version) + " and API " + Quoted(api) +
                         ", and calls answer 121" + Suggestion(method, known));
      }
    }
  }
}

}  // namespace QELO::AuthorProgram
