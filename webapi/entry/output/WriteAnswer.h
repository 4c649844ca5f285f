#pragma once

#include <string_view>

namespace QELO {

class UnreadBody;

/// Writes a part of the answer to standard output, behind what the process has printed before.
/// It takes no stream for it: whatever a method did to those, the answer goes out whole. That the
/// client is gone is nobody's fault; anything else that keeps the answer back is logged.
/// @param body  dropped as far as it comes meanwhile: a server that passes the body on before it
///              takes the answer would wait for us, and we for it
/// @return false when the text has not gone out whole
bool WriteAnswer(std::string_view text, UnreadBody& body);

/// The same where nothing is left of a body.
bool WriteAnswer(std::string_view text);

}  // namespace QELO
