#include "programs/webapi-exec/Answer.h"

#include <unistd.h>

#include <algorithm>
#include <array>
#include <cstdio>
#include <string>
#include <vector>

#include "programs/webapi-exec/Accounts.h"
#include "programs/webapi-exec/Call.h"
#include "programs/webapi-exec/Program.h"
#include "webapi/JsonHelper.h"
#include "webapi/WebAPIErrorText.h"

namespace QELO::ExecProgram {
namespace {

using JsonHelper::member;

constexpr size_t kColumns = 5;
using Row = std::array<std::string, kColumns>;

bool isControl(unsigned char first, unsigned char second) {
  return first == 0x7f || (first == 0xc2 && second >= 0x80 && second < 0xa0);
}

/// JSON text without control characters, which would command a terminal: those that JSON itself
/// lets stand as they are escaped too.
std::string forTerminal(const std::string& json) {
  std::string safe;
  for (size_t i = 0; i < json.size(); ++i) {
    const auto first = static_cast<unsigned char>(json[i]);
    const auto second = static_cast<unsigned char>(i + 1 < json.size() ? json[i + 1] : 0);
    if (!isControl(first, second)) {
      safe += json[i];
      continue;
    }
    char escape[8];
    snprintf(escape, sizeof escape, "\\u%04x", first == 0x7f ? first : second);
    safe += escape;
    i += first == 0x7f ? 0 : 1;
  }
  return safe;
}

std::string prettyText(const Json::Value& value) {
  Json::StreamWriterBuilder builder;
  builder["indentation"] = "  ";
  builder["emitUTF8"] = true;
  return forTerminal(Json::writeString(builder, value));
}

/// A text of the caller's file or of an answer as one cell.
std::string cell(const Json::Value& value) {
  std::string text = forTerminal(JsonHelper::asString(value));
  for (char& c : text) {
    c = static_cast<unsigned char>(c) < ' ' ? ' ' : c;
  }
  return text.empty() ? "-" : text;
}

bool succeeded(const Json::Value& answer) {
  return JsonHelper::asBool(member(answer, "success"));
}

int codeOf(const Json::Value& answer) {
  return JsonHelper::asInt(member(member(answer, "error"), "code"), WEBAPI_ERR_NO_ANSWER);
}

/// What the code of an answer that failed means; a call that was not run may have lacked rights.
/// @param call  its "api", "version" and "method"
std::string meaningOf(const Json::Value& answer, const Json::Value& call, const Options& options) {
  const int code = codeOf(answer);
  std::string text = "error " + std::to_string(code) + ": " + WebAPIErrorText(code);
  std::string user;
  if (code == WEBAPI_ERR_NO_ANSWER && findUser(options, user).empty()) {
    const std::string missing = missingRights(JsonHelper::asString(member(call, "api")),
                                              JsonHelper::asInt(member(call, "version")),
                                              JsonHelper::asString(member(call, "method")), user);
    text += missing.empty() ? "" : "; " + missing;
  }
  return text;
}

std::string outcome(const Json::Value& result, const Json::Value& call, const Options& options) {
  if (result.isNull()) {
    return "no answer";
  }
  return succeeded(result) ? "ok" : meaningOf(result, call, options);
}

ExitCode sayError(const std::string& meaning) {
  fprintf(stderr, "%s: %s\n", programName, meaning.c_str());
  return kFailed;
}

void printRows(const std::vector<Row>& rows) {
  std::array<size_t, kColumns> widths{};
  for (const Row& row : rows) {
    for (size_t i = 0; i < kColumns; ++i) {
      widths[i] = std::max(widths[i], row[i].size());
    }
  }
  for (const Row& row : rows) {
    for (size_t i = 0; i + 1 < kColumns; ++i) {
      printf("%-*s  ", static_cast<int>(widths[i]), row[i].c_str());
    }
    printf("%s\n", row.back().c_str());
  }
}

}  // namespace

void printAnswer(const Json::Value& answer) {
  printf("%s\n", isatty(STDOUT_FILENO) == 1 ? prettyText(answer).c_str()
                                            : JsonHelper::toString(answer).c_str());
}

ExitCode showAnswer(const Json::Value& answer) {
  printAnswer(answer);
  return succeeded(answer) ? kDone : sayError(meaningOf(answer, Json::Value(), Options()));
}

ExitCode showAnswer(const Options& options, const Json::Value& answer) {
  printAnswer(answer);
  Json::Value call;
  call["api"] = options.api;
  call["version"] = options.version != 0 ? options.version : 1;
  call["method"] = options.method;
  return succeeded(answer) ? kDone : sayError(meaningOf(answer, call, options));
}

ExitCode showTable(const Options& options, const Json::Value& answer) {
  if (!succeeded(answer)) {
    return sayError(meaningOf(answer, Json::Value(), options));
  }
  const Json::Value& calls = options.calls;
  const Json::Value& results = member(member(answer, "data"), "result");
  std::vector<Row> rows = {{"#", "API", "VERSION", "METHOD", "RESULT"}};
  size_t failed = 0;
  for (Json::ArrayIndex i = 0; i < calls.size(); ++i) {
    const Json::Value result = results.isArray() ? results.get(i, Json::Value()) : Json::Value();
    rows.push_back({std::to_string(i + 1), cell(member(calls[i], "api")),
                    cell(member(calls[i], "version")), cell(member(calls[i], "method")),
                    outcome(result, calls[i], options)});
    failed += succeeded(result) ? 0 : 1;
  }
  printRows(rows);
  if (failed == 0) {
    return kDone;
  }
  fprintf(stderr, "%s: %zu of %zu calls failed\n", programName, failed, rows.size() - 1);
  return kFailed;
}

}  // namespace QELO::ExecProgram
