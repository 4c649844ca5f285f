#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace QELO::AuthorProgram {

/// How many letters must be put in, left out, changed or exchanged with the next to make one word
/// of the other; case does not count. More than `most` is told as `most + 1`.
size_t Distance(std::string_view one, std::string_view other, size_t most);

/// The word that was probably meant: the nearest, when it is near enough for the word's length.
/// @return "" when none is
std::string_view Resembling(std::string_view word, const std::vector<std::string_view>& known);

/// "; did you mean "X"?", or "".
std::string Suggestion(std::string_view word, const std::vector<std::string_view>& known);

/// A name of the file in quotation marks.
std::string Quoted(std::string_view name);

}  // namespace QELO::AuthorProgram
