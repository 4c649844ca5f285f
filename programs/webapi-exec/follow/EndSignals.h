#pragma once

namespace QELO::ExecProgram {

/// The signals by which people and systems end a program, kept until somebody asks. Those that are
/// ignored when the program starts, as below nohup, stay ignored.
namespace EndSignals {

/// While a task is being started: SIGINT is kept, a second one ends the program. Processes that are
/// forked meanwhile do the same, so the one for the task does not end before it has left the
/// terminal.
void keepFirst();
/// From now on SIGINT, SIGTERM and SIGHUP are kept, and a new size of the window interrupts waits.
void keepAll();
/// For a process that was forked to wait: it hears nothing of SIGINT, and ends by the others.
void leaveToParent();
/// @return the signal that came since the last call, or 0
int take();

}  // namespace EndSignals
}  // namespace QELO::ExecProgram
