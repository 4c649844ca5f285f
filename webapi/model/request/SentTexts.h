#pragma once

#include <json/json.h>

#include <string>

namespace QELO {

/// The parameters as the texts that were sent, before any was taken for JSON. Kept as they came and
/// read for the few methods that ask; copies of a request, which make other calls, have none.
class SentTexts {
 public:
  SentTexts() = default;
  SentTexts(const SentTexts&) noexcept {}
  SentTexts& operator=(const SentTexts&) = delete;

  /// Keeps a parameter line that could be read; of two with a name the later counts.
  void AddLine(std::string&& line);
  /// Adds texts by name, which count before those of lines.
  void AddTexts(Json::Value&& texts);
  /// The texts by name.
  Json::Value Read() const;
  void Forget();

 private:
  static constexpr int kLines = 2;  ///< of a query and a body

  std::string lines_[kLines];
  Json::Value texts_;
};

}  // namespace QELO
