#pragma once

#include <cstddef>

/// While one lives, memory of more than so many bytes at once cannot be had by operator new.
class FailingNew {
 public:
  explicit FailingNew(size_t most);
  ~FailingNew();
  FailingNew(const FailingNew&) = delete;
  FailingNew& operator=(const FailingNew&) = delete;
};
