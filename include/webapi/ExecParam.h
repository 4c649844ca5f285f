#pragma once

#include <json/json.h>

#include <memory>
#include <string>

#include "webapi/Export.h"

namespace QELO {

class ExecParamPrivate;

/// One API call that a program makes itself: what to call, as whom, and where raw output goes.
///
/// Setters return the object, so that they can be chained. An object's members are merged into
/// those set before; anything that is no object changes nothing.
class WEBAPI_API ExecParam {
 public:
  ExecParam();
  /// Takes what Serialize() gave, here or in another process; anything that is no object gives an
  /// empty call.
  explicit ExecParam(const Json::Value& record);
  ExecParam(const ExecParam& other);
  ExecParam& operator=(const ExecParam& other);
  virtual ~ExecParam();

  /// The call. API, method and user have to be set before it is made.
  ExecParam& SetAPI(const std::string& api);
  ExecParam& SetVersion(int version);
  ExecParam& SetMethod(const std::string& method);
  /// The method's parameters. "api", "version" and "method" among them name the call, too.
  ExecParam& SetParams(const Json::Value& params);
  /// CGI variables; those that are no strings are ignored by the request.
  ExecParam& SetEnv(const Json::Value& env);
  /// The request's attributes.
  ExecParam& SetAttr(const Json::Value& attributes);
  /// The user to run as. The call is made with that user's session, without a permission check.
  ExecParam& SetRunner(const std::string& user);
  /// @param fd  descriptor that receives the body of what a downloading method prints; its owner
  ///            stays the caller. Below 0: none.
  ExecParam& SetOutputFd(int fd);

  /// What was set; "" or an empty object when nothing was.
  std::string GetAPI() const;
  int GetVersion() const;  ///< 0 when not set
  std::string GetMethod() const;
  Json::Value GetParams() const;  ///< "api", "version" and "method" included
  Json::Value GetEnv() const;
  Json::Value GetAttr() const;
  std::string GetRunner() const;
  int GetOutputFd() const;  ///< -1 when not set

  /// The whole record; may be changed in place.
  Json::Value& Serialize();
  /// Swaps the whole record with `record`.
  void Deserialize(Json::Value& record);

 private:
  std::unique_ptr<ExecParamPrivate> private_;
};

}  // namespace QELO
