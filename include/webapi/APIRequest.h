#pragma once

#include <json/json.h>

#include <memory>
#include <string>

#include "webapi/APIParameter.h"
#include "webapi/Export.h"

namespace QELO {

class APIRequestPrivate;

namespace sharing {
enum _tag_SHARING_URL_TYPE : int;
namespace record {
class Entry;
class Session;
class Token;
}  // namespace record
}  // namespace sharing

/// What the authorisation of the caller came to.
enum _tag_authorized_result_ : int {
  AUTHORIZED_ADDRESS_MISMATCH = -8,
  AUTHORIZED_TOKEN_MISMATCH = -7,  ///< anti-forgery token missing or wrong
  AUTHORIZED_REFUSED = -6,
  AUTHORIZED_UNAUTHENTICATED = -5,  ///< no such session, or the access token was refused
  AUTHORIZED_UNKNOWN = -4,          ///< not asked yet, or a malformed session id
  AUTHORIZED_BROKEN = -3,           ///< the session's record cannot be read
  AUTHORIZED_NO_SESSION = -2,
  AUTHORIZED_TIMED_OUT = -1,
  AUTHORIZED_NONE = 0,
  AUTHORIZED_YES = 1,
  AUTHORIZED_YES_TIMED_OUT = 2,  ///< timed out, and the method allows that
};

/// One HTTP request, as the dispatcher and an API method see it.
///
/// Getters never fail: a missing value gives the default named with the getter, or the one
/// passed. One thread uses a request.
class WEBAPI_API APIRequest {
 public:
  enum PARAM_NECESSITY : int { PARAM_REQUIRED = 0, PARAM_OPTIONAL = 1 };
  enum RequestMethod : int { METHOD_UNKNOWN = 0, METHOD_GET = 1, METHOD_POST = 2, METHOD_HEAD = 3 };

  /// Builds the request from an object with the members "environ", "getParam", "postParam",
  /// "reqLib" and "session", each optional; anything else gives an empty request.
  explicit APIRequest(const Json::Value& init = Json::Value());
  /// Copies everything, the owner that sharing URLs are computed for included: that stays the
  /// request copied from, which must outlive the copy.
  APIRequest(const APIRequest& other);
  APIRequest& operator=(const APIRequest&) = delete;
  virtual ~APIRequest();

  /// Merges CGI variables (string members only) and parses cookies, request method and sharing
  /// link from them.
  void InitEnv(const Json::Value& env);
  void InitEnv(Json::Value&& env);
  /// Takes the parameters in "getParam", then "postParam", which wins; enciphered ones are
  /// deciphered. @param replace  drop the parameters there are first
  void InitParam(const Json::Value& params, bool replace);
  /// Replaces the API's description.
  void InitAPIInfo(const Json::Value& description);
  /// Replaces what is known of the caller.
  void InitSession(const Json::Value& session);
  void InitSession(Json::Value&& session);

  /// The whole record; may be changed in place.
  Json::Value& Serialize();
  /// Swaps the whole record with `record`.
  void Deserialize(Json::Value& record);

  bool HasEnv(const std::string& name) const;
  Json::Value GetEnv(const std::string& name, const Json::Value& def = Json::Value()) const;
  bool HasParam(const std::string& name) const;
  /// An empty name gives the object of all parameters.
  Json::Value GetParam(const std::string& name, const Json::Value& def = Json::Value()) const;
  /// As GetParam without the copy; `def` must outlive the result.
  const Json::Value& GetParamRef(const std::string& name, const Json::Value& def) const;
  bool HasCookie(const std::string& name) const;
  std::string GetCookie(const std::string& name, const std::string& def = "") const;
  bool SetCookie(const std::string& name, const std::string& value);
  bool HasAttr(const std::string& name) const;
  Json::Value GetAttr(const std::string& name, const Json::Value& def = Json::Value()) const;
  bool SetAttr(const std::string& name, const Json::Value& value);
  /// A member of the API's description.
  Json::Value GetAPIInfo(const std::string& name, const Json::Value& def = Json::Value()) const;

  std::string GetAPIClass() const;
  int GetAPIVersion() const;
  std::string GetAPIMethod() const;
  int GetRequestMethod() const;  ///< a RequestMethod

  std::string GetSessionID() const;
  std::string GetRemoteIP() const;
  std::string GetUILanguage() const;  ///< "enu" when not known
  bool IsTokenEnable() const;
  bool IsAdmin() const;
  bool IsAuthorized() const;
  bool IsSkipCheckIP() const;  ///< true when no session was laid
  bool IsTimeout() const;      ///< true when no session was laid
  int GetTimeoutDuration() const;
  std::string GetSessionFilePath() const;
  std::string GetApplication() const;
  std::string GetWebAPIPriv() const;
  std::string GetLoginUserName() const;
  /// The login user's id, or 0xFFFFFFFF; asked once and kept.
  unsigned int GetLoginUID() const;
  bool SetAuthResult(_tag_authorized_result_ result);
  _tag_authorized_result_ GetAuthResult() const;  ///< -4 when not yet known
  /// Which account kinds the API's description allows: 0x01 admin.local, 0x02 admin.domain,
  /// 0x04 admin.ldap, 0x08 normal.local, 0x10 normal.domain, 0x20 normal.ldap.
  int GetAllowUser() const;
  bool HasAppPriv(const std::string& name) const;
  /// The login user's directory for preferences, "/tmp" when there is none.
  std::string GetPreferenceDir() const;
  std::string GetGroupPreferenceDir(const std::string& group) const;
  bool IsDemoMode() const;
  bool IsPollingTask() const;
  std::string GetPollingTaskId() const;
  bool IsUploadRequest() const;
  bool IsSliceUploadRequest() const;
  /// The access token, or null. The text belongs to the process environment, where it is put.
  const char* GetQeloAccessTokenID() const;

  std::string GetURLProto(const std::string& def) const;
  std::string GetURLHost(const std::string& def) const;  ///< IPv6 literals with their brackets
  int GetURLPort(int def) const;
  std::string GetURLPath(const std::string& def) const;  ///< up to and including the last "/"
  std::string GetURLName(const std::string& def) const;  ///< after the last "/"
  std::string GetSharingURL(const std::string& def) const;
  sharing::_tag_SHARING_URL_TYPE GetSharingURLType() const;
  std::string GetSharingID() const;
  std::string GetSharingSID() const;
  bool IsSharing() const;
  sharing::record::Entry GetSharingEntry() const;
  sharing::record::Session GetSharingSession() const;
  sharing::record::Token GetSharingToken() const;

  /// Typed parameters; the validator may be null.
  APIParameter<int> GetAndCheckInt(const std::string& name,
                                   PARAM_NECESSITY necessity = PARAM_REQUIRED,
                                   bool (*validator)(const int&) = nullptr) const;
  APIParameter<bool> GetAndCheckBool(const std::string& name,
                                     PARAM_NECESSITY necessity = PARAM_REQUIRED,
                                     bool (*validator)(const bool&) = nullptr) const;
  APIParameter<double> GetAndCheckReal(const std::string& name,
                                       PARAM_NECESSITY necessity = PARAM_REQUIRED,
                                       bool (*validator)(const double&) = nullptr) const;
  APIParameter<std::string> GetAndCheckString(
      const std::string& name, PARAM_NECESSITY necessity = PARAM_REQUIRED,
      bool (*validator)(const std::string&) = nullptr) const;
  APIParameter<Json::Value> GetAndCheckArray(const std::string& name,
                                             PARAM_NECESSITY necessity = PARAM_REQUIRED,
                                             bool (*validator)(const Json::Value&) = nullptr) const;
  APIParameter<Json::Value> GetAndCheckObject(
      const std::string& name, PARAM_NECESSITY necessity = PARAM_REQUIRED,
      bool (*validator)(const Json::Value&) = nullptr) const;
  /// As GetAndCheckArray, but a single value (null too) counts as a list of one.
  APIParameter<Json::Value> GetAndCheckUnitArray(
      const std::string& name, PARAM_NECESSITY necessity = PARAM_REQUIRED,
      bool (*validator)(const Json::Value&) = nullptr) const;
  /// T: long long, unsigned int or unsigned long long.
  template <typename T>
  APIParameter<T> GetAndCheckIntegral(const std::string& name,
                                      PARAM_NECESSITY necessity = PARAM_REQUIRED,
                                      bool (*validator)(const T&) = nullptr) const;

 private:
  std::unique_ptr<APIRequestPrivate> private_;
};

extern template WEBAPI_API APIParameter<long long> APIRequest::GetAndCheckIntegral<long long>(
    const std::string&, PARAM_NECESSITY, bool (*)(const long long&)) const;
extern template WEBAPI_API APIParameter<unsigned int> APIRequest::GetAndCheckIntegral<unsigned int>(
    const std::string&, PARAM_NECESSITY, bool (*)(const unsigned int&)) const;
extern template WEBAPI_API APIParameter<unsigned long long>
APIRequest::GetAndCheckIntegral<unsigned long long>(const std::string&, PARAM_NECESSITY,
                                                    bool (*)(const unsigned long long&)) const;

}  // namespace QELO
