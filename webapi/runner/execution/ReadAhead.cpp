#include "webapi/runner/execution/ReadAhead.h"

#include <cstdio>
#include <iostream>

namespace QELO {

void ReadAhead::Hide() {
  // glibc tells how much is buffered by these members alone.
  const std::ptrdiff_t count = stdin->_IO_read_end - stdin->_IO_read_ptr;
  if (count > 0) {
    text_.resize(static_cast<size_t>(count));
    text_.resize(fread(text_.data(), 1, text_.size(), stdin));
  }
  if (std::cin.rdbuf() != nullptr && std::cin.rdbuf()->in_avail() > 0) {
    nothing_ = std::make_unique<std::filebuf>();
    std::cin.rdbuf(nothing_.get());
  }
}

void ReadAhead::GiveBack() {
  for (; !text_.empty(); text_.pop_back()) {
    ungetc(static_cast<unsigned char>(text_.back()), stdin);
  }
}

}  // namespace QELO
