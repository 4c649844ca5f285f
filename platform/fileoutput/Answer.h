#pragma once

#include <string>
#include <vector>

#include "platform/fileoutput/Content.h"
#include "platform/fileoutput/Head.h"
#include "platform/fileoutput/Ranges.h"
#include "platform/fileoutput/Writer.h"

namespace QELO::Platform {

/// One HTTP answer with a content, or with why it is not sent.
class Answer {
 public:
  /// @param lines  the caller's header
  /// @param name   to save the content by, where the caller's header has none; "": none
  Answer(const Content& content, const std::vector<std::string>& lines, const std::string& type,
         const std::string& name);

  /// @return false when it has not gone out whole
  bool Send();

 private:
  void AddDefaults(const std::string& name);
  void AddValidators();
  /// The content's, or those that the caller has put into the header in their place.
  Validators GetValidators() const;
  bool SendEmpty(const char* status);
  bool SendWhole(bool mayUseFastRoad);
  bool SendRanges(const std::vector<Range>& ranges);
  bool SendParts(const std::vector<Range>& ranges);
  bool SendStream();
  bool SendPart(off_t first, off_t length);
  bool SendHead();

  const Content& content_;
  Head head_;
  const std::string type_;
  const bool wantsHeadAlone_;
  Writer writer_;
};

}  // namespace QELO::Platform
