#include "text.h"

#include <algorithm>
#include <optional>
#include <sstream>
#include <string_view>
#include <unordered_map>

namespace ssaopt::tool {

namespace {

using Kind = DiffLine::Kind;

// Lines of unchanged text shown around each change of a unified diff.
constexpr std::size_t kContext = 3;

// Each line as a number, equal for equal lines, so that the search compares numbers. (The numbers are
// only compared for equality, so the order of the hash map never shows.)
std::vector<std::size_t> numbered(const std::vector<std::string>& lines,
                                  std::unordered_map<std::string_view, std::size_t>& ids) {
  std::vector<std::size_t> numbers;
  numbers.reserve(lines.size());
  for (const std::string& line : lines) numbers.push_back(ids.emplace(line, ids.size()).first->second);
  return numbers;
}

// The part of two texts between their common start and end.
struct Middle {
  const std::vector<std::size_t>& a;
  const std::vector<std::size_t>& b;
  std::size_t aFrom, aTo, bFrom, bTo;
};

// The snapshots of the furthest reaching paths, one per edit distance d, diagonals -d to d.
using Trace = std::vector<std::vector<long>>;

std::vector<DiffLine> backtrack(const Trace& trace, const Middle& middle) {
  std::vector<DiffLine> reversed;
  long x = static_cast<long>(middle.aTo - middle.aFrom), y = static_cast<long>(middle.bTo - middle.bFrom);
  auto same = [&](long i, long j) {
    reversed.push_back(
        {Kind::Same, middle.aFrom + static_cast<std::size_t>(i), middle.bFrom + static_cast<std::size_t>(j)});
  };
  for (long d = static_cast<long>(trace.size()) - 1; d > 0; --d) {
    const std::vector<long>& previous = trace[static_cast<std::size_t>(d - 1)];
    auto at = [&](long k) { return previous[static_cast<std::size_t>(k + d - 1)]; };
    long k = x - y;
    bool down = k == -d || (k != d && at(k - 1) < at(k + 1));
    long previousK = down ? k + 1 : k - 1;
    long previousX = at(previousK), previousY = previousX - previousK;
    for (; x > (down ? previousX : previousX + 1) && y > (down ? previousY + 1 : previousY); --x, --y)
      same(x - 1, y - 1);
    if (down)
      reversed.push_back({Kind::Added, 0, middle.bFrom + static_cast<std::size_t>(previousY)});
    else
      reversed.push_back({Kind::Removed, middle.aFrom + static_cast<std::size_t>(previousX), 0});
    x = previousX;
    y = previousY;
  }
  for (; x > 0 && y > 0; --x, --y) same(x - 1, y - 1);
  return std::vector<DiffLine>(reversed.rbegin(), reversed.rend());
}

// The shortest edit script of the middle part, or nothing past kMaxEditDistance.
std::optional<std::vector<DiffLine>> shortestEdit(const Middle& middle) {
  long n = static_cast<long>(middle.aTo - middle.aFrom), m = static_cast<long>(middle.bTo - middle.bFrom);
  long limit = std::min(n + m, static_cast<long>(kMaxEditDistance));
  long offset = limit + 1;
  std::vector<long> furthest(static_cast<std::size_t>(2 * limit + 3), 0);
  auto v = [&](long k) -> long& { return furthest[static_cast<std::size_t>(offset + k)]; };
  Trace trace;
  for (long d = 0; d <= limit; ++d) {
    bool reached = false;
    for (long k = -d; k <= d && !reached; k += 2) {
      long x = (k == -d || (k != d && v(k - 1) < v(k + 1))) ? v(k + 1) : v(k - 1) + 1;
      long y = x - k;
      while (x < n && y < m &&
             middle.a[middle.aFrom + static_cast<std::size_t>(x)] ==
                 middle.b[middle.bFrom + static_cast<std::size_t>(y)])
        ++x, ++y;
      v(k) = x;
      reached = x >= n && y >= m;
    }
    trace.emplace_back(furthest.begin() + offset - d, furthest.begin() + offset + d + 1);
    if (reached) return backtrack(trace, middle);
  }
  return std::nullopt;
}

// Within each run of changes, the removed lines first, as readers of diffs expect.
void removalsFirst(std::vector<DiffLine>& script) {
  for (auto run = script.begin(); run != script.end();) {
    auto end = std::find_if(run, script.end(), [](const DiffLine& line) { return line.kind == Kind::Same; });
    std::stable_partition(run, end, [](const DiffLine& line) { return line.kind == Kind::Removed; });
    run = end == script.end() ? end : end + 1;
  }
}

std::string hunkRange(std::size_t start, std::size_t count) {
  return std::to_string(count == 0 ? start : start + 1) + "," + std::to_string(count);
}

}  // namespace

std::vector<std::string> splitLines(const std::string& text) {
  std::vector<std::string> lines;
  std::istringstream in(text);
  for (std::string line; std::getline(in, line);) lines.push_back(line);
  return lines;
}

std::string replacedAll(std::string text, const std::string& what, const std::string& with) {
  for (std::size_t at = text.find(what); at != std::string::npos; at = text.find(what, at + with.size()))
    text.replace(at, what.size(), with);
  return text;
}

std::vector<DiffLine> diffLines(const std::vector<std::string>& before,
                                const std::vector<std::string>& after) {
  std::unordered_map<std::string_view, std::size_t> ids;
  std::vector<std::size_t> a = numbered(before, ids), b = numbered(after, ids);
  std::size_t prefix = 0, suffix = 0;
  while (prefix < a.size() && prefix < b.size() && a[prefix] == b[prefix]) ++prefix;
  while (suffix < a.size() - prefix && suffix < b.size() - prefix &&
         a[a.size() - 1 - suffix] == b[b.size() - 1 - suffix])
    ++suffix;
  std::vector<DiffLine> script;
  for (std::size_t i = 0; i < prefix; ++i) script.push_back({Kind::Same, i, i});
  Middle middle{a, b, prefix, a.size() - suffix, prefix, b.size() - suffix};
  if (std::optional<std::vector<DiffLine>> edit = shortestEdit(middle)) {
    script.insert(script.end(), edit->begin(), edit->end());
  } else {
    for (std::size_t i = middle.aFrom; i < middle.aTo; ++i) script.push_back({Kind::Removed, i, 0});
    for (std::size_t j = middle.bFrom; j < middle.bTo; ++j) script.push_back({Kind::Added, 0, j});
  }
  for (std::size_t i = suffix; i > 0; --i) script.push_back({Kind::Same, a.size() - i, b.size() - i});
  removalsFirst(script);
  return script;
}

std::string unifiedDiff(const std::string& before, const std::string& after, const std::string& beforeName,
                        const std::string& afterName) {
  std::vector<std::string> oldLines = splitLines(before), newLines = splitLines(after);
  std::vector<DiffLine> script = diffLines(oldLines, newLines);
  std::vector<std::size_t> changes;
  for (std::size_t i = 0; i < script.size(); ++i)
    if (script[i].kind != Kind::Same) changes.push_back(i);
  if (changes.empty()) return "";
  // Lines of each text before each entry of the script, for the hunk headers.
  std::vector<std::size_t> oldAt{0}, newAt{0};
  for (const DiffLine& line : script) {
    oldAt.push_back(oldAt.back() + (line.kind != Kind::Added ? 1 : 0));
    newAt.push_back(newAt.back() + (line.kind != Kind::Removed ? 1 : 0));
  }
  std::string diff = "--- " + beforeName + "\n+++ " + afterName + "\n";
  for (std::size_t first = 0; first < changes.size();) {
    std::size_t last = first;
    while (last + 1 < changes.size() && changes[last + 1] - changes[last] <= 2 * kContext + 1) ++last;
    std::size_t from = changes[first] > kContext ? changes[first] - kContext : 0;
    std::size_t to = std::min(script.size(), changes[last] + kContext + 1);
    diff += "@@ -" + hunkRange(oldAt[from], oldAt[to] - oldAt[from]) + " +" +
            hunkRange(newAt[from], newAt[to] - newAt[from]) + " @@\n";
    for (std::size_t i = from; i < to; ++i) {
      const DiffLine& line = script[i];
      if (line.kind == Kind::Same) diff += " " + oldLines[line.before] + "\n";
      if (line.kind == Kind::Removed) diff += "-" + oldLines[line.before] + "\n";
      if (line.kind == Kind::Added) diff += "+" + newLines[line.after] + "\n";
    }
    first = last + 1;
  }
  return diff;
}

}  // namespace ssaopt::tool
