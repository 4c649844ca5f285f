#pragma once

#include <functional>
#include <string>

namespace QELO {

/// The description file of an API, which stands in the description directory: of QELO.A.lib,
/// QELO.A.B.lib, ... up to the name itself and four at most, the longest that exists.
/// @param api     clients choose it, so that it may be anything
/// @param exists  asked for a file's name, as "QELO.A.lib"
/// @return the file's name; "" when none exists, or when the API's name cannot be part of one
std::string DescriptionFile(const std::string& api,
                            const std::function<bool(const std::string& file)>& exists);

}  // namespace QELO
