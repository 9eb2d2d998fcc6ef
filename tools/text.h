// Texts as the tool handles them: lines, replacements, and the line differences of --print-changed
// and of the HTML report.
#pragma once

#include <cstddef>
#include <string>
#include <vector>

namespace ssaopt::tool {

std::vector<std::string> splitLines(const std::string& text);

// `text` with every occurrence of `what` (not empty) replaced by `with`.
std::string replacedAll(std::string text, const std::string& what, const std::string& with);

// One line of an edit script: a line of both texts, one removed from the first, or one added by the
// second, with its index in the text it belongs to (both for a line of both).
struct DiffLine {
  enum class Kind { Same, Removed, Added };
  Kind kind;
  std::size_t before;  // index in the first text; of a Same or Removed line
  std::size_t after;   // index in the second text; of a Same or Added line
};

// The lines of both texts in order, as few removed and added as the shortest edit script has (Myers'
// "An O(ND) difference algorithm", 1986), the removed lines of each change before the added ones.
// Past kMaxEditDistance changes it gives up on the middle part that differs and shows it removed and
// added whole, so that two very different large texts take linear time.
inline constexpr std::size_t kMaxEditDistance = 2000;
std::vector<DiffLine> diffLines(const std::vector<std::string>& before,
                                const std::vector<std::string>& after);

// "--- beforeName", "+++ afterName", then hunks with three lines of context; empty when the texts are
// the same.
std::string unifiedDiff(const std::string& before, const std::string& after, const std::string& beforeName,
                        const std::string& afterName);

}  // namespace ssaopt::tool
