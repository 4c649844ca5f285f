#pragma once

#include <functional>
#include <string>

#include "webapi/testing/TestAnswer.h"

namespace QELO {

/// What a call prints to standard output.
std::string PrintedBy(const std::function<void()>& call);

/// What is printed by a CGI program, taken apart.
TestAnswer AnswerOf(const std::string& printed);

/// While it lives, standard input holds this text and ends.
class Input {
 public:
  explicit Input(const std::string& text);
  Input(const Input&) = delete;
  Input& operator=(const Input&) = delete;
  ~Input();

 private:
  int former_;
};

}  // namespace QELO
