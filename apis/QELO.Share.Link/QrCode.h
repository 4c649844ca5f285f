#pragma once

#include <string>

namespace share {

/// A text as a QR code, with the empty border that scanners ask for: an SVG image that scales to
/// any size, black on white whatever it stands on.
/// @param svg  receives the image; unchanged on failure
/// @return false when the text has a NUL or does not fit a code
bool drawQrCode(const std::string& text, std::string& svg);

}  // namespace share
