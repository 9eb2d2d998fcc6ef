#include "program_check.h"

#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <memory>
#include <sstream>
#include <utility>

#include "passes.h"
#include "ssaopt/client/front_end.h"
#include "ssaopt/client/interpreter.h"
#include "ssaopt/client/printer.h"
#include "ssaopt/frame/pool.h"
#include "verification.h"

namespace ssaopt::tool {

namespace {

// Input streams each program runs on before and after the pipeline: a few, so that a thousand
// programs take seconds, while the many programs make up for the few streams.
constexpr std::uint64_t kRunsPerProgram = 5;

// Passes after which the printed program holds what the textual format has no syntax for: the
// initialisations of inlined formals, virtual assignments, and SSA versions with their phi functions
// and interface statements.
bool leavesTheFormat(const std::string& pass) {
  return pass == "inline" || pass == "valid-conditions" || pass == "ssa";
}

std::string commaSeparated(const std::vector<std::string>& names) {
  std::string list;
  for (const std::string& name : names) list += (list.empty() ? "" : ",") + name;
  return list;
}

// Empty when `printed` reads back and prints as itself.
std::string roundTripProblem(const std::string& printed, const std::string& after) {
  client::LoadResult reloaded = client::loadProgram(printed);
  if (!reloaded.program)
    return "the program printed after " + after +
           " does not read back: " + client::formatDiagnostic("printed.ssa", reloaded.diagnostics.back()) +
           "\n";
  if (client::printProgram(*reloaded.program) != printed)
    return "the program printed after " + after + " prints differently when read back\n";
  return "";
}

// The first line where `ours` and `theirs` differ, both versions.
std::string firstDifference(const std::string& ours, const std::string& theirs) {
  std::istringstream oursIn(ours);
  std::istringstream theirsIn(theirs);
  std::string ourLine;
  std::string theirLine;
  for (int line = 1;; ++line) {
    bool ourMore = static_cast<bool>(std::getline(oursIn, ourLine));
    bool theirMore = static_cast<bool>(std::getline(theirsIn, theirLine));
    if (!ourMore && !theirMore) return "";
    if (ourMore != theirMore || ourLine != theirLine)
      return "  line " + std::to_string(line) + " here:    " + (ourMore ? ourLine : "(end)") + "\n  line " +
             std::to_string(line) + " there:   " + (theirMore ? theirLine : "(end)") + "\n";
  }
}

// A file that removes itself, for the program another process reads.
class TemporaryFile {
public:
  explicit TemporaryFile(const std::string& text) {
    std::string pattern =
        (std::getenv("TMPDIR") ? std::getenv("TMPDIR") : "/tmp") + std::string("/ssaopt-fuzz-XXXXXX");
    std::vector<char> name(pattern.begin(), pattern.end());
    name.push_back('\0');
    int descriptor = mkstemp(name.data());
    if (descriptor < 0) return;
    close(descriptor);
    m_Path = name.data();
    std::ofstream(m_Path, std::ios::binary) << text;
  }
  ~TemporaryFile() {
    if (!m_Path.empty()) std::remove(m_Path.c_str());
  }
  TemporaryFile(const TemporaryFile&) = delete;
  TemporaryFile& operator=(const TemporaryFile&) = delete;

  const std::string& path() const { return m_Path; }

private:
  std::string m_Path;
};

// Standard output of `command`, run by the shell; false when it could not run or failed.
bool captureOutput(const std::string& command, std::string& output) {
  std::unique_ptr<FILE, int (*)(FILE*)> pipe(popen(command.c_str(), "r"), pclose);
  if (!pipe) return false;
  char buffer[4096];
  for (std::size_t read; (read = std::fread(buffer, 1, sizeof buffer, pipe.get())) > 0;)
    output.append(buffer, read);
  return pclose(pipe.release()) == 0;
}

// The other process runs with other allocator settings, so that its objects lie elsewhere and in
// another order: glibc serves blocks of 4 KB and more from mmap instead of the heap, and fills
// allocated and freed memory with a byte pattern. A result that follows addresses, or reads memory
// never written, then differs.
constexpr const char* kOtherAllocator = "GLIBC_TUNABLES=glibc.malloc.mmap_threshold=4096 MALLOC_PERTURB_=165";

// Both processes print the values and ranges too: a front end reads them, and they follow the order
// in which propagation merged what it found.
client::PrintOptions printedResult() {
  client::PrintOptions options;
  options.showValues = true;
  return options;
}

// The settings of the runs of each program: the seeds and limits of the behaviour check.
client::CheckSettings runSettings() {
  client::CheckSettings settings;
  settings.runs = kRunsPerProgram;
  return settings;
}

}  // namespace

bool propagatesConstants(const std::string& name) {
  return name == "sccp" || name == "sccp-keep-dead" || name == "propagate" || name == "propagate-keep-dead";
}

ProgramCheck::ProgramCheck(std::vector<std::string> pipeline, std::string tool)
    : m_Pipeline(std::move(pipeline)), m_Tool(std::move(tool)) {}

Problem ProgramCheck::findProblem(const std::string& text, bool checkDeterminism) const {
  // The graph leaves objects for the pool to take back; a pool per program keeps a long run's memory
  // at what one program needs. It must outlive both programs, so it comes first.
  ssaopt::PoolMemController pool;
  ssaopt::PoolMemController::Scope poolScope(&pool);
  client::LoadResult original = client::loadProgram(text);
  if (!original.program)
    return {ProblemKind::Invalid,
            client::formatDiagnostic("generated.ssa", original.diagnostics.back()) + "\n"};
  // Numbered as in the process that the determinism check starts, so nothing else may build library
  // objects between this load and printing the result.
  client::restartObjectNumbering();
  std::unique_ptr<client::Program> pTransformed = client::loadProgram(text).program;
  Transformation transformation = transform(*pTransformed);
  if (!transformation.reports.empty()) return {ProblemKind::Report, transformation.reports};
  std::string printed = client::printProgram(*pTransformed, printedResult());
  for (const PrintedSource& source : transformation.sources) {
    std::string problem = roundTripProblem(source.text, source.after);
    if (!problem.empty()) return {ProblemKind::RoundTrip, problem};
  }
  if (!transformation.contradiction.empty()) return {ProblemKind::Propagation, transformation.contradiction};
  client::CheckReport report = client::checkBehaviour(*original.program, *pTransformed, runSettings());
  if (report.difference) return {ProblemKind::Behaviour, client::formatReport(report)};
  return checkDeterminism ? findDeterminismProblem(text, printed) : Problem();
}

ProgramCheck::Transformation ProgramCheck::transform(client::Program& program) const {
  Transformation result;
  Verification verification;
  verification.checkGraph(program.graph(), "the front end");
  result.sources.push_back({"the front end", client::printProgram(program)});
  bool printable = true;
  for (const std::string& name : m_Pipeline) {
    runPipeline({name}, program);
    verification.checkGraph(program.graph(), "pass " + name);
    printable = printable && !leavesTheFormat(name);
    if (printable) result.sources.push_back({"pass " + name, client::printProgram(program)});
    if (propagatesConstants(name) && result.contradiction.empty()) {
      client::PropagationReport oracle = client::checkPropagation(program, runSettings());
      if (oracle.violation)
        result.contradiction = "after pass " + name + ", " + formatPropagationReport(oracle);
    }
  }
  std::ostringstream reports;
  verification.writeReports(reports);
  result.reports = reports.str();
  return result;
}

Problem ProgramCheck::findDeterminismProblem(const std::string& text, const std::string& printed) const {
  TemporaryFile file(text);
  std::string other;
  if (file.path().empty() || !captureOutput(otherProcessCommand(file.path()) + " 2>/dev/null", other))
    return {ProblemKind::Determinism, "another process could not optimise the program\n"};
  if (other != printed)
    return {ProblemKind::Determinism,
            "another process printed a different result\n" + firstDifference(printed, other)};
  return {};
}

std::string ProgramCheck::otherProcessCommand(const std::string& path) const {
  return std::string(kOtherAllocator) + " " + m_Tool + " --show-values" + passesOption() + " " + path;
}

std::string ProgramCheck::passesOption() const {
  return m_Pipeline == defaultPipeline() ? "" : " '--passes=" + commaSeparated(m_Pipeline) + "'";
}

std::string ProgramCheck::reproduceCommand(ProblemKind kind, const std::string& path) const {
  std::string passes = passesOption();
  switch (kind) {
    case ProblemKind::Behaviour:
    case ProblemKind::Propagation:
      return "ssaopt check " + path + passes;
    case ProblemKind::Determinism:
      return "ssaopt --show-values" + passes + " " + path + " > out1.ssa; " + kOtherAllocator +
             " ssaopt --show-values" + passes + " " + path + " > out2.ssa; cmp out1.ssa out2.ssa";
    case ProblemKind::RoundTrip:
      return "ssaopt --print-after-all" + passes + " " + path + " (read back each printed program)";
    default:
      return "ssaopt --verify" + passes + " " + path;
  }
}

}  // namespace ssaopt::tool
