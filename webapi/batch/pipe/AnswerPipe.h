#pragma once

namespace QELO {

class Pipe;

/// Makes a pipe the one that this process, a forked child, answers its parent by, and closes the
/// one that the parent answers by in its turn: a child that kept that could answer in its parent's
/// name, and whoever waits for the parent's answer would wait for the child as well.
/// @param pipe  not owned; lives until the process ends
void takeAnswerPipe(Pipe& pipe) noexcept;

/// Whether the parent could still read this process's answer; true when it owes none.
bool isAnswerAwaited() noexcept;

}  // namespace QELO
