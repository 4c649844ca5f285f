#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace QELO::JsonHelper {

/// A place in a text as editors show it, counted from 1; columns are UTF-8 characters.
struct Position {
  size_t line = 1;
  size_t column = 1;
};

/// The place of a text's byte with this number, counted from 0; that of the end beyond it.
Position positionAt(std::string_view text, size_t offset);

/// Finds the place from which on a text that is read from a file stops being JSON.
/// @return false when it is JSON as a whole
bool findFault(std::string_view text, Position& fault);

/// The same for a file.
/// @return false also when the file cannot be read
bool findFileFault(const std::string& path, Position& fault);

}  // namespace QELO::JsonHelper
