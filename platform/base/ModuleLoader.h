#pragma once

namespace QELO::Platform {

/// Opens a module of the platform, which stays open, and finds a function in it. Modules hold what
/// needs large libraries, so that only those processes load them that use them.
///
/// A module comes from the fixed module directory alone; the directory and the file must belong to
/// root or to the effective user, and nobody else may be able to write them.
/// @param module  file name
/// @return null on failure, which is logged
void* findInModule(const char* module, const char* function);

}  // namespace QELO::Platform
