#include "programs/webapi/check/Findings.h"

#include <algorithm>

namespace QELO::AuthorProgram {

void Findings::Put(Weight weight, ptrdiff_t offset, const std::string& text) {
  if (!IsFull()) {
    found_.push_back({weight, static_cast<size_t>(std::max<ptrdiff_t>(offset, 0)), text});
  }
}

std::vector<std::string> Findings::Lines(const std::string& path,
                                         const DescriptionText& text) const {
  std::vector<Finding> sorted = found_;
  std::stable_sort(sorted.begin(), sorted.end(), [](const Finding& one, const Finding& other) {
    return one.offset < other.offset;
  });
  std::vector<std::string> lines;
  for (const Finding& finding : sorted) {
    lines.push_back(PlaceText(path, text.PositionAt(finding.offset)) +
                    (finding.weight == kError ? "error: " : "warning: ") + finding.text);
  }
  if (IsFull()) {
    lines.push_back(PlaceText(path, text.PositionAt(sorted.back().offset)) +
                    "error: that is enough; what else there is, is not shown");
  }
  return lines;
}

size_t Findings::Errors() const {
  return static_cast<size_t>(
      std::count_if(found_.begin(), found_.end(),
                    [](const Finding& finding) { return finding.weight == kError; }));
}

}  // namespace QELO::AuthorProgram
