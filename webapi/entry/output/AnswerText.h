#pragma once

#include <string>

namespace QELO {

class APIResponse;

/// The header of a response as it goes over the wire: its own lines, its cookies, the fixed lines
/// and the empty line.
std::string HeaderText(const APIResponse& response);

/// The body of a response as it goes over the wire: one JSON text in UTF-8.
std::string BodyText(const APIResponse& response);

}  // namespace QELO
