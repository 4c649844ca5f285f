#pragma once

namespace QELO {

/// The state behind one APIParameter. The flags are never cleared.
template <typename T>
class APIParameterPrivate {
 public:
  bool isSet = false;
  bool isReset = false;
  bool isInvalid = false;
  T value{};
  bool isDefault = false;
};

}  // namespace QELO
