#pragma once

#include <string>

namespace files {

/// Libraries beside this one, loaded by the calls that need what they bring along.
///
/// @param directory  where they are, by an absolute path; a program that keeps API libraries loaded
///                   may have loaded a copy, which does not know where it comes from
/// @param file       its name, as "QELO.Files.Archive.so"
/// @return the address of a function of it; null when there is none. The library stays loaded
void* findInLibrary(const std::string& directory, const char* file, const char* function);

}  // namespace files
