#include "programs/webapi/diff/Changes.h"

#include <algorithm>

#include "programs/webapi/Arguments.h"

namespace QELO::AuthorProgram {

bool Changes::Breaks() const {
  return IsFull() || std::any_of(found_.begin(), found_.end(),
                                 [](const Change& change) { return change.kind == kBreaks; });
}

std::vector<std::string> Changes::Lines(const std::string (&paths)[2],
                                        const DescriptionText (&texts)[2], bool breaksAlone) const {
  constexpr const char* kWords[] = {"breaks: ", "changes: ", "new: "};
  std::vector<std::string> lines;
  for (const Change& change : found_) {
    if (breaksAlone && change.kind != kBreaks) {
      continue;
    }
    const auto offset = static_cast<size_t>(std::max<ptrdiff_t>(change.offset, 0));
    lines.push_back(PlaceText(paths[change.side], texts[change.side].PositionAt(offset)) +
                    kWords[change.kind] + change.text);
  }
  if (IsFull()) {
    lines.push_back(Shown(paths[kNewer]) + ": that is enough; what else there is, is not shown");
  }
  return lines;
}

}  // namespace QELO::AuthorProgram
