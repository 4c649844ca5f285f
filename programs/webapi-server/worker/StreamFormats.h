#pragma once

#include <ios>
#include <memory>
#include <vector>

namespace QELO {

/// How the C++ library's standard streams show what is written to them, and their locales. What
/// they lead to is the business of whoever shuts them.
class StreamFormats {
 public:
  StreamFormats();
  void PutBack();

 private:
  template <typename Char>
  struct Kept {
    std::basic_ios<Char>* stream;
    std::unique_ptr<std::basic_ios<Char>> format;
  };
  template <typename Char>
  static Kept<Char> Keep(std::basic_ios<Char>& stream);

  std::vector<Kept<char>> narrow_;
  std::vector<Kept<wchar_t>> wide_;
};

}  // namespace QELO
