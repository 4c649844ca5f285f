#include "webapi/testing/TestAnswer.h"

#include <strings.h>

#include <ostream>

#include "webapi/JsonHelper.h"

namespace QELO {
namespace {

Json::Value parsed(const std::string& body) {
  Json::Value value;
  JsonHelper::fromString(body, value);
  return value;
}

}  // namespace

bool TestAnswer::IsSuccess() const {
  return JsonHelper::asBool(JsonHelper::member(parsed(body), "success"));
}

int TestAnswer::Code() const {
  const Json::Value json = parsed(body);
  if (!json.isObject()) {
    return -1;
  }
  return JsonHelper::asInt(JsonHelper::member(JsonHelper::member(json, "error"), "code"));
}

Json::Value TestAnswer::Data() const {
  return JsonHelper::member(parsed(body), "data");
}

Json::Value TestAnswer::Errors() const {
  const Json::Value json = parsed(body);
  return JsonHelper::member(JsonHelper::member(json, "error"), "errors");
}

std::string TestAnswer::Header(const std::string& name) const {
  for (const std::string& line : headers) {
    const size_t colon = line.find(": ");
    if (colon == name.size() && strncasecmp(line.c_str(), name.c_str(), colon) == 0) {
      return line.substr(colon + 2);
    }
  }
  return "";
}

std::ostream& operator<<(std::ostream& stream, const TestAnswer& answer) {
  stream << "status " << answer.status << (answer.isCalled ? "" : ", the method was not called")
         << "\n";
  for (const std::string& line : answer.headers) {
    stream << line << "\n";
  }
  return stream << answer.body << "\n";
}

}  // namespace QELO
