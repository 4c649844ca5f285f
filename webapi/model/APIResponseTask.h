#pragma once

/// A response within a background task.
namespace QELO {

/// In the section "option" of the response: true while the result that it was given last is not the
/// task's, which could not store it.
inline constexpr char kResultRefused[] = "task_refused";

}  // namespace QELO
