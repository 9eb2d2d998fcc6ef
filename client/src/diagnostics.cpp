#include "ssaopt/client/diagnostics.h"

#include <algorithm>
#include <utility>

namespace ssaopt::client {

namespace {

// Lines longer than this are shown as the part around the column, this many bytes on either side.
constexpr std::size_t kLongLine = 160;
constexpr std::size_t kContext = 70;
constexpr std::string_view kCut = "...";

bool g_Colours = false;

// ANSI escapes as compilers use them: the location and message bold, the severity coloured, the caret
// green.
constexpr const char* kBold = "\033[1m";
constexpr const char* kRed = "\033[1;31m";
constexpr const char* kMagenta = "\033[1;35m";
constexpr const char* kGreen = "\033[1;32m";
constexpr const char* kReset = "\033[0m";

bool isPrintable(unsigned char c) { return c >= 0x20 && c < 0x7f; }

std::string painted(const std::string& text, const char* colour) {
  return g_Colours ? colour + text + kReset : text;
}

// How many columns `c` takes once escaped.
std::size_t shownWidth(unsigned char c, bool keepTabs) {
  return isPrintable(c) || (keepTabs && c == '\t') ? 1 : 4;
}

// The source line (or the part of it around `column`) and the caret line under it.
std::pair<std::string, std::string> sourceAndCaret(const std::string& line, std::uint32_t column) {
  std::size_t at = std::min<std::size_t>(column > 0 ? column - 1 : 0, line.size());
  std::size_t from = 0, to = line.size();
  if (line.size() > kLongLine) {
    from = at > kContext ? at - kContext : 0;
    to = std::min(line.size(), at + kContext);
  }
  std::string shown = (from > 0 ? std::string(kCut) : "") +
                      escapedText(std::string_view(line).substr(from, to - from), true) +
                      (to < line.size() ? std::string(kCut) : "");
  std::string caret(from > 0 ? kCut.size() : 0, ' ');
  for (std::size_t i = from; i < at; ++i) {
    unsigned char c = static_cast<unsigned char>(line[i]);
    caret.append(shownWidth(c, true), c == '\t' ? '\t' : ' ');
  }
  return {shown, caret + painted("^", kGreen)};
}

// The start of every line of `text`.
std::vector<std::size_t> lineStarts(std::string_view text) {
  std::vector<std::size_t> starts{0};
  for (std::size_t i = 0; i < text.size(); ++i)
    if (text[i] == '\n') starts.push_back(i + 1);
  return starts;
}

}  // namespace

std::string displayName(const std::string& path) { return path == "-" ? "<stdin>" : path; }

void setDiagnosticColours(bool on) { g_Colours = on; }

std::string escapedText(std::string_view text, bool keepTabs) {
  static const char kHex[] = "0123456789abcdef";
  std::string escaped;
  escaped.reserve(text.size());
  for (char c : text) {
    unsigned char byte = static_cast<unsigned char>(c);
    if (shownWidth(byte, keepTabs) == 1) {
      escaped += c;
    } else {
      escaped += "\\x";
      escaped += kHex[byte >> 4];
      escaped += kHex[byte & 0xf];
    }
  }
  return escaped;
}

std::string formatDiagnostic(const std::string& fileName, const Diagnostic& diagnostic) {
  std::string location = displayName(fileName) + ":";
  if (diagnostic.pos.line > 0)
    location += std::to_string(diagnostic.pos.line) + ":" + std::to_string(diagnostic.pos.column) + ":";
  bool error = diagnostic.severity == Severity::Error;
  std::string text = painted(location, kBold) + " " +
                     painted(error ? "error:" : "warning:", error ? kRed : kMagenta) + " " +
                     painted(escapedText(diagnostic.message), kBold);
  if (diagnostic.pos.line == 0 || diagnostic.sourceLine.empty()) return text;
  auto [line, caret] = sourceAndCaret(diagnostic.sourceLine, diagnostic.pos.column);
  return text + "\n" + line + "\n" + caret;
}

void attachSourceLines(std::vector<Diagnostic>& diagnostics, std::string_view text) {
  if (diagnostics.empty()) return;
  std::vector<std::size_t> starts = lineStarts(text);
  for (Diagnostic& diagnostic : diagnostics) {
    if (diagnostic.pos.line == 0 || diagnostic.pos.line > starts.size()) continue;
    std::size_t from = starts[diagnostic.pos.line - 1];
    std::size_t to = diagnostic.pos.line < starts.size() ? starts[diagnostic.pos.line] - 1 : text.size();
    if (to > from && text[to - 1] == '\r') --to;
    diagnostic.sourceLine = std::string(text.substr(from, to - from));
  }
}

// ---- DiagnosticList ---------------------------------------------------------------------------------

void DiagnosticList::error(SourcePos pos, std::string message) {
  if (m_Errors == kMaxErrors) {
    m_Diagnostics.push_back({Severity::Error, pos, "too many errors; stopping here"});
    ++m_Errors;
    throw TooManyErrors();
  }
  ++m_Errors;
  m_Diagnostics.push_back({Severity::Error, pos, std::move(message)});
}

void DiagnosticList::warning(SourcePos pos, std::string message) {
  if (m_Warnings++ == kMaxWarnings) m_FirstWarningLeftOut = pos;
  if (m_Warnings <= kMaxWarnings) m_Diagnostics.push_back({Severity::Warning, pos, std::move(message)});
}

std::vector<Diagnostic> DiagnosticList::take(std::string_view text) {
  std::vector<Diagnostic> diagnostics = std::move(m_Diagnostics);
  auto last = diagnostics.end();
  if (m_Errors > kMaxErrors) --last;  // the stop stays last
  std::stable_sort(diagnostics.begin(), last, [](const Diagnostic& a, const Diagnostic& b) {
    return a.pos.line != b.pos.line ? a.pos.line < b.pos.line : a.pos.column < b.pos.column;
  });
  if (m_Warnings > kMaxWarnings)
    diagnostics.push_back({Severity::Warning, m_FirstWarningLeftOut,
                           std::to_string(m_Warnings - kMaxWarnings) + " more warnings not shown"});
  attachSourceLines(diagnostics, text);
  m_Errors = m_Warnings = 0;
  return diagnostics;
}

}  // namespace ssaopt::client
