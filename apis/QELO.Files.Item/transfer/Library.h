#pragma once

namespace files {

/// Libraries that stand beside this one and are loaded by the calls that need what they bring
/// along.
///
/// @param file  its name, as "QELO.Files.Archive.so"
/// @return the address of a function of it; null when there is none. The library stays loaded
void* findInLibrary(const char* file, const char* function);

}  // namespace files
