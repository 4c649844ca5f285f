#include "webapi/WebEntry.h"

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <exception>
#include <memory>
#include <utility>

#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/WebAPIError.h"
#include "webapi/base/BrokenPipe.h"
#include "webapi/base/Log.h"
#include "webapi/base/MemoryBound.h"
#include "webapi/entry/ProcessGuard.h"
#include "webapi/entry/intake/Intake.h"
#include "webapi/entry/intake/UnreadBody.h"
#include "webapi/entry/output/AnswerText.h"
#include "webapi/entry/output/ErrorStatus.h"
#include "webapi/entry/output/WriteAnswer.h"
#include "webapi/entry/permission/PermissionCheck.h"
#include "webapi/entry/sharing/LinkCheck.h"
#include "webapi/json/Literal.h"
#include "webapi/platform/Cgi.h"
#include "webapi/platform/Sharing.h"
#include "webapi/platform/StringHash.h"
#include "webapi/runner/CompoundCall.h"
#include "webapi/runner/road/CallRoad.h"

namespace QELO {
namespace {

constexpr int kAddressSize = 65;  ///< bytes of a remote address with its NUL
/// Bytes of address space that a request may take before its method is called: three times what a
/// body as large as it may be does.
constexpr size_t kMostMemory = 256 << 20;
/// Bytes of a credential that comes as a parameter: copies of it go into cookies and environment.
constexpr long kLongestCredential = 4096;
/// Bytes of the name of an API or method, which each step takes copies of.
constexpr long kLongestName = 1 << 20;
constexpr char kSessionCookie[] = "id=";
constexpr char kOldSessionName[] = "abandoned";
constexpr char kTokenVariable[] = "qeloAccessToken";

/// A credential that may come as a parameter.
struct Credential {
  bool isSet = false;
  std::string value;
};

bool isLonger(const APIRequest& request, const char* name, long limit) {
  const char* begin = nullptr;
  const char* end = nullptr;
  const Json::Value& sent = request.GetParamRef(name, Json::Value::nullSingleton());
  return sent.getString(&begin, &end) && end - begin > limit;
}

/// @return false when the parameter is longer than kLongestCredential
bool readCredential(const APIRequest& request, const char* name, Credential& credential) {
  if (isLonger(request, name, kLongestCredential)) {
    return false;
  }
  const APIParameter<std::string> parameter =
      request.GetAndCheckString(name, APIRequest::PARAM_OPTIONAL, nullptr);
  // Environment variables end at a NUL, and a credential that something follows is another text.
  // What stands in its place is a part of none.
  std::string value = parameter.Get();
  std::replace(value.begin(), value.end(), '\0', '?');
  credential = {parameter.IsSet(), value};
  return true;
}

std::string environmentText(const char* name) {
  const char* text = getenv(name);
  return text != nullptr ? text : "";
}

/// Without it the platform's libraries would go on with the credentials that were there before.
/// @return false, logged, when the variable cannot be set
bool putEnvironment(const char* name, const std::string& value) {
  if (setenv(name, value.c_str(), 1) != 0) {
    WEBAPI_LOG("WebEntry.cpp", "cannot set %s [%m]", name);
    return false;
  }
  return true;
}

/// Adds the session cookie that counts, and renames the one before it.
void replaceSession(std::string& cookies, bool hadCookies, const std::string& sessionId) {
  if (hadCookies) {
    cookies += "; ";
    const size_t old = cookies.find(kSessionCookie);
    if (old != std::string::npos) {
      cookies.replace(old, strlen(kSessionCookie) - 1, kOldSessionName);
    }
  }
  cookies += kSessionCookie + sessionId;
}

/// No memory, most likely, is no reason to leave the client without an answer.
/// @return false, logged, when an exception was caught
template <typename Call>
bool guarded(Call call) {
  try {
    call();
    return true;
  } catch (const std::exception& error) {
    WEBAPI_LOG("WebEntry.cpp", "%s", LogText(error.what()).c_str());
  } catch (...) {
    WEBAPI_LOG("WebEntry.cpp", "an exception of no known kind");
  }
  return false;
}

/// Prints the response, unless the method has printed its own, and drops what is left of the body.
void answer(const APIResponse& response, CallRoad* road, UnreadBody& body) {
  if (road != nullptr && road->IsLeft()) {
    return;
  }
  // One text: what can fail does so before the first byte is out.
  const std::string text =
      response.IsEnableOutput() ? HeaderText(response) + BodyText(response) : "";
  if (road != nullptr) {
    road->Answer(text.size());
    if (road->IsLeft()) {
      return;
    }
  }
  const BrokenPipe tolerated;
  if (WriteAnswer(text, body)) {  // else there is nobody to keep an answer from
    body.Drop();
  }
}

}  // namespace

WebEntry::WebEntry()
    : temporaryFiles_(Json::arrayValue), cgiContext_(), permission_(Json::objectValue) {
  static_assert(sizeof cgiContext_ == sizeof(QeloCgiContext));
  permission_[Literal("permResult")] = Json::Value(Json::arrayValue);
  check_ = std::make_unique<PermissionCheck>(*this, *Request(), Context(), permission_);
}

WebEntry::~WebEntry() {
  guarded([this] { RemoveUpload(); });
  QLIBSZHASH* fields = nullptr;
  memcpy(&fields, cgiContext_, sizeof fields);
  if (fields != nullptr) {
    QLIBCSzHashFree(fields);
  }
}

QeloCgiContext* WebEntry::Context() {
  return reinterpret_cast<QeloCgiContext*>(cgiContext_);
}

void WebEntry::Serve() {
  if (!Initialize(Json::Value()) || !SetProcessName(Request(), Response())) {
    return;
  }
  if (Request()->HasParam("relay_zt")) {
    if (Road() != nullptr) {
      Road()->Leave();
    } else {
      ProcessRelay(Request(), Response());
    }
  } else {
    Process(Request(), Response());
  }
}

void WebEntry::GuardProcess() {
  CloseInheritedDescriptors();
  CleanEnvironment();
}

void WebEntry::ServeAndAnswer() {
  MemoryBound::Set(kMostMemory);
  UnreadBody body = UnreadBody::OfRequest();
  if (!guarded([this] { Serve(); })) {
    guarded([this] { Response()->SetError(WEBAPI_ERR_NO_ANSWER); });
  }
  if (tellsStatus_) {
    guarded([this] { SetErrorStatus(*Request(), *Response()); });
  }
  guarded([this] { RemoveUpload(); });  // a client that has its answer may have the process ended
  if (!guarded([&] { answer(*Response(), Road(), body); })) {
    // Of one of its own: what there was no memory for may stand in any part of the response.
    guarded([&] {
      Response()->SetError(WEBAPI_ERR_NO_ANSWER);
      APIResponse refusal(nullptr);
      refusal.SetError(WEBAPI_ERR_NO_ANSWER);
      answer(refusal, Road(), body);
    });
  }
  MemoryBound::Lift();  // callbacks are methods' own
}

bool WebEntry::Run(const Json::Value&) {
  ServeAndAnswer();
  bool isHandled = false;
  guarded([&] {
    if (Response()->GetHttpdRestart()) {
      Response()->SetCallbackFunc(RestartHttpd, nullptr);
    }
    isHandled = HandleCallback(Response());
  });
  return isHandled;
}

bool WebEntry::Initialize(const Json::Value&) {
  QeloCgiInit("", Context());
  QeloCgiLoadInCookies(Context());
  Request()->SetAttr("_collector_count_webapi", true);
  Request()->SetAttr(kAnswersOnOutput, true);
  Json::Value session(Json::objectValue);
  session[Literal("uiLang")] = std::string(QeloCgiGetLang(Context()));
  session[Literal("tokenEnable")] = Json::Int64{QeloCgiIsTokenEnable(Context())};
  Request()->InitSession(std::move(session));
  if (!GatherEnvironment()) {
    Response()->SetError(WEBAPI_ERR_BAD_REQUEST);
    return false;
  }
  Json::Value params(Json::objectValue);
  if (!InitParam(params)) {
    if (Response()->GetError() == WEBAPI_ERR_NONE) {
      Response()->SetError(WEBAPI_ERR_BAD_REQUEST);
    }
    return false;
  }
  Request()->InitParam(std::move(params), false);
  if (isLonger(*Request(), "api", kLongestName) || isLonger(*Request(), "method", kLongestName)) {
    Response()->SetError(WEBAPI_ERR_BAD_REQUEST);
    return false;
  }
  return RewriteCredentials();
}

bool WebEntry::GatherEnvironment() {
  Json::Value environment(Json::objectValue);
  if (!InitEnv(environment)) {
    return false;
  }
  char address[kAddressSize] = {};
  if (QeloCgiGetRemoteIP(address, kAddressSize) == 0) {
    environment[Literal("QELO_REMOTE_IP")] = std::string(address);
  }
  Request()->InitEnv(std::move(environment));
  return true;
}

/// Credentials given as parameters take the place of those in cookies and headers, in the process
/// environment too, where the platform's libraries look for them.
bool WebEntry::RewriteCredentials() {
  Credential session;
  Credential token;
  Credential sharing;
  Credential sharingSession;
  if (!readCredential(*Request(), "_sid", session) || !readCredential(*Request(), "tid", token) ||
      !readCredential(*Request(), "_sharing_id", sharing) ||
      !readCredential(*Request(), "_sharing_sid", sharingSession)) {
    Response()->SetError(WEBAPI_ERR_BAD_REQUEST);
    return false;
  }
  if (!session.isSet && !token.isSet && !sharing.isSet && !sharingSession.isSet) {
    return true;
  }
  std::string cookies = environmentText("HTTP_COOKIE");
  const bool hadCookies = !cookies.empty();
  std::string sharingHeader = environmentText(SZ_X_SHARING_HEADER);
  if (sharing.isSet) {
    sharingHeader = sharing.value;
    if (sharingSession.isSet) {
      cookies += hadCookies ? "; " : "";
      cookies += std::string(sharing::SZK_SHARING_SID) + "=" + sharingSession.value;
    }
  }
  if (session.isSet) {
    replaceSession(cookies, hadCookies, session.value);
  }
  const bool hasNewCookies = session.isSet || (sharing.isSet && sharingSession.isSet);
  if ((sharing.isSet && !putEnvironment(SZ_X_SHARING_HEADER, sharingHeader)) ||
      (hasNewCookies && !putEnvironment("HTTP_COOKIE", cookies))) {
    Response()->SetError(WEBAPI_ERR_NO_ANSWER);
    return false;
  }
  Json::Value environment(Json::objectValue);
  if (!session.isSet && token.isSet) {
    if (!putEnvironment(kTokenVariable, token.value)) {
      return false;
    }
    environment[kTokenVariable] = token.value;
  }
  QeloCgiLoadInCookies(Context());
  environment[Literal("HTTP_COOKIE")] = cookies;
  environment[Literal(SZ_X_SHARING_HEADER)] = sharingHeader;
  Request()->InitEnv(std::move(environment));
  return true;
}

bool WebEntry::NeedPermission(APIRequest* request) {
  return PermissionCheck::NeedPermission(request);
}

bool WebEntry::SkipPermission(APIRequest* request) {
  return PermissionCheck::SkipPermission(request);
}

bool WebEntry::CheckPermission(APIRequest* request, APIResponse* response) {
  return check_->CheckPermission(request, response);
}

int WebEntry::CheckPermission(bool allowTimeout) {
  return check_->CheckPermission(allowTimeout);
}

bool WebEntry::InitParam(Json::Value& params) {
  return Intake(*Request(), *Response(), *Context()).InitParam(params);
}

bool WebEntry::InitGetParam(Json::Value& section) {
  return Intake(*Request(), *Response(), *Context()).InitGetParam(section);
}

bool WebEntry::InitPostParam(Json::Value& section) {
  return Intake(*Request(), *Response(), *Context()).InitPostParam(section);
}

bool WebEntry::LoadUploadAPIDesc(Json::Value& section) {
  return Intake(*Request(), *Response(), *Context()).LoadUploadAPIDesc(section);
}

bool WebEntry::DetectAndDecryptParamLine(const std::string& line, Json::Value& section) {
  return Intake::DetectAndDecryptParamLine(line, section);
}

bool WebEntry::DecryptParam(const std::string& text, Json::Value& section) {
  return Intake::DecryptParam(text, section);
}

bool WebEntry::DecryptAESParam(Json::Value& section) {
  return Intake::DecryptAESParam(section);
}

}  // namespace QELO
