#include "OpenApi.h"

#include <webapi/JsonHelper.h>
#include <webapi/MethodDescription.h>

#include <algorithm>
#include <map>
#include <string>

#include "Dialect.h"

namespace {

namespace JsonHelper = QELO::JsonHelper;
using JsonHelper::member;
using QELO::MethodDescription;

constexpr char kMediaType[] = "application/json";

Json::Value Parse(const char* text) {
  Json::Value value;
  JsonHelper::fromString(text, value);
  return value;
}

Json::Value Components() {
  return Parse(R"({
    "schemas": {"Error": {
      "type": "object", "required": ["success", "error"],
      "properties": {"success": {"const": false}, "error": {
        "type": "object", "required": ["code"],
        "properties": {
          "code": {"type": "integer", "description": "100 to 399: the framework's; from 400: the API's"},
          "errors": {"description": "more about it; of wrong parameters a list of path, rule and message"}}}}}},
    "securitySchemes": {
      "accessToken": {"type": "apiKey", "in": "header", "name": "X-Qelo-Access-Token",
                      "description": "an access token"},
      "session": {"type": "apiKey", "in": "query", "name": "_sid", "description": "a session's id"},
      "cookie": {"type": "apiKey", "in": "cookie", "name": "id",
                 "description": "a session, with its anti-forgery token beside it"},
      "cookieToken": {"type": "apiKey", "in": "header", "name": "X-Qelo-Token",
                      "description": "the anti-forgery token of the session that comes by cookie"}}})");
}

/// A description's schema; any value when there is none that can be shown.
Json::Value SchemaOf(const Json::Value& schema) {
  const Json::Value expanded = MethodDescription::Expand(schema);
  return expanded.isNull() ? Json::Value(Json::objectValue) : Modern(expanded);
}

Json::Value Content(const Json::Value& schema) {
  Json::Value content(Json::objectValue);
  content[kMediaType]["schema"] = schema;
  return content;
}

Json::Value ErrorAnswer(const std::string& text) {
  Json::Value answer(Json::objectValue);
  answer["description"] = text;
  answer["content"] = Content(Parse(R"({"$ref": "#/components/schemas/Error"})"));
  return answer;
}

/// Whether something is wrong with what a description has by a key, as "/params".
bool IsFaulty(const Json::Value& attributes, const std::string& key) {
  const auto faults = MethodDescription(attributes).Faults();
  return std::any_of(faults.begin(), faults.end(), [&key](const MethodDescription::Fault& fault) {
    return fault.path.compare(0, key.size(), key) == 0;
  });
}

Json::Value GoodAnswer(const Json::Value& attributes) {
  Json::Value answer(Json::objectValue);
  if (JsonHelper::asBool(member(attributes, "allowDownload"))) {
    answer["description"] = "The file, whose type is its own";
    answer["content"]["*/*"] = Json::Value(Json::objectValue);
    return answer;
  }
  Json::Value schema = Parse(R"({"type": "object", "required": ["success"],
                                 "properties": {"success": {"const": true}}})");
  const Json::Value& returns = MethodDescription(attributes).GetReturns();
  schema["properties"]["data"] = returns.isNull() || IsFaulty(attributes, "/returns")
                                     ? Json::Value(Json::objectValue)
                                     : SchemaOf(returns);
  answer["description"] = "What the method gives";
  answer["content"] = Content(schema);
  return answer;
}

Json::Value Answers(const Json::Value& attributes) {
  Json::Value answers(Json::objectValue);
  answers["200"] = GoodAnswer(attributes);
  if (JsonHelper::asBool(member(attributes, "allowDownload"))) {
    answers["206"] = GoodAnswer(attributes);
    answers["206"]["description"] = "What a Range header asks for of the file";
  }
  answers["400"] = ErrorAnswer("Wrong parameters, code 101");
  answers["401"] = ErrorAnswer("Not logged in, or no longer");
  answers["403"] = ErrorAnswer("Not allowed to this caller");
  std::string own;
  for (const auto& [code, text] : MethodDescription(attributes).GetErrors()) {
    own += (own.empty() ? "" : "; ") + std::to_string(code) + ": " + text;
  }
  if (!own.empty()) {
    answers["422"] = ErrorAnswer(own);
  }
  answers["default"] = ErrorAnswer("Another error");
  return answers;
}

Json::Value Body(const Json::Value& attributes) {
  const MethodDescription described(attributes);
  Json::Value schema = described.GetParams().isNull() ? Json::Value(Json::objectValue)
                                                      : SchemaOf(described.GetParams());
  schema["type"] = "object";
  Json::Value body(Json::objectValue);
  body["content"] = Content(schema);
  body["required"] = !member(schema, "required").empty();
  if (described.GetExample().isObject()) {
    body["content"][kMediaType]["example"] = described.GetExample();
  }
  return body;
}

Json::Value Operation(const std::string& api, const std::string& version, const std::string& method,
                      const Json::Value& attributes, bool isForEverybody) {
  const MethodDescription described(attributes);
  Json::Value operation(Json::objectValue);
  operation["operationId"] = api + ".v" + version + "." + method;
  operation["tags"].append(api);
  const std::string summary = described.GetSummary();
  operation["summary"] = summary.empty() ? method + " of " + api : summary;
  if (!described.GetText().empty()) {
    operation["description"] = described.GetText();
  }
  operation["requestBody"] = Body(attributes);
  operation["responses"] = Answers(attributes);
  if (isForEverybody) {
    operation["security"] = Json::Value(Json::arrayValue);
  }
  return operation;
}

/// Adds an API's methods to the paths, and the names of those that take files to "uploads".
/// @return whether the paths have one of it
bool AddMethods(const Json::Value& api, Json::Value& paths, std::string& uploads) {
  const std::string name = JsonHelper::asString(member(api, "api"));
  const Json::Value& level = member(api, "authLevel");
  const bool isForEverybody = level.isInt() && JsonHelper::asInt(level) == 0;
  bool isShown = false;
  const Json::Value& versions = member(api, "methods");
  for (auto version = versions.begin(); version != versions.end(); ++version) {
    for (auto method = version->begin(); method != version->end(); ++method) {
      if (IsFaulty(*method, "/params")) {
        continue;  // which no call gets past
      }
      if (JsonHelper::asBool(member(*method, "allowUpload"))) {
        uploads += uploads.empty() ? "" : "; ";
        uploads += name + " " + version.name() + " " + method.name();
        continue;
      }
      isShown = true;
      paths["/" + name + "/v" + version.name() + "/" + method.name()]["post"] =
          Operation(name, version.name(), method.name(), *method, isForEverybody);
    }
  }
  return isShown;
}

/// A reader who misses them is told where they are.
void TellUploads(const std::string& uploads, Json::Value& document) {
  if (!uploads.empty()) {
    document["info"]["description"] =
        "Methods that take files have no address of their own. Send a form (multipart/form-data) "
        "to /webapi/entry.cgi, with api, version and method in the query or before the first "
        "file: " +
        uploads + ".";
  }
}

}  // namespace

Json::Value OpenApi(const Json::Value& apis) {
  Json::Value document(Json::objectValue);
  document["openapi"] = "3.1.0";
  document["info"] = Parse(R"({"title": "Web API", "version": "1"})");
  document["servers"] = Parse(R"([{"url": "/webapi/rest"}])");
  document["security"] =
      Parse(R"([{"accessToken": []}, {"session": []}, {"cookie": [], "cookieToken": []}])");
  document["components"] = Components();
  document["tags"] = Json::Value(Json::arrayValue);
  Json::Value& paths = document["paths"] = Json::Value(Json::objectValue);
  std::string uploads;
  for (const Json::Value& api : apis) {
    if (AddMethods(api, paths, uploads)) {
      document["tags"].append(Json::Value(Json::objectValue))["name"] = member(api, "api");
    }
  }
  TellUploads(uploads, document);
  return document;
}
