#include "webapi/entry/output/AnswerText.h"

#include "webapi/APIResponse.h"
#include "webapi/JsonHelper.h"
#include "webapi/base/Utf8.h"
#include "webapi/model/response/HeaderLines.h"

namespace QELO {
namespace {

constexpr char kSource[] = "WebEntry.cpp";
/// Sent with every answer: it is nobody else's to guess its type, show it or keep it.
constexpr char kFixedLines[] =
    "X-Content-Type-Options: nosniff\r\n"
    "X-XSS-Protection: 1; mode=block\r\n"
    "Cache-Control: max-age=0, no-cache, no-store, must-revalidate\r\n"
    "Pragma: no-cache\r\n"
    "Expires: 0\r\n"
    "\r\n";

}  // namespace

std::string HeaderText(const APIResponse& response) {
  std::string text;
  for (const std::string& line : HeaderLines(response, kSource)) {
    text += line + "\r\n";
  }
  for (const std::string& line : CookieLines(response)) {
    text += line + "\r\n";
  }
  return text + kFixedLines;
}

std::string BodyText(const APIResponse& response) {
  // Names and texts of files may be of any bytes; JSON is UTF-8.
  return RepairUtf8(JsonHelper::toString(response.GetBody()));
}

}  // namespace QELO
