#include "shrink.h"

#include <sstream>
#include <vector>

namespace ssaopt::tool {

namespace {

using Lines = std::vector<std::string>;

Lines splitLines(const std::string& text) {
  Lines lines;
  std::istringstream in(text);
  for (std::string line; std::getline(in, line);) lines.push_back(line);
  return lines;
}

std::string joinLines(const Lines& lines) {
  std::string text;
  for (const std::string& line : lines) text += line + "\n";
  return text;
}

// "if C goto A else B;" as "goto A;" (`second` false) or "goto B;"; empty for any other line.
std::string plainJump(const std::string& line, bool second) {
  std::size_t ifAt = line.find("if ");
  std::size_t gotoAt = line.find(" goto ");
  std::size_t elseAt = line.rfind(" else ");
  if (ifAt == std::string::npos || gotoAt == std::string::npos || elseAt == std::string::npos ||
      elseAt < gotoAt)
    return "";
  std::size_t from = second ? elseAt + 6 : gotoAt + 6;
  std::size_t to = second ? line.find(';', from) : elseAt;
  if (to == std::string::npos) return "";
  return line.substr(0, ifAt) + "goto " + line.substr(from, to - from) + ";";
}

class Shrinker {
public:
  Shrinker(const std::string& text, const std::function<bool(const std::string&)>& fails,
           std::size_t attempts)
      : m_Lines(splitLines(text)), m_Fails(fails), m_AttemptsLeft(attempts) {}

  std::string shrink() {
    for (bool progress = true; progress && m_AttemptsLeft > 0;) {
      bool dropped = dropChunks();
      bool simplified = plainJumps();
      progress = dropped || simplified;
    }
    return joinLines(m_Lines);
  }

private:
  // Drops runs of lines, halving their length down to single lines (delta debugging).
  bool dropChunks() {
    bool progress = false;
    for (std::size_t chunk = m_Lines.size() / 2; chunk >= 1; chunk /= 2)
      for (std::size_t start = 0; start < m_Lines.size() && m_AttemptsLeft > 0;) {
        Lines candidate(m_Lines.begin(), m_Lines.begin() + static_cast<std::ptrdiff_t>(start));
        std::size_t end = std::min(m_Lines.size(), start + chunk);
        candidate.insert(candidate.end(), m_Lines.begin() + static_cast<std::ptrdiff_t>(end), m_Lines.end());
        if (accept(candidate))
          progress = true;
        else
          start += chunk;
      }
    return progress;
  }

  bool plainJumps() {
    bool progress = false;
    for (std::size_t i = 0; i < m_Lines.size() && m_AttemptsLeft > 0; ++i)
      for (bool second : {false, true}) {
        std::string jump = plainJump(m_Lines[i], second);
        if (jump.empty()) continue;
        Lines candidate = m_Lines;
        candidate[i] = jump;
        if (accept(candidate)) {
          progress = true;
          break;
        }
      }
    return progress;
  }

  bool accept(Lines& candidate) {
    --m_AttemptsLeft;
    if (!m_Fails(joinLines(candidate))) return false;
    m_Lines.swap(candidate);
    return true;
  }

  Lines m_Lines;
  const std::function<bool(const std::string&)>& m_Fails;
  std::size_t m_AttemptsLeft;
};

}  // namespace

std::string shrinkProgram(const std::string& text, const std::function<bool(const std::string&)>& fails,
                          std::size_t attempts) {
  return Shrinker(text, fails, attempts).shrink();
}

}  // namespace ssaopt::tool
