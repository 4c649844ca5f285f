#pragma once

#include <fcntl.h>

#include <initializer_list>

namespace QELO {

/// Puts /dev/null in the place of descriptors; children inherit it as they inherit any standard
/// descriptor.
/// @return false, and nothing is changed, when /dev/null cannot be opened
bool PutNullOver(std::initializer_list<int> descriptors, int access = O_RDWR);

/// The same for ends that somebody may be waiting for: where /dev/null cannot be opened they are
/// closed.
void LetGoOf(std::initializer_list<int> descriptors);

}  // namespace QELO
