#pragma once

#include <cstddef>
#include <string>

namespace QELO::ExecProgram {

/// A text of somebody else's as one line that commands no terminal: control characters, characters
/// that turn the direction of writing or cannot be seen, and bytes that are no UTF-8 become "?".
std::string harmless(const std::string& text);

/// Columns that a harmless text takes on a terminal.
size_t columnsOf(const std::string& text);

/// A harmless text's first or last part, of so many columns at most; "..." stands for the rest.
std::string frontOf(const std::string& text, size_t columns);
std::string backOf(const std::string& text, size_t columns);

}  // namespace QELO::ExecProgram
