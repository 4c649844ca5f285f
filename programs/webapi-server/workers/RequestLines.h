#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

namespace QELO {

/// What a request's header tells before anybody has read it in earnest: enough to see whether a
/// front may be asked. The texts are the header's own.
struct RequestLines {
  static constexpr int64_t kLongestBody = 32 << 10;  ///< bytes that a front takes

  /// @param header  whole, as ScgiHeader::Take() leaves it
  explicit RequestLines(std::string_view header);

  /// Whether a line may hold what a front is not to take: enciphered parameters, which can be
  /// deciphered once alone, credentials other than a session, a relayed call.
  bool IsBarred(std::string_view line) const;

  std::string_view query;
  int64_t bodyLength = -1;  ///< -1: none can be told
  bool isForm = true;       ///< the body, if any, is one of parameters

  /// A body that stays in its socket.
  class Body {
   public:
    Body(int socket, int64_t length);
    Body(const Body&) = delete;
    Body& operator=(const Body&) = delete;
    ~Body();
    std::string_view Text() const { return text_; }

   private:
    std::string text_;
  };
};

}  // namespace QELO
