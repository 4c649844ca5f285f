#pragma once

namespace QELO {

/// The call that is a compound request, whatever its version.
inline constexpr char kCompoundAPI[] = "QELO.Entry.Request";
inline constexpr char kCompoundMethod[] = "request";

/// The request's attribute that says that its answer goes to whoever reads standard output, so that
/// a compound request may stop when nobody does any more.
inline constexpr char kAnswersOnOutput[] = "_answers_on_output";

}  // namespace QELO
