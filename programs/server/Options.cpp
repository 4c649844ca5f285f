#include "programs/server/Options.h"

#include <algorithm>
#include <utility>

#include "webapi/base/Number.h"

namespace QELO {

void Options::Text(const std::string& name, std::function<bool(const std::string&)> take,
                   const std::string& wrong) {
  const std::string option = "--" + name;
  options_.push_back({option, std::move(take),
                      wrong.empty() ? option + " needs another value" : option + ": " + wrong});
}

void Options::Number(const std::string& name, unsigned least, unsigned most,
                     std::function<void(unsigned)> take) {
  Text(name, [=](const std::string& text) {
    unsigned number = 0;
    const bool good = ParseNumber(text, number) && number >= least && number <= most;
    if (good) {
      take(number);
    }
    return good;
  });
}

bool Options::Read(int argc, char** argv, std::string& error) const {
  for (int i = 1; i < argc; i += 2) {
    const std::string name = argv[i];
    const Option* found = nullptr;
    for (const Option& option : options_) {
      found = option.name == name ? &option : found;
    }
    if (found == nullptr) {
      error = "there is no option " + name;
      return false;
    }
    if (i + 1 >= argc) {
      error = name + " needs a value";
      return false;
    }
    if (!found->take(argv[i + 1])) {
      error = found->wrong;
      return false;
    }
  }
  return true;
}

bool Options::AskForHelp(int argc, char** argv) {
  return std::any_of(argv + 1, argv + argc,
                     [](const std::string& word) { return word == "--help" || word == "-h"; });
}

}  // namespace QELO
