#include "webapi/runner/execution/CppStreams.h"

#include <cstdio>
#include <iostream>

namespace QELO {
namespace {

/// Asking with true changes nothing.
bool areSynchronised() {
  return std::ios_base::sync_with_stdio(true);
}

}  // namespace

CppStreams::CppStreams()
    : isSynchronised_(areSynchronised()),
      input_(std::cin),
      output_(std::cout),
      error_(std::cerr),
      log_(std::clog),
      wideInput_(std::wcin),
      wideOutput_(std::wcout),
      wideError_(std::wcerr),
      wideLog_(std::wclog) {
  Flush();
}

template <typename Call>
void CppStreams::ForAll(Call call) {
  call(input_, stdin);
  call(output_, stdout);
  call(error_, stderr);
  call(log_, stderr);
  call(wideInput_, stdin);
  call(wideOutput_, stdout);
  call(wideError_, stderr);
  call(wideLog_, stderr);
}

void CppStreams::RestoreBuffers() {
  if (isSynchronised_ && !areSynchronised()) {
    ForAll([](auto& stream, std::FILE* file) { stream.TakeBufferOf(file); });
  }
  ForAll([](auto& stream, std::FILE*) { stream.RestoreBuffer(); });
  Flush();
}

void CppStreams::Restore() {
  ForAll([](auto& stream, std::FILE*) { stream.Restore(); });
}

void CppStreams::Flush() const {
  std::cout.flush();
  if (!isSynchronised_) {  // else it has nothing of its own, and would turn the C stream wide
    std::wcout.flush();
  }
}

}  // namespace QELO
