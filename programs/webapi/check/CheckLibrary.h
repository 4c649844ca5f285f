#pragma once

#include <json/json.h>

#include <map>
#include <string>

#include "programs/webapi/check/CheckMembers.h"
#include "programs/webapi/check/Findings.h"
#include "programs/webapi/check/LibraryTable.h"

namespace QELO::AuthorProgram {

/// Compares descriptions with the tables of their libraries, each of which is loaded once.
class LibraryCheck {
 public:
  explicit LibraryCheck(const CheckOptions& options) : options_(options) {}

  /// @param file  the description's, which a relative path of the library counts from
  void Check(const std::string& file, const std::string& api, const Json::Value& description,
             Findings& findings);

 private:
  struct Loaded {
    LibraryTable table;
    std::string wrong;
  };

  const Loaded& Load(const std::string& path);

  const CheckOptions& options_;
  std::map<std::string, Loaded> loaded_;
};

}  // namespace QELO::AuthorProgram
