#include "programs/webapi-exec/follow/ProgressScreen.h"

#include <sys/ioctl.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <string_view>

namespace QELO::ExecProgram {
namespace {

constexpr std::chrono::milliseconds kBarPause{200};
constexpr std::chrono::seconds kLinePause{5};
constexpr size_t kDefaultColumns = 80;
constexpr char kToLineStart[] = "\r";
constexpr char kEraseRest[] = "\x1b[K";

bool isSet(const char* variable) {
  const char* value = getenv(variable);
  return value != nullptr && *value != '\0';
}

}  // namespace

ProgressScreen::Kind ProgressScreen::FindKind() {
  if (isatty(STDERR_FILENO) != 1) {
    return Kind::kNone;
  }
  const bool isPlain =
      isSet("NO_COLOR") || !isSet("TERM") || std::string_view(getenv("TERM")) == "dumb";
  return isPlain ? Kind::kLines : Kind::kBar;
}

ProgressScreen::ProgressScreen() : kind_(FindKind()), begin_(Clock::now()) {}

ProgressScreen::~ProgressScreen() {
  EndLine();
}

bool ProgressScreen::IsForeground() {
  const pid_t group = tcgetpgrp(STDERR_FILENO);
  return group < 0 || group == getpgrp();  // below 0: a terminal without job control
}

/// Asked at each drawing: a window changes its size.
size_t ProgressScreen::Columns() {
  winsize size{};
  return ioctl(STDERR_FILENO, TIOCGWINSZ, &size) == 0 && size.ws_col > 0 ? size.ws_col
                                                                         : kDefaultColumns;
}

void ProgressScreen::Show(const Progress& progress) {
  const Clock::duration pause =
      kind_ == Kind::kBar ? Clock::duration(kBarPause) : Clock::duration(kLinePause);
  if (drawn_ == Clock::time_point() || Clock::now() - drawn_ >= pause) {
    Draw(progress);
  }
}

void ProgressScreen::ShowLast(const Progress& progress) {
  Draw(progress);
  EndLine();
}

void ProgressScreen::Draw(const Progress& progress) {
  if (kind_ == Kind::kNone || !IsForeground()) {
    return;
  }
  drawn_ = Clock::now();
  const auto elapsed = std::chrono::duration_cast<std::chrono::seconds>(drawn_ - begin_).count();
  // The last column stays free: a character there makes some terminals begin a new line.
  const std::string line = progressLine(progress, elapsed, turn_++, Columns() - 1);
  if (kind_ == Kind::kBar) {
    fprintf(stderr, "%s%s%s", kToLineStart, line.c_str(), kEraseRest);
    isOpen_ = true;
  } else {
    fprintf(stderr, "%s\n", line.c_str());
  }
}

void ProgressScreen::EndLine() {
  if (isOpen_) {
    fputc('\n', stderr);
    isOpen_ = false;
  }
}

void ProgressScreen::Say(const std::string& text) {
  if (IsTerminal()) {
    EndLine();
    fprintf(stderr, "%s\n", text.c_str());
  }
}

}  // namespace QELO::ExecProgram
