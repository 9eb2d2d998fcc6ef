// Runs one file test: a program in the textual format whose comments say how to run the tool on it and
// what its output must show.
//
//   // RUN: ssaopt --passes=ssa %s          a shell command, run in the directory of this file; %s is
//                                           its name, %t a temporary path of its own, and ssaopt the
//                                           tool under test. Several RUN lines: the output of each
//                                           must pass the checks.
//   // EXIT: 1                              the status every RUN line must end with (default 0)
//   // REQUIRES: dot                        a program that must be on the PATH, else the test is skipped
//   // CHECK: text                          a line after the previous match holds the text
//   // CHECK-NEXT: text                     the line right after the previous match holds it
//   // CHECK-EMPTY:                         the line right after the previous match is empty
//   // CHECK-NOT: text                      no line between the previous match and the next holds it
//
// In a text, {{N}} matches a number, {{...}} a regular expression, [[NAME:...]] matches the expression
// and names what it matched, and [[NAME]] matches what it named: bb{{N}} tolerates block numbers, and
// x.[[X:N]] = ...; y = x.[[X]] follows one version.
//
//   ssaopt_filetest --tool TOOL FILE            runs the test (status 77: skipped)
//   ssaopt_filetest --tool TOOL --update FILE   writes the checks from the output of the first RUN line:
//                                               every line, with block numbers as bb{{N}}
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iostream>
#include <map>
#include <optional>
#include <regex>
#include <sstream>
#include <string>
#include <vector>

namespace {

namespace fs = std::filesystem;

constexpr int kSkipped = 77;

struct Check {
  enum class Kind { Plain, Next, Empty, Not };
  Kind kind;
  std::string pattern;
  std::size_t line;  // in the test file, from 1
};

struct TestFile {
  std::vector<std::string> lines;
  std::vector<std::string> runs;
  std::vector<std::string>
  requires;
  int status = 0;
  std::vector<Check> checks;
};

std::string readFile(const fs::path& path) {
  std::ifstream file(path, std::ios::binary);
  std::ostringstream text;
  text << file.rdbuf();
  return text.str();
}

std::vector<std::string> splitLines(const std::string& text) {
  std::vector<std::string> lines;
  std::istringstream in(text);
  for (std::string line; std::getline(in, line);) lines.push_back(line);
  return lines;
}

// The directive of a comment line ("RUN", "CHECK-NEXT", ...) and the text after its colon.
std::optional<std::pair<std::string, std::string>> directiveOf(const std::string& line) {
  static const std::regex kDirective(
      R"(^\s*//\s*(RUN|EXIT|REQUIRES|CHECK|CHECK-NEXT|CHECK-EMPTY|CHECK-NOT):(.*)$)");
  std::smatch match;
  if (!std::regex_match(line, match, kDirective)) return std::nullopt;
  std::string text = match[2];
  if (!text.empty() && text.front() == ' ') text.erase(0, 1);
  while (!text.empty() && (text.back() == ' ' || text.back() == '\r')) text.pop_back();
  return std::make_pair(std::string(match[1]), text);
}

bool isCheck(const std::string& directive) { return directive.rfind("CHECK", 0) == 0; }

TestFile readTest(const fs::path& path) {
  TestFile test;
  test.lines = splitLines(readFile(path));
  for (std::size_t i = 0; i < test.lines.size(); ++i) {
    auto directive = directiveOf(test.lines[i]);
    if (!directive) continue;
    const auto& [name, text] = *directive;
    if (name == "RUN") test.runs.push_back(text);
    if (name == "EXIT") test.status = std::atoi(text.c_str());
    if (name == "REQUIRES") test.requires.push_back(text);
    if (name == "CHECK") test.checks.push_back({Check::Kind::Plain, text, i + 1});
    if (name == "CHECK-NEXT") test.checks.push_back({Check::Kind::Next, text, i + 1});
    if (name == "CHECK-EMPTY") test.checks.push_back({Check::Kind::Empty, text, i + 1});
    if (name == "CHECK-NOT") test.checks.push_back({Check::Kind::Not, text, i + 1});
  }
  return test;
}

// ---- Patterns ----------------------------------------------------------------------------------------

std::string escapedForRegex(const std::string& text) {
  static const std::string kSpecial = R"(\^$.|?*+()[]{}/)";
  std::string escaped;
  for (char c : text) {
    if (kSpecial.find(c) != std::string::npos) escaped += '\\';
    escaped += c;
  }
  return escaped;
}

std::string expression(const std::string& inner) { return inner == "N" ? "[0-9]+" : inner; }

// A pattern as a regular expression, with the groups that name what they match.
struct Pattern {
  std::regex regex;
  std::vector<std::string> names;  // of groups 1, 2, ...
};

Pattern compile(const std::string& text, const std::map<std::string, std::string>& named) {
  std::string regex;
  std::vector<std::string> names;
  for (std::size_t i = 0; i < text.size();) {
    bool braces = text.compare(i, 2, "{{") == 0, brackets = text.compare(i, 2, "[[") == 0;
    std::size_t close = braces     ? text.find("}}", i + 2)
                        : brackets ? text.find("]]", i + 2)
                                   : std::string::npos;
    if (close == std::string::npos) {
      regex += escapedForRegex(text.substr(i, 1));
      ++i;
      continue;
    }
    std::string inner = text.substr(i + 2, close - i - 2);
    i = close + 2;
    if (braces) {
      regex += "(?:" + expression(inner) + ")";
    } else if (inner.find(':') != std::string::npos) {
      names.push_back(inner.substr(0, inner.find(':')));
      regex += "(" + expression(inner.substr(inner.find(':') + 1)) + ")";
    } else {
      auto found = named.find(inner);
      regex += escapedForRegex(found == named.end() ? "[[" + inner + "]]" : found->second);
    }
  }
  return {std::regex(regex), names};
}

// ---- Checking ------------------------------------------------------------------------------------------

class Checker {
public:
  Checker(const std::vector<std::string>& output, const fs::path& file) : m_Output(output), m_File(file) {}

  // Empty when every check passes; else what failed, with the output around it.
  std::string run(const std::vector<Check>& checks) {
    std::size_t from = 0;  // the first line a CHECK may match
    std::vector<const Check*> pendingNots;
    for (const Check& check : checks) {
      if (check.kind == Check::Kind::Not) {
        pendingNots.push_back(&check);
        continue;
      }
      std::optional<std::size_t> found = find(check, from);
      if (!found) return failure(check, from, "not found");
      for (const Check* pNot : pendingNots)
        if (std::optional<std::size_t> there = findBetween(*pNot, from, *found))
          return failure(*pNot, *there, "found where it must not be");
      pendingNots.clear();
      from = *found + 1;
    }
    for (const Check* pNot : pendingNots)
      if (std::optional<std::size_t> there = findBetween(*pNot, from, m_Output.size()))
        return failure(*pNot, *there, "found where it must not be");
    return "";
  }

private:
  std::optional<std::size_t> find(const Check& check, std::size_t from) {
    if (check.kind == Check::Kind::Empty)
      return from < m_Output.size() && m_Output[from].empty() ? std::optional<std::size_t>(from)
                                                              : std::nullopt;
    std::size_t to = check.kind == Check::Kind::Next ? std::min(from + 1, m_Output.size()) : m_Output.size();
    return match(check, from, to, true);
  }

  std::optional<std::size_t> findBetween(const Check& check, std::size_t from, std::size_t to) {
    return match(check, from, to, false);
  }

  std::optional<std::size_t> match(const Check& check, std::size_t from, std::size_t to, bool name) {
    Pattern pattern = compile(check.pattern, m_Named);
    for (std::size_t i = from; i < to; ++i) {
      std::smatch found;
      if (!std::regex_search(m_Output[i], found, pattern.regex)) continue;
      for (std::size_t group = 0; name && group < pattern.names.size(); ++group)
        m_Named[pattern.names[group]] = found[group + 1];
      return i;
    }
    return std::nullopt;
  }

  std::string failure(const Check& check, std::size_t near, const std::string& what) const {
    static const char* const kKinds[] = {"CHECK", "CHECK-NEXT", "CHECK-EMPTY", "CHECK-NOT"};
    std::ostringstream text;
    text << m_File.string() << ":" << check.line << ": " << kKinds[static_cast<int>(check.kind)] << ": "
         << check.pattern << "\n  " << what << "; the output from line " << near + 1 << ":\n";
    for (std::size_t i = near; i < std::min(m_Output.size(), near + 8); ++i)
      text << "  " << i + 1 << " | " << m_Output[i] << "\n";
    return text.str();
  }

  const std::vector<std::string>& m_Output;
  const fs::path& m_File;
  std::map<std::string, std::string> m_Named;
};

// ---- Running -------------------------------------------------------------------------------------------

std::string quoted(const std::string& text) { return "'" + text + "'"; }

std::string replacedAll(std::string text, const std::string& what, const std::string& with) {
  for (std::size_t at = text.find(what); at != std::string::npos; at = text.find(what, at + with.size()))
    text.replace(at, what.size(), with);
  return text;
}

struct RunResult {
  int status;
  std::string out;
  std::string err;
};

class Runner {
public:
  Runner(const fs::path& tool, const fs::path& file)
      : m_ToolDirectory(fs::absolute(tool).parent_path()), m_File(fs::absolute(file)) {
    m_Temporary = fs::temp_directory_path() /
                  ("ssaopt-filetest-" + m_File.stem().string() + "-" + std::to_string(getpid()));
    fs::create_directories(m_Temporary);
  }
  ~Runner() {
    std::error_code ignored;
    fs::remove_all(m_Temporary, ignored);
  }
  Runner(const Runner&) = delete;
  Runner& operator=(const Runner&) = delete;

  // The shell runs the command with the tool first on the PATH; standard error goes to a file.
  RunResult run(const std::string& command) const {
    std::string line = replacedAll(replacedAll(command, "%s", quoted(m_File.filename().string())), "%t",
                                   quoted((m_Temporary / "t").string()));
    fs::path errPath = m_Temporary / "stderr";
    std::string shell = "PATH=" + quoted(m_ToolDirectory.string()) + ":\"$PATH\"; export PATH; cd " +
                        quoted(m_File.parent_path().string()) + " && (" + line + ") 2>" +
                        quoted(errPath.string());
    RunResult result{-1, "", ""};
    std::FILE* pPipe = popen(shell.c_str(), "r");
    if (!pPipe) return result;
    char buffer[4096];
    for (std::size_t n; (n = std::fread(buffer, 1, sizeof buffer, pPipe)) > 0;) result.out.append(buffer, n);
    int status = pclose(pPipe);
    result.status = WIFEXITED(status) ? WEXITSTATUS(status) : -1;
    result.err = readFile(errPath);
    return result;
  }

  bool onPath(const std::string& program) const {
    return run("command -v " + quoted(program) + " >/dev/null").status == 0;
  }

private:
  fs::path m_ToolDirectory;
  fs::path m_File;
  fs::path m_Temporary;
};

int test(const Runner& runner, const TestFile& file, const fs::path& path) {
  for (const std::string& program : file.requires)
    if (!runner.onPath(program)) {
      std::cout << "skipped: " << program << " is not installed\n";
      return kSkipped;
    }
  if (file.runs.empty()) {
    std::cerr << path.string() << ": no RUN line\n";
    return 1;
  }
  for (const std::string& command : file.runs) {
    RunResult result = runner.run(command);
    std::string problem;
    if (result.status != file.status)
      problem = path.string() + ": exit status " + std::to_string(result.status) + ", expected " +
                std::to_string(file.status) + "\n";
    std::vector<std::string> output = splitLines(result.out);
    if (problem.empty()) problem = Checker(output, path).run(file.checks);
    if (!problem.empty()) {
      std::cerr << "RUN: " << command << "\n" << problem << "standard error:\n" << result.err;
      return 1;
    }
  }
  return 0;
}

// A line of output as a check: block numbers (bb12, #block_3) tolerated.
std::string generalised(const std::string& line) {
  static const std::regex kBlockNumber("(\\bbb|#block_)[0-9]+");
  return std::regex_replace(line, kBlockNumber, "$1{{N}}");
}

int update(const Runner& runner, const TestFile& file, const fs::path& path) {
  if (file.runs.empty()) {
    std::cerr << path.string() << ": no RUN line\n";
    return 1;
  }
  std::vector<std::string> output = splitLines(runner.run(file.runs.front()).out);
  std::vector<std::string> checks;
  for (const std::string& line : output) {
    bool first = checks.empty();
    if (first && line.empty()) continue;
    checks.push_back(line.empty()
                         ? "// CHECK-EMPTY:"
                         : std::string(first ? "// CHECK: " : "// CHECK-NEXT: ") + generalised(line));
  }
  std::vector<std::string> lines;
  bool placed = false;
  for (const std::string& line : file.lines) {
    auto directive = directiveOf(line);
    if (!directive || !isCheck(directive->first)) {
      lines.push_back(line);
    } else if (!placed) {
      lines.insert(lines.end(), checks.begin(), checks.end());
      placed = true;
    }
  }
  if (!placed) lines.insert(lines.end(), checks.begin(), checks.end());
  std::ofstream out(path, std::ios::binary);
  for (const std::string& line : lines) out << line << "\n";
  std::cout << "updated " << path.string() << "\n";
  return 0;
}

}  // namespace

int main(int argc, char** argv) {
  std::vector<std::string> arguments(argv + 1, argv + argc);
  fs::path tool;
  bool updating = false;
  std::vector<fs::path> files;
  for (std::size_t i = 0; i < arguments.size(); ++i) {
    if (arguments[i] == "--tool" && i + 1 < arguments.size())
      tool = arguments[++i];
    else if (arguments[i] == "--update")
      updating = true;
    else
      files.push_back(arguments[i]);
  }
  if (tool.empty() || files.empty()) {
    std::cerr << "usage: ssaopt_filetest --tool TOOL [--update] FILE...\n";
    return 2;
  }
  int status = 0;
  for (const fs::path& path : files) {
    Runner runner(tool, path);
    TestFile file = readTest(path);
    int result = updating ? update(runner, file, path) : test(runner, file, path);
    if (result != 0 && status == 0) status = result;
  }
  return status;
}
