#pragma once

#include <string>

namespace QELO {

/// Takes an account for good: real, effective and saved ids and supplementary groups, and no
/// capability is left. Then tries the way back, which has to be barred.
/// @return false, with errno, when any of that fails, or the account is root's: whoever called this
///         is to end
bool GiveUpRights(const std::string& account);

}  // namespace QELO
