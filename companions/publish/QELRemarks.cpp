#include "companions/publish/QELRemarks.h"

#include <algorithm>

namespace {

constexpr std::size_t kMostNamed = 3;

}  // namespace

void QELRemarks::add(std::string_view what, std::string_view part) {
  Remark& remark = of(what);
  if (++remark.count <= kMostNamed) remark.parts.emplace_back(part);
}

QELRemarks::Remark& QELRemarks::of(std::string_view what) {
  const auto found = std::find_if(remarks_.begin(), remarks_.end(),
                                  [what](const Remark& remark) { return remark.what == what; });
  if (found != remarks_.end()) return *found;
  Remark& added = remarks_.emplace_back();
  added.what = what;
  return added;
}

std::vector<std::string> QELRemarks::lines() const {
  std::vector<std::string> lines;
  for (const Remark& remark : remarks_) {
    std::string& line = lines.emplace_back(remark.what);
    for (const std::string& part : remark.parts) {
      const bool isFirst = &part == &remark.parts.front();
      const bool isLast = &part == &remark.parts.back() && remark.count <= kMostNamed;
      line.append(isFirst ? ": " : isLast ? " and " : ", ").append(part);
    }
    if (remark.count > kMostNamed) {
      line += " and " + std::to_string(remark.count - kMostNamed) + " more";
    }
  }
  return lines;
}
