#include "report.h"

#include <chrono>
#include <fstream>
#include <iomanip>
#include <sstream>

#include "process.h"
#include "ssaopt/client/diagnostics.h"
#include "ssaopt/client/dot.h"
#include "ssaopt/client/printer.h"
#include "text.h"

namespace ssaopt::tool {

namespace {

using Kind = DiffLine::Kind;

// Unchanged lines kept around each change; longer unchanged runs are folded.
constexpr std::size_t kContext = 3;
constexpr std::chrono::seconds kPictureTimeout{60};

std::string escaped(const std::string& text) {
  std::string html;
  for (char c : text) {
    if (c == '&')
      html += "&amp;";
    else if (c == '<')
      html += "&lt;";
    else if (c == '>')
      html += "&gt;";
    else if (c == '"')
      html += "&quot;";
    else
      html += c;
  }
  return html;
}

// The <svg> element of dot's output, its ids made unique within the page.
std::string inlineSvg(const std::string& svg, const std::string& prefix) {
  std::size_t start = svg.find("<svg");
  if (start == std::string::npos) return "";
  return replacedAll(svg.substr(start), " id=\"", " id=\"" + prefix + "-");
}

const char* const kStyle = R"(
body { font-family: sans-serif; margin: 1.5em; color: #222; }
h1 { font-size: 1.4em; }
h2 { font-size: 1.15em; margin-top: 2em; border-bottom: 1px solid #ccc; }
nav ol { columns: 3; }
nav .unchanged, section.unchanged h2 { color: #888; }
pre, table.diff { font-family: monospace; font-size: 12px; }
table.diff { border-collapse: collapse; width: 100%; table-layout: fixed; }
table.diff td { white-space: pre; overflow: hidden; text-overflow: ellipsis; padding: 0 0.4em; vertical-align: top; }
table.diff td.number { width: 3.5em; color: #999; text-align: right; }
table.diff th { text-align: left; background: #eee; padding: 0.2em 0.4em; }
td.removed { background: #fdd; }
td.added { background: #dfd; }
td.blank { background: #f6f6f6; }
tr.foldmark td { color: #888; background: #f6f6f6; font-style: italic; }
body:not(.expanded) tr.fold { display: none; }
body.expanded tr.foldmark { display: none; }
body.changed-only section.unchanged { display: none; }
figure { margin: 1em 0; overflow: auto; }
figure svg { max-width: 100%; height: auto; }
.note { color: #888; font-style: italic; }
)";

// Unfolds unchanged lines and hides the steps that changed nothing on request; j and k go to the next
// and the previous step. data-ready tells a test that the script ran to its end.
const char* const kScript = R"(
(function () {
  function follow(id, className) {
    var box = document.getElementById(id);
    box.addEventListener('change', function () { document.body.classList.toggle(className, box.checked); });
  }
  follow('expand', 'expanded');
  follow('changed-only', 'changed-only');
  var steps = Array.prototype.slice.call(document.querySelectorAll('section.step'));
  document.addEventListener('keydown', function (event) {
    if (event.key !== 'j' && event.key !== 'k') return;
    var shown = steps.filter(function (step) { return step.offsetParent !== null; });
    var next = event.key === 'j'
        ? shown.find(function (step) { return step.getBoundingClientRect().top > 1; })
        : shown.slice().reverse().find(function (step) { return step.getBoundingClientRect().top < -1; });
    if (next) next.scrollIntoView();
  });
  document.body.setAttribute('data-ready', 'yes');
})();
)";

class DiffTable {
public:
  DiffTable(const std::string& before, const std::string& after)
      : m_Before(splitLines(before)), m_After(splitLines(after)) {}

  std::string html(const std::string& beforeName, const std::string& afterName) {
    std::vector<DiffLine> script = diffLines(m_Before, m_After);
    m_Html
        << "<table class=\"diff\"><colgroup><col style=\"width:3.5em\"><col><col style=\"width:3.5em\"><col>"
           "</colgroup><tr><th colspan=\"2\">"
        << escaped(beforeName) << "</th><th colspan=\"2\">" << escaped(afterName) << "</th></tr>\n";
    for (std::size_t i = 0; i < script.size();) {
      std::size_t end = i;
      bool same = script[i].kind == Kind::Same;
      while (end < script.size() && (script[end].kind == Kind::Same) == same) ++end;
      if (same)
        unchangedRun(script, i, end, i == 0, end == script.size());
      else
        changedRun(script, i, end);
      i = end;
    }
    m_Html << "</table>\n";
    return m_Html.str();
  }

private:
  // Lines further than kContext from a change are folded, unless that hides only a line or two.
  void unchangedRun(const std::vector<DiffLine>& script, std::size_t from, std::size_t to, bool first,
                    bool last) {
    std::size_t keepBefore = first ? 0 : kContext, keepAfter = last ? 0 : kContext;
    bool folds = to - from > keepBefore + keepAfter + 2;
    for (std::size_t i = from; i < to; ++i) {
      bool folded = folds && i >= from + keepBefore && i < to - keepAfter;
      if (folded && i == from + keepBefore)
        m_Html << "<tr class=\"foldmark\"><td colspan=\"4\">&#8943; " << (to - from - keepBefore - keepAfter)
               << " unchanged lines</td></tr>\n";
      row(folded ? "fold" : "", cells(script[i].before, "", script[i].after, ""));
    }
  }

  void changedRun(const std::vector<DiffLine>& script, std::size_t from, std::size_t to) {
    std::vector<std::size_t> removed, added;
    for (std::size_t i = from; i < to; ++i)
      (script[i].kind == Kind::Removed ? removed : added)
          .push_back(script[i].kind == Kind::Removed ? script[i].before : script[i].after);
    for (std::size_t i = 0; i < std::max(removed.size(), added.size()); ++i)
      row("", (i < removed.size() ? side(m_Before, removed[i], "removed") : blank()) +
                  (i < added.size() ? side(m_After, added[i], "added") : blank()));
  }

  std::string cells(std::size_t before, const char* beforeClass, std::size_t after, const char* afterClass) {
    return side(m_Before, before, beforeClass) + side(m_After, after, afterClass);
  }

  static std::string side(const std::vector<std::string>& lines, std::size_t i, const char* cssClass) {
    return "<td class=\"number\">" + std::to_string(i + 1) + "</td><td class=\"" + cssClass + "\">" +
           escaped(lines[i]) + "</td>";
  }

  static std::string blank() { return "<td class=\"number\"></td><td class=\"blank\"></td>"; }

  void row(const char* cssClass, const std::string& cells) {
    m_Html << "<tr" << (*cssClass ? std::string(" class=\"") + cssClass + "\"" : "") << ">" << cells
           << "</tr>\n";
  }

  std::vector<std::string> m_Before;
  std::vector<std::string> m_After;
  std::ostringstream m_Html;
};

std::string milliseconds(double value) {
  std::ostringstream text;
  text << std::fixed << std::setprecision(3) << value << " ms";
  return text.str();
}

}  // namespace

void Report::addStep(const std::string& name, const client::Program& program, double milliseconds) {
  client::PrintOptions options;
  options.showValues = m_Options.showValues;
  options.procedure = m_Options.filterProcedure.value_or("");
  std::string text = client::printProgram(program, options);
  bool changed = m_Steps.empty() || text != m_Steps.back().text;
  m_Steps.push_back({name, std::move(text), changed ? pictureOf(program) : "", milliseconds});
}

// dot's SVG of the program, or empty with the reason in m_PictureNote.
std::string Report::pictureOf(const client::Program& program) {
  if (!m_PictureNote.empty()) return "";
  if (program.graph().number_of_nodes() > kMaxPictureNodes) {
    m_PictureNote = "no pictures: the graph has more than " + std::to_string(kMaxPictureNodes) + " nodes";
    return "";
  }
  TemporaryDirectory directory("ssaopt-report");
  std::filesystem::path input = directory.path() / "program.dot";
  client::DotOptions options{m_Options.showValues, m_Options.filterProcedure.value_or("")};
  std::ofstream(input, std::ios::binary) << client::writeDot(program, options);
  Outcome outcome = runProcess({"dot", "-Tsvg"}, input, directory.path(), kPictureTimeout);
  if (!outcome.started) m_PictureNote = "no pictures: Graphviz's dot is not installed";
  if (outcome.started && outcome.status != 0) m_PictureNote = "no pictures: dot failed: " + outcome.err;
  return outcome.started && outcome.status == 0
             ? inlineSvg(outcome.out, "step" + std::to_string(m_Steps.size()))
             : "";
}

std::string Report::page(const std::string& statistics, const std::string& times) const {
  std::string file = client::displayName(m_Options.inputPath);
  std::ostringstream html;
  html << "<!DOCTYPE html>\n<html lang=\"en\">\n<head>\n<meta charset=\"utf-8\">\n<title>ssaopt: "
       << escaped(file) << "</title>\n<style>" << kStyle
       << "</style>\n</head>\n<body>\n<h1>ssaopt: " << escaped(file)
       << "</h1>\n<p><label><input type=\"checkbox\" id=\"expand\"> show unchanged lines</label> "
       << "<label><input type=\"checkbox\" id=\"changed-only\"> only steps that changed the program</label> "
       << "<span class=\"note\">(j and k: next and previous step)</span></p>\n";
  if (!m_PictureNote.empty()) html << "<p class=\"note\">" << escaped(m_PictureNote) << "</p>\n";
  html << "<nav><ol start=\"0\">\n";
  for (std::size_t i = 0; i < m_Steps.size(); ++i) {
    bool changed = i == 0 || m_Steps[i].text != m_Steps[i - 1].text;
    html << "<li" << (changed ? "" : " class=\"unchanged\"") << "><a href=\"#step-" << i << "\">"
         << escaped(m_Steps[i].name) << "</a>" << (changed ? "" : " (no change)") << "</li>\n";
  }
  html << "</ol></nav>\n<h2>Figures</h2>\n<pre>" << escaped(statistics) << "\n"
       << escaped(times) << "</pre>\n";
  for (std::size_t i = 0; i < m_Steps.size(); ++i) html << stepSection(i);
  html << "<script>" << kScript << "</script>\n</body>\n</html>\n";
  return html.str();
}

std::string Report::stepSection(std::size_t i) const {
  const Step& step = m_Steps[i];
  bool changed = i == 0 || step.text != m_Steps[i - 1].text;
  std::ostringstream html;
  html << "<section class=\"step" << (changed ? "" : " unchanged") << "\" id=\"step-" << i << "\">\n<h2>" << i
       << ". " << escaped(step.name)
       << (i == 0 ? "" : " <small>" + milliseconds(step.milliseconds) + "</small>") << "</h2>\n";
  if (i == 0)
    html << "<pre>" << escaped(step.text) << "</pre>\n";
  else if (changed)
    html << DiffTable(m_Steps[i - 1].text, step.text).html("before " + step.name, "after " + step.name);
  else
    html << "<p class=\"note\">no change</p>\n";
  if (!step.picture.empty()) html << "<figure>" << step.picture << "</figure>\n";
  html << "</section>\n";
  return html.str();
}

}  // namespace ssaopt::tool
