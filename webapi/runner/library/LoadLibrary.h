#pragma once

#include <string>

namespace QELO {

/// Loads a library of foreign code, which others than root and the effective user may not write,
/// and lifts the bound on memory: a library takes what it needs. One that the process has loaded
/// beforehand is that one.
///
/// An exception of one of its constructors ends the process, since nothing of the loader can be
/// unwound.
/// @param error  receives the reason when the result is null
void* LoadLibrary(const std::string& path, std::string& error);

}  // namespace QELO
