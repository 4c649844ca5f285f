#pragma once

#include "webapi/base/FileIdentity.h"

namespace QELO {

/// Puts /dev/null in the place of one standard descriptor, and gives the former one back at the
/// end.
class NullDescriptor {
 public:
  NullDescriptor() = default;
  NullDescriptor(const NullDescriptor&) = delete;
  NullDescriptor& operator=(const NullDescriptor&) = delete;
  ~NullDescriptor() { GiveBack(); }

  /// @param null  /dev/null, which the caller closes unless it is `descriptor` itself
  /// @return false, and the descriptor as it was, when it cannot be kept or replaced
  bool Replace(int descriptor, int null);

  /// Puts the former one back; at once what the destructor does, and nothing a second time. One
  /// that was closed before is closed again.
  /// @return false when foreign code has closed what was kept: the descriptor stays /dev/null, and
  ///         whatever has the kept one's number by now is left alone
  bool GiveBack();

  /// Closes the former one, which then is not given back.
  void LetGo();

 private:
  int descriptor_ = -1;
  int former_ = -1;  ///< -1: it was closed before
  FileIdentity identity_;
};

}  // namespace QELO
