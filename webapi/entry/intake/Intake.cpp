#include "webapi/entry/intake/Intake.h"

#include <syslog.h>
#include <unistd.h>

#include <cstring>
#include <exception>
#include <utility>

#include "webapi/APIRequest.h"
#include "webapi/APIResponse.h"
#include "webapi/JsonHelper.h"
#include "webapi/WebAPIError.h"
#include "webapi/base/LogText.h"
#include "webapi/entry/intake/RequestBody.h"
#include "webapi/json/Literal.h"
#include "webapi/model/request/CipherEnvelope.h"
#include "webapi/platform/Cgi.h"
#include "webapi/platform/Core.h"
#include "webapi/platform/Upload.h"
#include "webapi/platform/WebAPIUtil.h"

namespace QELO {
namespace {

constexpr char kQueryString[] = "QUERY_STRING";
constexpr char kResumableVersion[] = "HTTP_TUS_RESUMABLE";
constexpr char kPieceType[] = "application/offset+octet-stream";
constexpr char kUploadContentType[] = "text/plain; charset=\"UTF-8\"";
constexpr char kEnvelope[] = "webapi";
constexpr char kCipherToken[] = "__cIpHeRtOkEn";
constexpr int kCallFields = 3;  ///< what names a call: API, version and method
constexpr int kPartSize = 256;  ///< bytes of a part's header, and fields of an upload, as expected
constexpr int kExceptionLine = 275;  ///< administrators' log filters know the message by this line

/// The member `name` of the parameters, an object from now on.
Json::Value& sectionOf(Json::Value& params, const char* name) {
  if (params.type() != Json::objectValue) {
    params = Json::Value(Json::objectValue);
  }
  Json::Value& section = params[Literal(name)];
  if (section.type() != Json::objectValue) {
    section = Json::Value(Json::objectValue);
  }
  return section;
}

/// Whether a client of resumable uploads sends a piece of a file, or nothing. A form is none.
bool isResumable(const APIRequest& request) {
  const std::string type = JsonHelper::asString(request.GetEnv("CONTENT_TYPE", ""));
  return request.HasEnv(kResumableVersion) && (type.empty() || type == kPieceType);
}

PaceLimits bodyPace() {
  QLIBCTransferLimits limits{};
  QLIBCConfGetBodyLimits(&limits);
  PaceLimits pace;
  pace.leastRate = limits.leastRate;
  pace.window = std::chrono::seconds(limits.window);
  pace.longest = std::chrono::seconds(limits.longest);
  return pace;
}

bool namesCall(const Json::Value& section) {
  return JsonHelper::hasMember(section, "api") && JsonHelper::hasMember(section, "version") &&
         JsonHelper::hasMember(section, "method");
}

}  // namespace

bool Intake::InitParam(Json::Value& params) {
  if (request_.HasEnv(kQueryString) && !InitGetParam(sectionOf(params, "getParam"))) {
    return false;
  }
  if (request_.GetRequestMethod() != APIRequest::METHOD_POST) {
    return true;
  }
  if (isResumable(request_) && namesCall(JsonHelper::member(params, "getParam"))) {
    return true;  // the method reads the piece
  }
  bool taken = false;
  if (request_.IsUploadRequest()) {
    response_.SetHeader("Content-type", kUploadContentType);
    if (namesCall(JsonHelper::member(params, "getParam"))) {
      return true;  // the body is the upload handler's
    }
    taken = LoadUploadAPIDesc(sectionOf(params, "postParam"));
  } else {
    taken = InitPostParam(sectionOf(params, "postParam"));
  }
  if (!taken) {
    response_.SetError(WEBAPI_ERR_BAD_REQUEST);
  }
  return taken;
}

bool Intake::InitGetParam(Json::Value& section) {
  const Json::Value query = request_.GetEnv(kQueryString, Json::Value());
  if (query.type() != Json::stringValue) {
    response_.SetError(WEBAPI_ERR_BAD_REQUEST);
    return false;
  }
  return ReadAndKeep(JsonHelper::asString(query), section);
}

bool Intake::InitPostParam(Json::Value& section) {
  try {
    const int64_t length = JsonHelper::asInt64(request_.GetEnv("CONTENT_LENGTH", 0), 0);
    if (!section.isObject() || request_.IsUploadRequest() || length <= 0 ||
        length > RequestBody::kMaxLength) {
      return false;
    }
    std::string body;
    const bool received = RequestBody::Read(STDIN_FILENO, length, bodyPace(), body);
    RequestBody::CloseStandardInput();
    return received && !body.empty() && ReadAndKeep(std::move(body), section);
  } catch (const std::exception& error) {
    syslog(LOG_ERR, "%s:%d %s", "WebEntry", kExceptionLine, LogText(error.what()).c_str());
    return false;
  }
}

bool Intake::LoadUploadAPIDesc(Json::Value& section) {
  char part[kPartSize] = {};
  unsigned long long positions[2] = {};
  QLIBSZHASH* fields = nullptr;
  memcpy(&fields, context_.block, sizeof fields);
  if (fields == nullptr) {
    fields = QLIBCSzHashAlloc(kPartSize);
    memcpy(context_.block, &fields, sizeof fields);
  } else {
    QLIBCHashRemoveAll(fields);
  }
  if (QeloCgiLoadUploadNumParams(&context_, kCallFields, 0, positions, part, kPartSize) < 0) {
    return false;
  }
  Json::Value environment(Json::objectValue);
  environment["CONTENT_LENGTH"] = std::to_string(positions[1] - positions[0]);
  request_.InitEnv(std::move(environment));
  return WebAPIUtil::SzHashToJsonObj(fields, section);
}

bool Intake::DetectAndDecryptParamLine(const std::string& line, Json::Value& section) {
  return ReadLine(line, section);
}

bool Intake::ReadAndKeep(std::string line, Json::Value& section) {
  std::string read;
  const bool isRead = ReadLine(std::move(line), section, &read);
  request_.KeepSentLine(std::move(read));
  return isRead;
}

bool Intake::ReadLine(std::string line, Json::Value& section, std::string* read) {
  // Deciphered in place: the text ends at its first NUL, before and after.
  if (QeloCgiDetectAndDecryptParamLine(line.data()) == 0) {
    return false;
  }
  line.resize(strlen(line.c_str()));
  if (!CipherEnvelope::addLine(line, section)) {
    return false;
  }
  if (read != nullptr) {
    read->swap(line);
  }
  line = std::string();  // a body is as large as all that was made of it
  std::string opened;
  if (section.size() != 0 && !CipherEnvelope::openAes(section, &opened)) {
    return false;
  }
  if (read != nullptr && !opened.empty()) {
    *read += "&" + opened;
  }
  if (!JsonHelper::hasMember(JsonHelper::member(section, kEnvelope), CipherEnvelope::kCipherText)) {
    return true;
  }
  const std::string cipher = CipherEnvelope::take(section[kEnvelope], CipherEnvelope::kCipherText);
  DecryptParam(cipher, section[kEnvelope]);  // one that cannot be deciphered is left out
  section[kEnvelope].removeMember(kCipherToken);
  return true;
}

bool Intake::DecryptParam(const std::string& text, Json::Value& section) {
  return CipherEnvelope::openText(text, section) && (section.empty() || DecryptAESParam(section));
}

bool Intake::DecryptAESParam(Json::Value& section) {
  return CipherEnvelope::openAes(section);
}

}  // namespace QELO
