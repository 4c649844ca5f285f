#pragma once

#include <json/json.h>

#include <string>

struct QeloCgiContext;

namespace QELO {

class APIRequest;
class APIResponse;

/// Query string and request body become parameters, enciphered envelopes undone. The operations are
/// WebEntry's of the same name.
class Intake {
 public:
  /// @param request   has its environment
  /// @param response  receives error 101, and the content type of an upload's answer
  /// @param context   its string hash receives the fields of an upload
  Intake(APIRequest& request, APIResponse& response, QeloCgiContext& context)
      : request_(request), response_(response), context_(context) {}

  bool InitParam(Json::Value& params);
  bool InitGetParam(Json::Value& section);
  bool InitPostParam(Json::Value& section);
  bool LoadUploadAPIDesc(Json::Value& section);

  static bool DetectAndDecryptParamLine(const std::string& line, Json::Value& section);
  static bool DecryptParam(const std::string& text, Json::Value& section);
  static bool DecryptAESParam(Json::Value& section);

 private:
  /// DetectAndDecryptParamLine() of a line that nobody needs any longer.
  /// @param read  unless null, receives the line that was read
  static bool ReadLine(std::string line, Json::Value& section, std::string* read = nullptr);
  /// As that, and keeps the line with the request.
  bool ReadAndKeep(std::string line, Json::Value& section);

  APIRequest& request_;
  APIResponse& response_;
  QeloCgiContext& context_;
};

}  // namespace QELO
