#include "programs/webapi-server/worker/StreamFormats.h"

#include <iostream>

namespace QELO {

template <typename Char>
StreamFormats::Kept<Char> StreamFormats::Keep(std::basic_ios<Char>& stream) {
  auto format = std::make_unique<std::basic_ios<Char>>(nullptr);
  format->copyfmt(stream);
  return {&stream, std::move(format)};
}

StreamFormats::StreamFormats() {
  for (std::ios* stream :
       {static_cast<std::ios*>(&std::cin), static_cast<std::ios*>(&std::cout),
        static_cast<std::ios*>(&std::cerr), static_cast<std::ios*>(&std::clog)}) {
    narrow_.push_back(Keep(*stream));
  }
  for (std::wios* stream :
       {static_cast<std::wios*>(&std::wcin), static_cast<std::wios*>(&std::wcout),
        static_cast<std::wios*>(&std::wcerr), static_cast<std::wios*>(&std::wclog)}) {
    wide_.push_back(Keep(*stream));
  }
}

void StreamFormats::PutBack() {
  for (const auto& kept : narrow_) {
    kept.stream->clear();
    kept.stream->copyfmt(*kept.format);
  }
  for (const auto& kept : wide_) {
    kept.stream->clear();
    kept.stream->copyfmt(*kept.format);
  }
}

}  // namespace QELO
