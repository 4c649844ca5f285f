#pragma once

#include <string>
#include <string_view>

namespace files {

/// A value of the header "Upload-Metadata": pairs of a key and, in base64, its value, with a comma
/// between two. @return "" when it has none of the key, or one that is no base64
std::string metadataOf(std::string_view header, std::string_view key);

/// Whether a text of a client's may stand in an address as it is.
bool isPlain(std::string_view text);

}  // namespace files
