#pragma once

#include <chrono>
#include <cstdint>
#include <string>

#include "programs/webapi-exec/follow/Progress.h"

namespace QELO::ExecProgram {

/// Where progress is shown: standard error. On a terminal it is one line that is drawn anew in
/// place; plain lines now and then where TERM is "dumb" or not set, or NO_COLOR is; and nothing
/// where there is no terminal, or while another program has it.
class ProgressScreen {
 public:
  ProgressScreen();
  ProgressScreen(const ProgressScreen&) = delete;
  ProgressScreen& operator=(const ProgressScreen&) = delete;
  /// Ends the line.
  ~ProgressScreen();

  bool IsTerminal() const { return kind_ != Kind::kNone; }
  /// Whether the keyboard is ours: not that of a shell that started us in the background.
  static bool IsForeground();

  /// Shows progress unless it was shown a moment ago.
  void Show(const Progress& progress);
  /// Shows progress in any case.
  void ShowLast(const Progress& progress);
  /// Ends the line, so that something else can be printed.
  void EndLine();
  /// Prints a line for people at a terminal.
  void Say(const std::string& text);

 private:
  using Clock = std::chrono::steady_clock;
  enum class Kind { kNone, kLines, kBar };

  static Kind FindKind();
  static size_t Columns();
  void Draw(const Progress& progress);

  const Kind kind_;
  const Clock::time_point begin_;
  Clock::time_point drawn_;
  bool isOpen_ = false;  ///< the cursor stands in a line of ours
  unsigned turn_ = 0;
};

}  // namespace QELO::ExecProgram
