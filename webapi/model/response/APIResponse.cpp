#include "webapi/APIResponse.h"

#include <cerrno>
#include <cstdlib>
#include <utility>

#include "webapi/JsonHelper.h"
#include "webapi/model/response/APIResponsePrivate.h"

namespace QELO {
namespace {

constexpr char kServerError[] = "x-request-error";

}  // namespace

APIResponse::APIResponse(APIRequest* request)
    : private_(std::make_unique<APIResponsePrivate>(request, this)) {
  private_->Put("headers", "Content-type", std::string("application/json; charset=\"UTF-8\""));
}

APIResponse::~APIResponse() = default;

void APIResponse::SetSuccess(const Json::Value& data) {
  SetError(0, data);
}

void APIResponse::SetError(int code, const Json::Value& data) {
  private_->SetError(code, data);
}

int APIResponse::GetError() const {
  return JsonHelper::asInt(private_->GetData("code", 0));
}

Json::Value APIResponse::GetBody() const {
  return private_->GetData("body", Json::objectValue);
}

bool APIResponse::HasHeader(const std::string& name) const {
  return private_->HasData("headers", name);
}

bool APIResponse::SetHeader(const std::string& name, const std::string& value) {
  return private_->SetData("headers", name, value, true);
}

std::string APIResponse::GetHeader(const std::string& name, const std::string& def) const {
  return JsonHelper::asString(private_->GetData("headers", name, def), def);
}

Json::Value APIResponse::GetHeaders() const {
  return private_->GetData("headers", Json::objectValue);
}

Json::Value APIResponse::GetCookies() const {
  return private_->GetData("setCookie", Json::arrayValue);
}

bool APIResponse::AddCookie(const std::string& name, const std::string& value,
                            const std::string& path, long expireMinutes, const std::string& domain,
                            bool secure, bool httpOnly) {
  return private_->AddCookie(name, value, path, expireMinutes, domain, secure, httpOnly);
}

bool APIResponse::SetStatus(_tag_HTTP_STATUS_CODE code, const std::string& message) {
  return private_->SetStatus(code, message);
}

int APIResponse::GetStatus() const {
  // Only the front is read: a method may set the header with a reason behind the code.
  const std::string text = GetHeader("Status", "200");
  errno = 0;
  const long code = std::strtol(text.c_str(), nullptr, 10);
  return errno == 0 && std::in_range<int>(code) ? static_cast<int>(code) : 0;
}

bool APIResponse::Redirect(const std::string& path) {
  return private_->Redirect(path) && SetStatus(HTTP_STATUS_FOUND, "");
}

bool APIResponse::SetEnableOutput(bool enable) {
  return private_->SetData("option", "isDownload", enable, false);
}

bool APIResponse::IsEnableOutput() const {
  return JsonHelper::asBool(private_->GetData("option", "isDownload", true), true);
}

bool APIResponse::SetHttpdRestart(bool restart) {
  return private_->SetData("option", "restart_httpd", restart, false);
}

bool APIResponse::GetHttpdRestart() const {
  return JsonHelper::asBool(private_->GetData("option", "restart_httpd", false));
}

void APIResponse::SetServerError(const std::string& word) {
  SetHeader(kServerError, word);
}

std::string APIResponse::GetServerError() const {
  return GetHeader(kServerError, "");
}

bool APIResponse::HasServerError() const {
  return HasHeader(kServerError);
}

void APIResponse::SetCallbackFunc(CallbackFunc function, void* argument) {
  private_->SetCallbackFunc(function, argument);
}

void APIResponse::SetCallbackFuncs(CallbackList* callbacks) {
  if (callbacks == nullptr) {
    return;
  }
  for (const auto& [function, argument] : *callbacks) {
    SetCallbackFunc(function, argument);
  }
}

APIResponse::CallbackList* APIResponse::GetCallbackFuncs() {
  return &private_->callbacks();
}

Json::Value& APIResponse::Serialize() {
  return private_->Serialize();
}

void APIResponse::Deserialize(Json::Value& record) {
  private_->Deserialize(record);
}

}  // namespace QELO
