#pragma once

#include <termios.h>

namespace QELO::ExecProgram {

/// Asks the person at the terminal what becomes of the task. One key answers: while it asks, the
/// terminal hands keys over at once, and does as before when the question is gone.
class StopPrompt {
 public:
  enum class Choice { kNone, kStop, kLeave, kGoOn };

  StopPrompt() = default;
  StopPrompt(const StopPrompt&) = delete;
  StopPrompt& operator=(const StopPrompt&) = delete;
  ~StopPrompt();

  /// Asks. What was typed before does not count. @return false when nobody can be asked
  bool Ask();
  bool IsAsking() const { return isAsking_; }
  /// Can be read when there is something for Read(); below 0 while nothing is asked.
  int Descriptor() const { return isAsking_ ? terminal_ : -1; }
  /// Reads one key. @return kNone when it asks again; the end of input leaves the task
  Choice Read();
  /// Takes the question back.
  void Cancel();

 private:
  static Choice ChoiceOf(char key);
  void TakeKeys();
  void GiveKeysBack();

  int terminal_ = -1;
  termios former_{};
  bool hasKeys_ = false;  ///< the terminal is to become as in former_
  bool isAsking_ = false;
};

}  // namespace QELO::ExecProgram
