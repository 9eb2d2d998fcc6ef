// The steps of the front end, in the order it runs them. Each records the errors it finds and goes on
// with the next declaration or statement; nothing is put into the graph before every check has
// passed, except what outlining can only show once it is done.
#pragma once

#include <memory>
#include <string>
#include <string_view>
#include <unordered_map>
#include <unordered_set>
#include <vector>

#include "ssaopt/client/diagnostics.h"
#include "ssaopt/client/program.h"
#include "ssaopt/client/syntax.h"
#include "ssaopt/ir/statement.h"

namespace ssaopt::client::detail {

// What the checks found so far: the diagnostics, and the names whose declarations had errors. A use
// of such a name says nothing new, so it is dropped without a message (see FollowUpError).
struct CheckState {
  explicit CheckState(DiagnosticList& list) : diagnostics(list) {}

  DiagnosticList& diagnostics;
  std::unordered_set<std::string_view> failedVariables;
  std::unordered_set<std::string_view> failedProcedures;
};

// Thrown at a use of a name whose declaration had an error: the statement goes without a message.
struct FollowUpError {};

// ---- Declarations (declarations.cpp) -----------------------------------------------------------

void declareVariables(const SyntaxProgram& syntax, Program& program, CheckState& state);

// Whether `value` can be given to the variable: its data type holds it or, for a scaled variable,
// holds the stored integer that stands for it.
bool variableHolds(const KvCCfgSFVariable& variable, double value);

// A procedure as calls see it.
struct Signature {
  const SyntaxProcedure* pSyntax;
  std::vector<KvCCfgSFVariable*> formals;
};
using Signatures = std::unordered_map<std::string_view, Signature>;

// Checks the procedures' names and formal parameters, and that "#main" exists. A procedure declared
// twice keeps its first declaration.
Signatures declareProcedures(const SyntaxProgram& syntax, Program& program, CheckState& state);

// ---- Procedure bodies (resolve.cpp, reachability.cpp) --------------------------------------------

// Successor of a block that leaves the procedure.
inline constexpr int kEnd = -1;

struct ResolvedBlock {
  const SyntaxBlock* pSyntax = nullptr;
  std::vector<std::unique_ptr<KvCCfgStatement>> statements;
  KvCCfgSFExpression* pCondition = nullptr;  // of a two-way branch
  int onTrue = kEnd;                         // the only successor of a block without condition
  int onFalse = kEnd;
  bool reached = false;
};

struct ResolvedProcedure {
  const SyntaxProcedure* pSyntax = nullptr;
  std::string name;
  std::vector<ResolvedBlock> blocks;  // every block of the text; only the reached ones are built
};

// Resolves names, checks statements and conditions, and links blocks to their successors. A
// statement with an error is left out, a jump to a missing label goes to the end.
ResolvedProcedure resolveProcedure(const SyntaxProcedure& syntax, const Signatures& signatures,
                                   Program& program, CheckState& state);

// Marks the blocks reached from the first; warns about the others, which are not built. An error when
// the procedure never reaches its end.
void markReachedBlocks(ResolvedProcedure& procedure, DiagnosticList& diagnostics);

// ---- The graph (build_graph.cpp) -----------------------------------------------------------------

void buildGraph(std::vector<ResolvedProcedure>& procedures, Program& program);

}  // namespace ssaopt::client::detail
