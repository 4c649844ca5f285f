#pragma once

namespace QELO {

/// The call that is a compound request, whatever its version.
inline constexpr char kCompoundAPI[] = "QELO.Entry.Request";
inline constexpr char kCompoundMethod[] = "request";

}  // namespace QELO
