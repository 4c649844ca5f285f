#pragma once

#include <json/json.h>

#include <string>
#include <string_view>

#include "webapi/APIParameter.h"
#include "webapi/APIRequest.h"
#include "webapi/model/APIBase.h"
#include "webapi/model/request/SentTexts.h"
#include "webapi/platform/Sharing.h"

namespace QELO {

/// The state of a request.
///
/// Sections: "environ" (CGI variables), "cookie", "reqLib" (the API's description), "session"
/// (the caller), "param", "attr" (free for callers), "url", "userAgent", and "private" with "api",
/// "version", "method" and "requestMethod".
class APIRequestPrivate : public APIBase {
 public:
  explicit APIRequestPrivate(APIRequest* owner);
  /// The copy keeps the owner of the original.
  APIRequestPrivate(const APIRequestPrivate&) = default;

  void InitEnv(Json::Value env);
  void InitParam(Json::Value params, bool replace);
  void InitAPIInfo(const Json::Value& description);
  void InitSession(Json::Value session);
  /// Takes a deserialized store; what is kept beside the store is made anew from it.
  void Restore(Json::Value& record);

  /// Takes "api", "version" and "method" from parameters; what is missing stays as it was.
  void SetAPIDesc(const Json::Value& params);
  void InitCookie();
  void InitRequestMethod();
  void InitSharing();
  void InitURL();
  void InitSharingURL();
  /// Classifies the client by its user-agent header, once; without the header no flag is stored.
  void InitUA();

  /// Undoes both envelopes of enciphered parameters in place, down through "webapi".
  /// @return false when one cannot be deciphered; its members are gone all the same
  bool DecryptParam(Json::Value& section);
  /// Undoes the AES envelope of one level.
  bool DecryptAESParam(Json::Value& section);

  unsigned int GetLoginUID();
  int GetAllowUser();
  bool HasAppPriv(const std::string& name) const;
  const char* GetQeloAccessTokenID() const;
  bool IsPollingTask() const;
  bool IsUploadRequest() const;
  bool IsSliceUploadRequest() const;
  std::string GetCookie(const std::string& name, const std::string& def) const;
  int GetURLPort(int def);
  /// A flag of "userAgent".
  bool Device(const char* flag);

  /// A key's text or integer; `def` when it is missing or cannot be read as one.
  std::string Text(std::string_view section, std::string_view key,
                   const std::string& def = "") const;
  int Number(std::string_view section, std::string_view key, int def) const;
  /// A key's truth; `missing` without the key, `unreadable` when it holds none.
  bool Flag(std::string_view section, std::string_view key, bool missing, bool unreadable) const;

  template <typename T>
  APIParameter<T> GetAndCheckParam(const std::string& name, bool required, Json::ValueType type,
                                   bool (*validator)(const T&)) const;
  APIParameter<Json::Value> GetAndCheckUnitArrayParam(const std::string& name, bool required,
                                                      bool (*validator)(const Json::Value&)) const;

  SentTexts& Sent() { return sent_; }

  const std::string& sharingId() const { return sharingId_; }
  const std::string& sharingSid() const { return sharingSid_; }
  const sharing::record::Entry& sharingEntry() const { return sharingEntry_; }
  const sharing::record::Session& sharingSession() const { return sharingSession_; }
  const sharing::record::Token& sharingToken() const { return sharingToken_; }
  int sharingUrlType() const { return sharingUrlType_; }

 private:
  void Keep(bool isOfParameters, std::string& opened);
  void ParseProtocol();
  bool ParseHostAndPort();
  bool ParsePathAndName();

  APIRequest* owner_;
  Json::Value unused_;  ///< part of the record's layout; copied with it
  std::string sharingId_;
  std::string sharingSid_;
  sharing::record::Entry sharingEntry_;
  sharing::record::Session sharingSession_;
  sharing::record::Token sharingToken_;
  SentTexts sent_;
  int sharingUrlType_ = 0;  ///< a sharing::_tag_SHARING_URL_TYPE
};

}  // namespace QELO
