#include "programs/webapi/Arguments.h"

#include <algorithm>
#include <cstdio>

#include "programs/webapi-exec/Text.h"
#include "webapi/base/LogText.h"

namespace QELO::AuthorProgram {
namespace {

/// Takes the option at `at`, and its value. @return what is wrong, or ""
std::string takeOption(const Arguments& arguments, size_t& at, const std::vector<Option>& options) {
  const std::string& argument = arguments[at];
  const size_t equals = argument.find('=');
  const std::string name = argument.substr(0, equals);
  const auto option = std::find_if(options.begin(), options.end(),
                                   [&](const Option& known) { return name == known.name; });
  if (option == options.end()) {
    return Shown(name) + " is no option";
  }
  if (option->flag != nullptr) {
    *option->flag = true;
    return equals == std::string::npos ? "" : name + " takes no value";
  }
  if (equals == std::string::npos && at + 1 == arguments.size()) {
    return name + " needs a value";
  }
  *option->value = equals == std::string::npos ? arguments[++at] : argument.substr(equals + 1);
  return option->value->empty() ? name + " needs a value" : "";
}

}  // namespace

std::string ReadArguments(const Arguments& arguments, const std::vector<Option>& options,
                          std::vector<std::string>& words) {
  bool areOptions = true;
  for (size_t i = 0; i < arguments.size(); ++i) {
    if (areOptions && arguments[i] == "--") {
      areOptions = false;
    } else if (areOptions && arguments[i].size() > 1 && arguments[i].front() == '-') {
      const std::string wrong = takeOption(arguments, i, options);
      if (!wrong.empty()) {
        return wrong;
      }
    } else {
      words.push_back(arguments[i]);
    }
  }
  return "";
}

bool AsksForHelp(const Arguments& arguments) {
  return std::any_of(arguments.begin(), arguments.end(), [](const std::string& argument) {
    return argument == "--help" || argument == "-h";
  });
}

ExitCode WrongUse(const char* command, const std::string& reason) {
  fprintf(stderr, "webapi %s: %s; see webapi %s --help\n", command, reason.c_str(), command);
  return kWrongUse;
}

std::string Shown(const std::string& text) {
  return ExecProgram::harmless(LogText(text));
}

}  // namespace QELO::AuthorProgram
