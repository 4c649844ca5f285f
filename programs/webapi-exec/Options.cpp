#include "programs/webapi-exec/Options.h"

#include <getopt.h>

#include <fstream>
#include <iostream>
#include <iterator>

#include "webapi/JsonHelper.h"
#include "webapi/base/Number.h"
#include "webapi/platform/WebAPIUtil.h"

namespace QELO::ExecProgram {

const char kHelp[] =
    "Calls a web API of this host, without a login: as the user who calls, or as root for any.\n"
    "\n"
    "webapi-exec --api API --method METHOD [OPTION...]\n"
    "    Makes one call and prints its answer, for people on a terminal, else as one line of "
    "JSON.\n"
    "    --version N         version of the API, 1 when not given\n"
    "    --user NAME         user to call as; only root may name another account. In an ordinary\n"
    "                        user's private root that user may name any account of it\n"
    "    --param NAME=VALUE  parameter; a value that is a JSON text counts as that, like on the\n"
    "                        wire: 5 is a number, true a boolean, '\"5\"' and five are texts\n"
    "    --json FILE         object of parameters, \"-\" for standard input; --param counts "
    "before\n"
    "    --upload NAME=FILE  sends a file as the field NAME of a form\n"
    "    --output FILE       gets the download, else it is dropped; one that broke off goes on\n"
    "webapi-exec --follow --api API --method METHOD [OPTION...]\n"
    "webapi-exec --follow --task ID [--user NAME]\n"
    "    Starts a background task, or takes one that runs; shows its progress on a terminal, and\n"
    "    prints its result when it ends. Ctrl-C asks whether to stop it or to leave it running.\n"
    "webapi-exec --batch FILE [--user NAME] [--param NAME=VALUE...]\n"
    "    Makes the calls that FILE lists and shows a table of the results. FILE, or \"-\", holds "
    "a\n"
    "    JSON list of objects with \"api\", \"version\", \"method\" and parameters, or an object "
    "whose\n"
    "    \"compound\" is such a list.\n"
    "    --param mode=parallel          all at once\n"
    "    --param stop_when_error=true   none after the first that fails\n"
    "webapi-exec --list [--api API [--version N]]\n"
    "    Prints the names of the APIs, or of an API's methods.\n"
    "webapi-exec --help, -h\n"
    "\n"
    "Exit status: 0 success; 1 the call, one of the batch, or the task failed or could not be "
    "made;\n"
    "2 wrong use; 130 the task goes on. Standard error says what an error code means.\n";

namespace {

enum Option {
  kHelpOption = 'h',
  kList = 256,  // no character, which would be a short option
  kApi,
  kVersion,
  kMethod,
  kUser,
  kParam,
  kJson,
  kUpload,
  kOutput,
  kBatch,
  kFollow,
  kTask
};

constexpr option kOptions[] = {{"help", no_argument, nullptr, kHelpOption},
                               {"list", no_argument, nullptr, kList},
                               {"api", required_argument, nullptr, kApi},
                               {"version", required_argument, nullptr, kVersion},
                               {"method", required_argument, nullptr, kMethod},
                               {"user", required_argument, nullptr, kUser},
                               {"param", required_argument, nullptr, kParam},
                               {"json", required_argument, nullptr, kJson},
                               {"upload", required_argument, nullptr, kUpload},
                               {"output", required_argument, nullptr, kOutput},
                               {"batch", required_argument, nullptr, kBatch},
                               {"follow", no_argument, nullptr, kFollow},
                               {"task", required_argument, nullptr, kTask},
                               {nullptr, 0, nullptr, 0}};

std::string readVersion(const std::string& text, int& version) {
  return ParseNumber(text, version) && version > 0 ? "" : "--version takes a number from 1 on";
}

/// Reads "name=value" by the rule for parameters on the wire.
/// @param sent  receives the value as it was given
std::string readParam(const std::string& text, Json::Value& params, Json::Value& sent) {
  const size_t equals = text.find('=');
  if (equals == std::string::npos || equals == 0) {
    return "--param takes NAME=VALUE";
  }
  const std::string line = WebAPIUtil::URLEncode(text.substr(0, equals)) + "=" +
                           WebAPIUtil::URLEncode(text.substr(equals + 1));
  WebAPIUtil::strPairToJsonObj(line, params, true, true);
  WebAPIUtil::strPairToJsonObj(line, sent, true, false);
  return "";
}

std::string readJson(const std::string& file, Json::Value& value) {
  if (file == "-") {
    const std::string text(std::istreambuf_iterator<char>(std::cin), {});
    return JsonHelper::fromString(text, value) ? "" : "standard input is no JSON";
  }
  return JsonHelper::fromFile(file, value) ? "" : file + " cannot be read as JSON";
}

std::string readParams(const std::string& file, const Json::Value& given, Json::Value& params) {
  if (!file.empty()) {
    const std::string wrong = readJson(file, params);
    if (!wrong.empty() || !params.isObject()) {
      return !wrong.empty() ? wrong : "--json takes an object of parameters";
    }
  }
  for (const std::string& name : given.getMemberNames()) {
    params[name] = given[name];
  }
  return "";
}

std::string readBatch(Options& options) {
  Json::Value file;
  const std::string wrong = readJson(options.batch, file);
  if (!wrong.empty()) {
    return wrong;
  }
  options.calls = file.isArray() ? file : JsonHelper::member(file, "compound");
  if (!options.calls.isArray()) {
    return "--batch takes a list of calls, or an object whose \"compound\" is one";
  }
  const Json::Value given = options.params;
  options.params = file.isObject() ? file : Json::Value(Json::objectValue);
  options.params["compound"] = options.calls;
  return readParams("", given, options.params);
}

/// What is missing or does not go together.
std::string check(const Options& options, bool hasJson) {
  const bool names = !options.api.empty() || !options.method.empty() || options.version != 0;
  if (!options.task.empty() || (options.follow && (options.list || !options.batch.empty()))) {
    const bool others = options.list || names || hasJson || !options.params.empty() ||
                        !options.output.empty() || !options.batch.empty() ||
                        !options.uploads.empty();
    return options.follow && !others ? ""
                                     : "--follow goes with one call, or with --task and --user";
  }
  if (!options.batch.empty()) {
    return options.list || names || hasJson || !options.output.empty() || !options.uploads.empty()
               ? "--batch goes with --user and --param alone"
               : "";
  }
  if (options.list) {
    return options.method.empty() && (!options.api.empty() || options.version == 0)
               ? ""
               : "--list goes with --api, and --version with that";
  }
  return options.api.empty() || options.method.empty() ? "--api and --method are needed" : "";
}

std::string readUpload(const std::string& text,
                       std::vector<std::pair<std::string, std::string>>& uploads) {
  const size_t equals = text.find('=');
  if (equals == std::string::npos || equals == 0 || equals + 1 == text.size()) {
    return "--upload takes NAME=FILE";
  }
  uploads.emplace_back(text.substr(0, equals), text.substr(equals + 1));
  return "";
}

std::string takeWord(const std::string& argument, const char* rule, std::string& word) {
  word = argument;
  return argument.empty() ? rule : "";
}

/// Takes one option's argument. @return what is wrong, or ""
std::string take(int option, const std::string& argument, Options& options, std::string& json) {
  switch (option) {
    case kHelpOption:
      options.help = true;
      return "";
    case kList:
      options.list = true;
      return "";
    case kApi:
      options.api = argument;
      return "";
    case kVersion:
      return readVersion(argument, options.version);
    case kMethod:
      options.method = argument;
      return "";
    case kUser:
      // An empty name, as of a variable that is not set, must not mean the caller, who may be root.
      return takeWord(argument, "--user takes a name", options.user);
    case kParam:
      return readParam(argument, options.params, options.sent);
    case kJson:
      return takeWord(argument, "--json takes a file", json);
    case kUpload:
      return readUpload(argument, options.uploads);
    case kOutput:
      return takeWord(argument, "--output takes a file", options.output);
    case kBatch:
      return takeWord(argument, "--batch takes a file", options.batch);
    case kFollow:
      options.follow = true;
      return "";
    case kTask:
      return takeWord(argument, "--task takes a task's id", options.task);
    default:
      return "wrong option";  // getopt has said which
  }
}

}  // namespace

std::string readOptions(int argc, char** argv, Options& options) {
  std::string json;
  int option = 0;
  while ((option = getopt_long(argc, argv, "h", kOptions, nullptr)) != -1) {
    const std::string wrong = take(option, optarg != nullptr ? optarg : "", options, json);
    if (!wrong.empty() || options.help) {
      return wrong;
    }
  }
  if (optind < argc) {
    return std::string(argv[optind]) + " is no option";
  }
  const std::string wrong = check(options, !json.empty());
  if (!wrong.empty()) {
    return wrong;
  }
  if (!options.batch.empty()) {
    return readBatch(options);
  }
  const Json::Value given = options.params;
  return readParams(json, given, options.params);
}

}  // namespace QELO::ExecProgram
