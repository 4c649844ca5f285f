#include "work/Stop.h"

#include <csignal>

namespace files {
namespace {

volatile std::sig_atomic_t asked = 0;

void note(int) {
  asked = 1;
}

}  // namespace

void Stop::Watch() {
  struct sigaction action {};
  action.sa_handler = note;
  sigaction(SIGTERM, &action, nullptr);
}

bool Stop::IsAsked() {
  return asked != 0;
}

}  // namespace files
