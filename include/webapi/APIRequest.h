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

/// What the authorisation of the caller came to. From 1 on the caller is who it says.
enum _tag_authorized_result_ : int {
  AUTHORIZED_ADDRESS_MISMATCH = -8,  ///< called from another address than logged in from
  AUTHORIZED_TOKEN_MISMATCH = -7,    ///< anti-forgery token missing or wrong
  AUTHORIZED_REFUSED = -6,           ///< the platform refused for another reason
  AUTHORIZED_UNAUTHENTICATED = -5,   ///< no such session, or the access token was refused
  AUTHORIZED_UNKNOWN = -4,           ///< not asked yet, or a malformed session id
  AUTHORIZED_BROKEN = -3,            ///< the session's record cannot be read
  AUTHORIZED_NO_SESSION = -2,        ///< neither session nor access token came
  AUTHORIZED_TIMED_OUT = -1,         ///< the session is past its idle limit
  AUTHORIZED_NONE = 0,               ///< not used
  AUTHORIZED_YES = 1,                ///< session or access token are good
  AUTHORIZED_YES_TIMED_OUT = 2,      ///< timed out, and the method allows that
};

/// One HTTP request, as the dispatcher and an API method see it.
///
/// Getters never fail: a missing value, or one that cannot be read as the type asked for, gives the
/// default named with the getter ("", 0 and false where none is named), or the one passed. Setters
/// say false, and nothing changes, for an empty name, and when a record that was changed in place
/// has no room for the value.
class WEBAPI_API APIRequest {
 public:
  /// Whether a missing parameter is an error.
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
  /// deciphered, and left out when that fails. "api", "version" and "method" among them name the
  /// call from now on.
  /// @param replace  drop the parameters there are first
  void InitParam(const Json::Value& params, bool replace);
  void InitParam(Json::Value&& params, bool replace);
  /// Keeps a parameter line, deciphered and otherwise as it was sent, beside the parameters that it
  /// became; and texts by name, an object. They stay with this object alone: neither a copy nor the
  /// record has them, and parameters that are replaced have none.
  void KeepSentLine(std::string&& line);
  void KeepSentTexts(Json::Value&& texts);
  /// What was kept, an object of texts by name.
  Json::Value GetSentTexts() const;
  void ForgetSentTexts();
  /// Replaces the API's description.
  void InitAPIInfo(const Json::Value& description);
  /// Replaces what is known of the caller, the cached user id and user classes included.
  void InitSession(const Json::Value& session);
  void InitSession(Json::Value&& session);

  /// The whole record; may be changed in place.
  Json::Value& Serialize();
  /// Swaps the whole record with `record`, and finds the sharing link of the new one.
  void Deserialize(Json::Value& record);

  /// CGI variables, by their names in the environment: "HTTP_USER_AGENT", "CONTENT_TYPE". They are
  /// the request's own: the process environment may hold others.
  bool HasEnv(const std::string& name) const;
  /// An empty name gives the object of all variables.
  Json::Value GetEnv(const std::string& name, const Json::Value& def = Json::Value()) const;
  /// Parameters as JSON values, of whatever type the client sent.
  bool HasParam(const std::string& name) const;
  /// An empty name gives the object of all parameters.
  Json::Value GetParam(const std::string& name, const Json::Value& def = Json::Value()) const;
  /// As GetParam without the copy; `def` must outlive the result.
  const Json::Value& GetParamRef(const std::string& name, const Json::Value& def) const;
  /// Cookies, percent-decoded; of two with one name the last counts.
  bool HasCookie(const std::string& name) const;
  std::string GetCookie(const std::string& name, const std::string& def = "") const;
  /// Changes what this request tells of the cookie. The client learns nothing of it; see
  /// APIResponse::AddCookie().
  bool SetCookie(const std::string& name, const std::string& value);
  /// Attributes: values that the program which made the request, hooks and methods leave for each
  /// other. A client cannot set them. Names with a leading "_" are the framework's.
  bool HasAttr(const std::string& name) const;
  /// An empty name gives the object of all attributes.
  Json::Value GetAttr(const std::string& name, const Json::Value& def = Json::Value()) const;
  bool SetAttr(const std::string& name, const Json::Value& value);
  /// A member of the API's description, defaults of lib.def filled in. An empty name gives the
  /// whole description.
  Json::Value GetAPIInfo(const std::string& name, const Json::Value& def = Json::Value()) const;
  /// As GetAPIInfo(), without a copy; `def` must outlive the result.
  const Json::Value& GetAPIInfoRef(const std::string& name, const Json::Value& def) const;

  /// The call, as the client named it.
  std::string GetAPIClass() const;   ///< the API's name, as "QELO.Host.Info"
  int GetAPIVersion() const;         ///< 0 when not sent
  std::string GetAPIMethod() const;  ///< the method of the API
  int GetRequestMethod() const;      ///< the HTTP method, a RequestMethod

  /// The login session's id, a secret: the cookie "id", or the parameter "_sid" in its place.
  std::string GetSessionID() const;
  /// The client's address as text, IPv4 or IPv6; behind a trusted proxy the one that it tells.
  std::string GetRemoteIP() const;
  /// The language for texts, three letters: the cookie "lang", else the host's setting. "enu" when
  /// not known.
  std::string GetUILanguage() const;
  /// Whether sessions that come by cookie need the anti-forgery token.
  bool IsTokenEnable() const;
  /// Whether the caller is a member of the group "administrators".
  bool IsAdmin() const;
  /// Whether session or access token were accepted. True does not yet mean that the caller may call
  /// the method.
  bool IsAuthorized() const;
  bool IsSkipCheckIP() const;  ///< the session is not bound to an address; true without a session
  bool IsTimeout() const;      ///< the session is past its idle limit; true without a session
  int GetTimeoutDuration() const;          ///< the idle limit of sessions, in seconds
  std::string GetSessionFilePath() const;  ///< the session's record, a file of the platform's
  std::string GetApplication() const;      ///< the application that the session was made for
  std::string GetWebAPIPriv() const;       ///< what the session says of "webapi", unread here
  std::string GetLoginUserName() const;    ///< the caller's account; "" for nobody
  /// The login user's id, or 0xFFFFFFFF for nobody and unknown users. Asked at the first call and
  /// kept, a failure too, until InitSession().
  unsigned int GetLoginUID() const;
  bool SetAuthResult(_tag_authorized_result_ result);
  _tag_authorized_result_ GetAuthResult() const;  ///< AUTHORIZED_UNKNOWN when not yet asked
  /// Which account kinds the API's description allows: 0x01 admin.local, 0x02 admin.domain,
  /// 0x04 admin.ldap, 0x08 normal.local, 0x10 normal.domain, 0x20 normal.ldap. Once it is not 0 it
  /// is kept until InitSession(), whatever description comes.
  int GetAllowUser() const;
  /// Whether `name` is the application privilege that the permission check found the caller to
  /// hold: the "appPriv" of the API's description. Others are not known, held or not.
  bool HasAppPriv(const std::string& name) const;
  /// The login user's directory for preferences: ".webapi" in the home directory, made as the
  /// user's own with mode 0700 when missing. "/tmp", which is everybody's, when there is none.
  std::string GetPreferenceDir() const;
  /// A group's, which root makes for its members (mode 2770). "/tmp" when there is none.
  std::string GetGroupPreferenceDir(const std::string& group) const;
  bool IsDemoMode() const;  ///< always false
  /// Whether this process is the background part of a polling task.
  bool IsPollingTask() const;
  std::string GetPollingTaskId() const;  ///< the full id: owner, "/", task id
  /// Whether the body is an upload: "multipart/form-data", or a slice of a file.
  bool IsUploadRequest() const;
  bool IsSliceUploadRequest() const;  ///< the header X-TYPE-NAME is "SLICEUPLOAD"
  /// The access token, a secret, or null. The text belongs to the process environment, into which
  /// each call puts it, and holds until the variable "qeloAccessToken" is set again.
  const char* GetQeloAccessTokenID() const;

  /// The address that the client called, read at the first question and kept: "http" or "https";
  /// the header Host, by which the client may name any; what stands before "?".
  std::string GetURLProto(const std::string& def) const;
  std::string GetURLHost(const std::string& def) const;  ///< IPv6 literals with their brackets
  int GetURLPort(int def) const;                         ///< 80 or 443 when Host names none
  std::string GetURLPath(const std::string& def) const;  ///< up to and including the last "/"
  std::string GetURLName(const std::string& def) const;  ///< after the last "/"
  /// The address that sharing links of this host start with; made at the first question and kept.
  std::string GetSharingURL(const std::string& def) const;
  sharing::_tag_SHARING_URL_TYPE GetSharingURLType() const;
  /// The sharing link that the request came by; the records are empty ones without it.
  std::string GetSharingID() const;
  std::string GetSharingSID() const;  ///< the visitor's session, a secret
  bool IsSharing() const;             ///< whether there is a sharing id, known or not
  sharing::record::Entry GetSharingEntry() const;
  sharing::record::Session GetSharingSession() const;
  sharing::record::Token GetSharingToken() const;

  /// The client's device, by its user-agent header: classified once, at the first of these
  /// queries, and kept with the record; without the header all are false. They tell how to present
  /// something, and nothing that may be relied upon: clients call themselves what they like, an
  /// iPad of today a desktop computer.
  bool IsMobile() const;  ///< mobile, unless the cookie "forceDesktop" begins with a number but 0
  bool IsMobileDevice() const;   ///< a mobile device, whatever the cookie says
  bool IsIPhone() const;         ///< iOS: an iPhone, iPod or iPad
  bool IsAndroid() const;        ///< Android, phone or tablet
  bool IsIEMobile() const;       ///< a mobile device that names "msie" or "iemobile"
  bool IsIPad() const;           ///< an iPad; IsIPhone() is true too
  bool IsPlayBook() const;       ///< a PlayBook tablet
  bool IsBlackBerry6() const;    ///< a BlackBerry whose browser is WebKit
  bool IsWebKit() const;         ///< WebKit, on whatever device
  bool IsSupportWebApp() const;  ///< WebKit on iOS, Android, PlayBook or BlackBerry

  /// Typed parameters: nothing is converted, so the client's type must be the one asked for.
  /// @param validator  says whether a value of the right type will do; null: every one does.
  ///                   It is not asked about null, which is accepted as "reset".
  /// @return see APIParameter: invalid when required and missing, of another type or out of range,
  ///         or refused by the validator
  ///
  /// An integer of 32 bits; 5.0 is none.
  APIParameter<int> GetAndCheckInt(const std::string& name,
                                   PARAM_NECESSITY necessity = PARAM_REQUIRED,
                                   bool (*validator)(const int&) = nullptr) const;
  /// true or false; 1 and 0 are none.
  APIParameter<bool> GetAndCheckBool(const std::string& name,
                                     PARAM_NECESSITY necessity = PARAM_REQUIRED,
                                     bool (*validator)(const bool&) = nullptr) const;
  /// Any number.
  APIParameter<double> GetAndCheckReal(const std::string& name,
                                       PARAM_NECESSITY necessity = PARAM_REQUIRED,
                                       bool (*validator)(const double&) = nullptr) const;
  /// A string, of any length and any bytes but for the limits of a request.
  APIParameter<std::string> GetAndCheckString(
      const std::string& name, PARAM_NECESSITY necessity = PARAM_REQUIRED,
      bool (*validator)(const std::string&) = nullptr) const;
  /// A list; its elements are the validator's to check.
  APIParameter<Json::Value> GetAndCheckArray(const std::string& name,
                                             PARAM_NECESSITY necessity = PARAM_REQUIRED,
                                             bool (*validator)(const Json::Value&) = nullptr) const;
  /// An object; APIParameterFactory reads its members.
  APIParameter<Json::Value> GetAndCheckObject(
      const std::string& name, PARAM_NECESSITY necessity = PARAM_REQUIRED,
      bool (*validator)(const Json::Value&) = nullptr) const;
  /// As GetAndCheckArray, but a single value (null too) counts as a list of one.
  APIParameter<Json::Value> GetAndCheckUnitArray(
      const std::string& name, PARAM_NECESSITY necessity = PARAM_REQUIRED,
      bool (*validator)(const Json::Value&) = nullptr) const;
  /// An integer that fits T: long long, unsigned int or unsigned long long.
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
