// What the fuzz command checks on one program, and how a failure is reproduced.
#pragma once

#include <string>
#include <vector>

#include "ssaopt/client/program.h"

namespace ssaopt::tool {

enum class ProblemKind {
  None,
  Invalid,      // the front end rejected the program
  Report,       // an internal error or consistency report during the pipeline
  RoundTrip,    // a program printed before the SSA transformation reads back differently
  Propagation,  // a run contradicts what constant propagation claims of it
  Behaviour,    // the pipeline changed what the program does
  Determinism,  // another process printed a different result
};

struct Problem {
  ProblemKind kind = ProblemKind::None;
  std::string detail;  // lines, each ending in a newline

  explicit operator bool() const { return kind != ProblemKind::None; }
};

// Whether pass `name` propagates constants, after which the interpreter checks what it claims.
bool propagatesConstants(const std::string& name);

class ProgramCheck {
public:
  // `tool` is the ssaopt executable that the determinism check runs.
  ProgramCheck(std::vector<std::string> pipeline, std::string tool);

  // The first problem of the program in `text`: it loads; the pipeline, with the internal checks on,
  // reports nothing and leaves a consistent graph after every pass; the program printed after the
  // front end and after every pass before "ssa" reads back as the same text; runs on a few input
  // streams right after each constant propagation agree with what it claims; the program behaves
  // the same before and after the pipeline on those streams; and another process optimising it under
  // other allocator settings prints the same result, values and ranges included.
  // The determinism check starts a process, which takes longer than all other checks together, so
  // the caller decides which programs it runs on.
  // Everything the check allocates is freed when it returns: it installs a pool of its own.
  Problem findProblem(const std::string& text, bool checkDeterminism) const;

  // The command that shows `kind` of problem on the program in file `path`.
  std::string reproduceCommand(ProblemKind kind, const std::string& path) const;

  // " '--passes=...'" for a pipeline other than the default one; empty for the default one.
  std::string passesOption() const;

private:
  // The program as printed after the front end or a pass, in the textual format.
  struct PrintedSource {
    std::string after;
    std::string text;
  };

  // What running the pipeline found: the reports of the internal checks and of the graph checked
  // after every pass, the program printed wherever the format can still read it back, and the first
  // claim of a constant propagation that a run contradicts.
  struct Transformation {
    std::string reports;
    std::vector<PrintedSource> sources;
    std::string contradiction;
  };

  Transformation transform(client::Program& program) const;
  Problem findDeterminismProblem(const std::string& text, const std::string& printed) const;
  // The command with which the other process optimises the program in file `path`.
  std::string otherProcessCommand(const std::string& path) const;

  std::vector<std::string> m_Pipeline;
  std::string m_Tool;
};

}  // namespace ssaopt::tool
