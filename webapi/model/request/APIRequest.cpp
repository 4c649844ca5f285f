#include "webapi/APIRequest.h"

#include <utility>

#include "webapi/JsonHelper.h"
#include "webapi/model/request/APIRequestPrivate.h"
#include "webapi/platform/Core.h"

namespace QELO {
namespace {

constexpr int kDirectorySize = 1024;

/// What a platform look-up of a directory fills in, or "/tmp".
std::string directoryOf(const std::string& name, int (*lookUp)(const char*, char*, int)) {
  char buffer[kDirectorySize] = {};
  return lookUp(name.c_str(), buffer, kDirectorySize) < 0 ? "/tmp" : buffer;
}

}  // namespace

APIRequest::APIRequest(const Json::Value& init)
    : private_(std::make_unique<APIRequestPrivate>(this)) {
  if (JsonHelper::hasMember(init, "environ")) {
    InitEnv(init["environ"]);
  }
  if (JsonHelper::hasMember(init, "getParam") || JsonHelper::hasMember(init, "postParam")) {
    InitParam(init, false);
  }
  if (JsonHelper::hasMember(init, "reqLib")) {
    InitAPIInfo(init["reqLib"]);
  }
  if (JsonHelper::hasMember(init, "session")) {
    InitSession(init["session"]);
  }
}

APIRequest::APIRequest(const APIRequest& other)
    : private_(std::make_unique<APIRequestPrivate>(*other.private_)) {}

APIRequest::~APIRequest() = default;

void APIRequest::InitEnv(const Json::Value& env) {
  private_->InitEnv(env);
}

void APIRequest::InitEnv(Json::Value&& env) {
  private_->InitEnv(std::move(env));
}

void APIRequest::InitParam(const Json::Value& params, bool replace) {
  private_->InitParam(params, replace);
}

void APIRequest::InitParam(Json::Value&& params, bool replace) {
  private_->InitParam(std::move(params), replace);
}

void APIRequest::KeepSentLine(std::string&& line) {
  private_->Sent().AddLine(std::move(line));
}

void APIRequest::KeepSentTexts(Json::Value&& texts) {
  private_->Sent().AddTexts(std::move(texts));
}

Json::Value APIRequest::GetSentTexts() const {
  return private_->Sent().Read();
}

void APIRequest::ForgetSentTexts() {
  private_->Sent().Forget();
}

void APIRequest::InitAPIInfo(const Json::Value& description) {
  private_->InitAPIInfo(description);
}

void APIRequest::InitSession(const Json::Value& session) {
  private_->InitSession(session);
}

void APIRequest::InitSession(Json::Value&& session) {
  private_->InitSession(std::move(session));
}

Json::Value& APIRequest::Serialize() {
  return private_->Serialize();
}

void APIRequest::Deserialize(Json::Value& record) {
  private_->Restore(record);
}

bool APIRequest::HasEnv(const std::string& name) const {
  return private_->HasData("environ", name);
}

Json::Value APIRequest::GetEnv(const std::string& name, const Json::Value& def) const {
  return private_->GetData("environ", name, def);
}

bool APIRequest::HasParam(const std::string& name) const {
  return private_->HasData("param", name);
}

Json::Value APIRequest::GetParam(const std::string& name, const Json::Value& def) const {
  return private_->GetData("param", name, def);
}

const Json::Value& APIRequest::GetParamRef(const std::string& name, const Json::Value& def) const {
  return private_->GetData("param", name, def);
}

bool APIRequest::HasCookie(const std::string& name) const {
  return private_->HasData("cookie", name);
}

std::string APIRequest::GetCookie(const std::string& name, const std::string& def) const {
  return private_->GetCookie(name, def);
}

bool APIRequest::SetCookie(const std::string& name, const std::string& value) {
  return private_->SetData("cookie", name, value, true);
}

bool APIRequest::HasAttr(const std::string& name) const {
  return private_->HasData("attr", name);
}

Json::Value APIRequest::GetAttr(const std::string& name, const Json::Value& def) const {
  return private_->GetData("attr", name, def);
}

bool APIRequest::SetAttr(const std::string& name, const Json::Value& value) {
  return private_->SetData("attr", name, value, false);
}

Json::Value APIRequest::GetAPIInfo(const std::string& name, const Json::Value& def) const {
  return private_->GetData("reqLib", name, def);
}

const Json::Value& APIRequest::GetAPIInfoRef(const std::string& name,
                                             const Json::Value& def) const {
  return private_->GetData("reqLib", name, def);
}

std::string APIRequest::GetAPIClass() const {
  return private_->Text("private", "api");
}

int APIRequest::GetAPIVersion() const {
  return private_->Number("private", "version", 0);
}

std::string APIRequest::GetAPIMethod() const {
  return private_->Text("private", "method");
}

int APIRequest::GetRequestMethod() const {
  return private_->Number("private", "requestMethod", METHOD_UNKNOWN);
}

std::string APIRequest::GetSessionID() const {
  return GetCookie("id", "");
}

std::string APIRequest::GetRemoteIP() const {
  return private_->Text("environ", "QELO_REMOTE_IP");
}

std::string APIRequest::GetUILanguage() const {
  return private_->Text("session", "uiLang", "enu");
}

bool APIRequest::IsTokenEnable() const {
  return private_->Flag("session", "tokenEnable", false, false);
}

bool APIRequest::IsAdmin() const {
  return private_->Flag("session", "isAdmin", false, false);
}

bool APIRequest::IsAuthorized() const {
  return private_->Flag("session", "isAuthorized", false, false);
}

bool APIRequest::IsSkipCheckIP() const {
  return private_->Flag("session", "isSkipCheckIP", true, false);
}

bool APIRequest::IsTimeout() const {
  return private_->Flag("session", "isTimeout", true, true);
}

int APIRequest::GetTimeoutDuration() const {
  return private_->Number("session", "timeout", 0);
}

std::string APIRequest::GetSessionFilePath() const {
  return private_->Text("session", "sessFile");
}

std::string APIRequest::GetApplication() const {
  return private_->Text("session", "app");
}

std::string APIRequest::GetWebAPIPriv() const {
  return private_->Text("session", "webapi");
}

std::string APIRequest::GetLoginUserName() const {
  return private_->Text("session", "username");
}

unsigned int APIRequest::GetLoginUID() const {
  return private_->GetLoginUID();
}

bool APIRequest::SetAuthResult(_tag_authorized_result_ result) {
  return private_->Put("session", "authResult", Json::Int64{result});
}

_tag_authorized_result_ APIRequest::GetAuthResult() const {
  return static_cast<_tag_authorized_result_>(
      private_->Number("session", "authResult", AUTHORIZED_UNKNOWN));
}

int APIRequest::GetAllowUser() const {
  return private_->GetAllowUser();
}

bool APIRequest::HasAppPriv(const std::string& name) const {
  return private_->HasAppPriv(name);
}

std::string APIRequest::GetPreferenceDir() const {
  return directoryOf(GetLoginUserName(), QELOUserPreferenceDirGet);
}

std::string APIRequest::GetGroupPreferenceDir(const std::string& group) const {
  return directoryOf(group, QELOGroupPreferenceDirGet);
}

bool APIRequest::IsDemoMode() const {
  return false;
}

bool APIRequest::IsPollingTask() const {
  return private_->IsPollingTask();
}

std::string APIRequest::GetPollingTaskId() const {
  return private_->Text("environ", "full_task_id");
}

bool APIRequest::IsUploadRequest() const {
  return private_->IsUploadRequest();
}

bool APIRequest::IsSliceUploadRequest() const {
  return private_->IsSliceUploadRequest();
}

const char* APIRequest::GetQeloAccessTokenID() const {
  return private_->GetQeloAccessTokenID();
}

std::string APIRequest::GetURLProto(const std::string& def) const {
  private_->InitURL();
  return private_->Text("url", "urlProto", def);
}

std::string APIRequest::GetURLHost(const std::string& def) const {
  private_->InitURL();
  return private_->Text("url", "urlHost", def);
}

int APIRequest::GetURLPort(int def) const {
  return private_->GetURLPort(def);
}

std::string APIRequest::GetURLPath(const std::string& def) const {
  private_->InitURL();
  return private_->Text("url", "urlPath", def);
}

std::string APIRequest::GetURLName(const std::string& def) const {
  private_->InitURL();
  return private_->Text("url", "urlName", def);
}

std::string APIRequest::GetSharingURL(const std::string& def) const {
  private_->InitSharingURL();
  return private_->Text("url", "urlSharing", def);
}

sharing::_tag_SHARING_URL_TYPE APIRequest::GetSharingURLType() const {
  private_->InitSharingURL();
  return static_cast<sharing::_tag_SHARING_URL_TYPE>(private_->sharingUrlType());
}

std::string APIRequest::GetSharingID() const {
  return private_->sharingId();
}

std::string APIRequest::GetSharingSID() const {
  return private_->sharingSid();
}

bool APIRequest::IsSharing() const {
  return !private_->sharingId().empty();
}

sharing::record::Entry APIRequest::GetSharingEntry() const {
  return private_->sharingEntry();
}

sharing::record::Session APIRequest::GetSharingSession() const {
  return private_->sharingSession();
}

sharing::record::Token APIRequest::GetSharingToken() const {
  return private_->sharingToken();
}

}  // namespace QELO
