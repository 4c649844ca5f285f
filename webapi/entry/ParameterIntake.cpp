// The web entry's parameter intake: query string and request body become parameters, enciphered
// envelopes undone.

#include <syslog.h>
#include <unistd.h>

#include <exception>

#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/JsonHelper.h"
#include "webapi/WebAPIError.h"
#include "webapi/WebEntry.h"
#include "webapi/entry/RequestBody.h"
#include "webapi/platform/Cgi.h"
#include "webapi/platform/Credential.h"
#include "webapi/platform/Token.h"
#include "webapi/platform/WebAPIUtil.h"

namespace QELO {
namespace {

constexpr char kQueryString[] = "QUERY_STRING";
constexpr char kUploadContentType[] = "text/plain; charset=\"UTF-8\"";
constexpr char kEnvelope[] = "webapi";
constexpr char kCipherText[] = "__cIpHeRtExT";
constexpr char kCipherToken[] = "__cIpHeRtOkEn";
constexpr char kAesToken[] = "__nEkOtReHpIc";
constexpr char kAesText[] = "__tXeTrEhPiC";
constexpr int kAesKeySize = 33;      ///< bytes of the key's text with its NUL
constexpr int kExceptionLine = 275;  ///< administrators' log filters know the message by this line

/// The member `name` of the parameters, an object from now on.
Json::Value& sectionOf(Json::Value& params, const char* name) {
  if (!params.isObject()) {
    params = Json::Value(Json::objectValue);
  }
  Json::Value& section = params[name];
  if (!section.isObject()) {
    section = Json::Value(Json::objectValue);
  }
  return section;
}

bool namesCall(const Json::Value& section) {
  return JsonHelper::hasMember(section, "api") && JsonHelper::hasMember(section, "version") &&
         JsonHelper::hasMember(section, "method");
}

/// Removes the member from an object that has it and gives its text.
std::string takeText(Json::Value& section, const char* name) {
  Json::Value value;
  section.removeMember(name, &value);
  return JsonHelper::asString(value);
}

/// Adds a parameter line's names and values to the section.
bool parseLine(const std::string& line, Json::Value& section) {
  return WebAPIUtil::strPairToJsonObj(line, section, true, true);
}

}  // namespace

bool WebEntry::InitParam(Json::Value& params) {
  if (Request()->HasEnv(kQueryString) && !InitGetParam(sectionOf(params, "getParam"))) {
    return false;
  }
  if (Request()->GetRequestMethod() != APIRequest::METHOD_POST) {
    return true;
  }
  bool taken = false;
  if (Request()->IsUploadRequest()) {
    Response()->SetHeader("Content-type", kUploadContentType);
    if (namesCall(JsonHelper::member(params, "getParam"))) {
      return true;  // the body is the upload handler's
    }
    taken = LoadUploadAPIDesc(sectionOf(params, "postParam"));
  } else {
    taken = InitPostParam(sectionOf(params, "postParam"));
  }
  if (!taken) {
    Response()->SetError(WEBAPI_ERR_BAD_REQUEST);
  }
  return taken;
}

bool WebEntry::InitGetParam(Json::Value& section) {
  const Json::Value query = Request()->GetEnv(kQueryString, Json::Value());
  if (!query.isString()) {
    Response()->SetError(WEBAPI_ERR_BAD_REQUEST);
    return false;
  }
  return DetectAndDecryptParamLine(query.asString(), section);
}

bool WebEntry::InitPostParam(Json::Value& section) {
  try {
    const int64_t length = JsonHelper::asInt64(Request()->GetEnv("CONTENT_LENGTH", 0), 0);
    if (!section.isObject() || Request()->IsUploadRequest() || length <= 0 ||
        length > RequestBody::kMaxLength) {
      return false;
    }
    std::string body;
    const bool received = RequestBody::Read(STDIN_FILENO, length, RequestBody::kIdleLimit, body);
    RequestBody::CloseStandardInput();
    return received && !body.empty() && DetectAndDecryptParamLine(body, section);
  } catch (const std::exception& error) {
    syslog(LOG_ERR, "%s:%d %s", "WebEntry", kExceptionLine, error.what());
    return false;
  }
}

bool WebEntry::DetectAndDecryptParamLine(const std::string& line, Json::Value& section) {
  std::string copy = line;
  // Deciphered in place: the text ends at its first NUL, before and after.
  if (QeloCgiDetectAndDecryptParamLine(copy.data()) == 0 || !parseLine(copy.c_str(), section)) {
    return false;
  }
  if (!section.empty() && !DecryptAESParam(section)) {
    return false;
  }
  if (!JsonHelper::hasMember(JsonHelper::member(section, kEnvelope), kCipherText)) {
    return true;
  }
  const std::string cipher = takeText(section[kEnvelope], kCipherText);
  DecryptParam(cipher, section[kEnvelope]);  // one that cannot be deciphered is left out
  section[kEnvelope].removeMember(kCipherToken);
  return true;
}

bool WebEntry::DecryptParam(const std::string& text, Json::Value& section) {
  std::string copy = text;
  if (QeloCgiDecryptParam(copy.data()) == 0 || !parseLine(copy.c_str(), section)) {
    return false;
  }
  return section.empty() || DecryptAESParam(section);
}

bool WebEntry::DecryptAESParam(Json::Value& section) {
  if (!JsonHelper::hasMember(section, kAesToken) || !JsonHelper::hasMember(section, kAesText)) {
    return true;
  }
  const std::string token = takeText(section, kAesToken);
  const std::string text = takeText(section, kAesText);
  if (token.empty() || text.empty()) {
    return false;
  }
  char key[kAesKeySize] = {};
  if (QELOCloudServiceZttokenGenerateToken(token.c_str(), key, kAesKeySize) < 0) {
    return false;
  }
  std::string plain;
  return CredRequestUtil::GetDecryptAESString(key, text, plain) && parseLine(plain, section);
}

}  // namespace QELO
