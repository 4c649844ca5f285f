#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "programs/server/Service.h"

namespace QELO::ScgiHeader {

/// Longest header in bytes: the query stands there twice, beside the cookies.
inline constexpr size_t kLongest = size_t{512} << 10;
/// Most variables.
inline constexpr size_t kMostVariables = 1024;

/// Takes what has come of a header, and no byte behind it.
Service::Arrival Take(Connection& connection);

/// Makes an environment of a header's text, in place.
/// @param header       whole, as Take() leaves it; lives as long as the environment
/// @param environment  receives "NAME=value" texts and a null at the end
/// @param bodyLength   receives the bytes that follow the header
/// @return false when the text is none
bool Parse(std::string& header, std::vector<char*>& environment, int64_t& bodyLength);

}  // namespace QELO::ScgiHeader
