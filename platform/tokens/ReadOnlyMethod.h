#pragma once

#include <string>

namespace QELO::Platform {

/// Whether an API's description says of a method that it changes nothing, in every version that
/// lists it: the attribute "readOnly".
bool isReadOnlyMethod(const std::string& api, const std::string& method);

}  // namespace QELO::Platform
