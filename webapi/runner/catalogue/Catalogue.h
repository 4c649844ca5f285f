#pragma once

#include <json/json.h>

#include <string>

namespace QELO {

class APIRequest;

/// The descriptions of APIs: found in files of the working directory, checked, given their defaults
/// and asked for methods and attributes. The operations with a name of APIRunner's are its own.
class Catalogue {
 public:
  /// @param libDef  lib.def's contents, an object
  /// @param known   the descriptions loaded so far by API name, an object to which more are added
  Catalogue(const Json::Value& libDef, Json::Value& known) : libDef_(libDef), known_(known) {}
  Catalogue(const Catalogue&) = delete;
  Catalogue& operator=(const Catalogue&) = delete;

  /// Takes lib.def's contents; `libDef` stays as it is when there is no such file, or none that can
  /// be used, which is logged.
  static void ReadLibDef(Json::Value& libDef);

  /// Reads a file of descriptions or defaults. One that others may change is refused, which is
  /// logged: it says with whose rights methods run.
  static bool ReadFile(const std::string& path, Json::Value& content);
  static bool CheckLibDescription(const Json::Value& description);
  Json::Value& ApplyLibDef(Json::Value& description) const;
  bool InitLibDesc(Json::Value& target) const;
  bool InitLibDesc(Json::Value& target, const std::string& api) const;
  bool AddAPIInfo(APIRequest* request) const;
  const Json::Value& GetMethod(const std::string& api, int version, const std::string& method);
  bool GetMethodAttr(const std::string& api, int version, const std::string& method,
                     const std::string& attribute);
  /// Whether the request's call is one that can be run.
  /// @return WEBAPI_ERR_NONE, or the web-API error code of what is wrong with it
  int CheckRequestParam(APIRequest& request);

 private:
  /// @param file  is taken apart
  void AddDescriptions(Json::Value& target, Json::Value& file) const;

  const Json::Value& libDef_;
  Json::Value& known_;
};

}  // namespace QELO
