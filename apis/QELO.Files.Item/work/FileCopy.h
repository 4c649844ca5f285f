#pragma once

#include "paths/Folder.h"
#include "paths/NewFile.h"
#include "work/Report.h"

namespace files {

/// Copies what a file holds, with its holes, and tells the report.
/// @return kChanged when it became shorter meanwhile; kNone, with the copy cut short, after a stop
Reason copyContent(int from, int to, uint64_t size, Report& report);

/// Copies a file with its permissions and time; only when it is whole it has its name.
/// @param copied     the file that was copied
/// @param isSkipped  as NewFile::Finish()
Reason copyFile(const Folder& from, const std::string& name, const Folder& to,
                const std::string& newName, Existing existing, Report& report, Item& copied,
                bool& isSkipped);

/// Makes a link that says the same.
Reason copyLink(const Folder& from, const std::string& name, const Folder& to,
                const std::string& newName, Existing existing, bool& isSkipped);

}  // namespace files
