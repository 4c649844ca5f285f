#pragma once

#include <string>
#include <vector>

namespace QELO::Platform {

/// Parameters that do not fit the schema of the test, and what is told of them.
struct WrongInput {
  const char* members;              ///< beside a good name; or a whole object
  std::vector<std::string> faults;  ///< "path rule" each
};

const std::vector<WrongInput>& WrongInputs();

}  // namespace QELO::Platform
