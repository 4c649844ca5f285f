#pragma once

#include <functional>
#include <string>
#include <vector>

namespace QELO {

/// Reads "--name value" pairs.
///
///     Options options;
///     options.Number("calls", 1, 1024, [&](unsigned number) { limits.atOnce = number; });
///     if (!options.Read(argc, argv, error)) {
class Options {
 public:
  /// @param name  without its dashes
  /// @param take   is given the value; false: it is none of this option's
  /// @param wrong  what is said of such a value
  void Text(const std::string& name, std::function<bool(const std::string&)> take,
            const std::string& wrong = "");
  void Number(const std::string& name, unsigned least, unsigned most,
              std::function<void(unsigned)> take);
  /// @param error  receives what is wrong, in words
  bool Read(int argc, char** argv, std::string& error) const;
  /// @return whether "--help" or "-h" is among the words; no value of an option is one
  static bool AskForHelp(int argc, char** argv);

 private:
  struct Option {
    std::string name;
    std::function<bool(const std::string&)> take;
    std::string wrong;
  };
  std::vector<Option> options_;
};

}  // namespace QELO
