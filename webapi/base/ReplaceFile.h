#pragma once

#include <string>

namespace QELO::JsonHelper {

/// Replaces a file's text in one step: readers see the old text or the new, and a failure leaves
/// the old. The file keeps the mode of the one replaced, else 0600.
/// @param isLocked  the caller keeps others from replacing the file meanwhile. The new text then
///                  stands under one name, "<path>.new", until it is in place, so that processes
///                  that are killed leave one such file at most.
bool replaceText(const std::string& path, const std::string& text, bool isLocked);

}  // namespace QELO::JsonHelper
