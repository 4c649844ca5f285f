#pragma once

#include <string>

#include "paths/Folder.h"
#include "paths/NewFile.h"

namespace files {

/// Gives a file that has arrived its place in a folder, as if it had been made there: by a renaming
/// where that does, else by a copy that has its name when it is whole.
/// @param temporary  path of a file of this process's own
Reason placeFile(const std::string& temporary, const Folder& folder, const std::string& name,
                 Existing existing, bool& isSkipped);

}  // namespace files
