// The interpreter of the reference client: runs a program held in its control-flow graph the way the
// C code emitted from that graph runs, at any stage of the pipeline, and records what an observer of
// the program sees (its trace). Running a program before and after a pipeline on the same inputs and
// comparing the traces is the differential check (checkBehaviour): the evidence that the
// transformations kept the program's behaviour.
//
// How a graph reads as C, before and after the SSA transformation alike:
//   - every SSA version reads and writes the variable it stands for, so phi functions, value-return
//     statements, output statements and virtual assignments do nothing;
//   - assignments and initialisation assignments store what the library assumes is stored: clamped to
//     a saturated border, else the value the scaling represents, else the value cast to the type; an
//     element write stores into one element, and a value assigned to a whole array goes to every
//     element (the initial value after the SSA transformation);
//   - a call assigns its arguments to the callee's formal parameters exactly once: at the call itself,
//     all arguments evaluated before any is stored, until the SSA transformation has placed the
//     parameter statements in the callee's first block; from then on at those statements, of which
//     the ones that pass a variable to itself change nothing;
//   - control follows the control-flow edges only (SSA edges are ignored), a branch its condition
//     (true when not 0), whatever dividing blocks and removing dead code made of the chains;
//   - the loop around "#main" runs a given number of steps, then leaves;
//   - a volatile variable (or element of a volatile array) reads the next value of its own input
//     stream at every read; what is stored into it is kept, but only the output and external calls
//     see it. An external call records the values of the variables it uses and gives every element
//     of each non-volatile array it may modify the next value of that array's stream;
//   - operators compute as the value arithmetic does, so nothing is undefined: a remainder without a
//     32-bit result (x % 0) is 0, an element read outside its array is 0, and an element write outside
//     it stores nothing. Dead code may so go wrong without stopping a run that a transformation was
//     right to remove it from.
//
// A run stops at a guard rather than hang or exhaust memory: after too many statements in one step, or
// at a call nested too deep (calls use an explicit stack, never the interpreter's own). Optimisation
// changes how many statements a run executes, so such a run proves nothing either way: it is
// inconclusive. A graph that cannot be followed (a block with two successors and no condition, a
// condition that selects a removed edge, a parameter without argument for the active call) ends the
// run with a fault, which the trace records and the comparison compares.
#pragma once

#include <cstddef>
#include <cstdint>
#include <deque>
#include <memory>
#include <optional>
#include <string>
#include <unordered_map>
#include <vector>

#include "ssaopt/client/program.h"

namespace ssaopt::client {

// What assigning `value` to `variable` stores: the saturated border, else the value the scaling
// represents, else the value cast to the data type (a Boolean 0 or 1), as constant propagation
// assumes.
double storedValue(const KvCCfgVariable& variable, double value);

// ---- Inputs -------------------------------------------------------------------------------------

// Where volatile variables and the arrays that external calls modify take their values from: one
// stream per variable, so that a read takes the same value however reads of other variables move.
class InputStreams {
public:
  virtual ~InputStreams() = default;
  // The next value of `variable`'s stream; empty when the stream has no more.
  virtual std::optional<double> next(const KvCCfgSFVariable& variable) = 0;
};

// Pseudo-random streams that never end. Each variable's stream is a splitmix64 sequence started from
// the seed mixed with the FNV-1a hash of the variable's name, so a value depends only on the seed, the
// name and the number of reads of that variable before it. Every value is one the variable can hold:
// within its saturation limits and, for integers, its type's range (a scaled variable's stored
// integer). A quarter of them are borders or next to 0, a quarter small numbers, where programs tend
// to go wrong or to compare.
class SeededInputs : public InputStreams {
public:
  explicit SeededInputs(std::uint64_t seed) : m_Seed(seed) {}
  std::optional<double> next(const KvCCfgSFVariable& variable) override;

private:
  std::uint64_t m_Seed;
  std::unordered_map<const KvCCfgSFVariable*, std::uint64_t> m_States;
};

// Streams given as text, one line per variable: its name and its values in reading order
// ("speed 10 -3 0.5"); '#' starts a comment. A variable without a line has an empty stream.
class ListedInputs : public InputStreams {
public:
  // The streams, or nothing with `error` set to the line that is not a name followed by numbers.
  static std::optional<ListedInputs> parse(const std::string& text, std::string& error);
  std::optional<double> next(const KvCCfgSFVariable& variable) override;

  // The names the text gives values for, in the order they first appear.
  const std::vector<std::string>& variableNames() const { return m_Names; }

private:
  std::unordered_map<std::string, std::deque<double>> m_Values;
  std::vector<std::string> m_Names;
};

// ---- The trace ----------------------------------------------------------------------------------

// A variable as observed: its value, or every element of an array.
struct Observation {
  std::string variable;
  std::vector<double> values;
  bool isArray = false;
};

struct Event {
  enum class Kind { ExternCall, Output };
  Kind kind;
  std::uint64_t step;  // the pass of "#main" it happened in, from 1
  std::string name;    // of the external function, or of the output variable
  // The variables an external call uses, in declaration order; the output variable alone.
  std::vector<Observation> observations;
};

enum class Ending { Completed, Fault, StatementLimit, CallDepthLimit, InputExhausted };

struct Trace {
  // External calls in order, then the values of the output variables in declaration order.
  std::vector<Event> events;
  Ending ending = Ending::Completed;
  std::uint64_t step = 0;        // the step the run ended in (all of them when it completed)
  std::string detail;            // why the run stopped, unless it completed
  std::uint64_t statements = 0;  // statements executed and blocks entered; not compared
};

// Whether the run says something about the program: it did not stop at a guard or run out of input.
bool isConclusive(const Trace& trace);

// "step 2: extern log(alarm = 1, buf = [0, 3])", "output total = 12".
std::string formatEvent(const Event& event);
// "completed 3 steps", "fault in step 2: ...", "inconclusive in step 2: ...".
std::string formatEnding(const Trace& trace);
// One line per event, then the ending and the statement count.
std::string formatTrace(const Trace& trace);

// Where two traces first part: the step, and each trace's event (or ending) there.
struct TraceDifference {
  std::uint64_t step;
  std::string original;
  std::string transformed;
};

// Nothing when the traces are equal: the same events with the same names and values, and the same
// ending. Values compare exactly, except that +0.0 equals -0.0 and NaN equals NaN.
std::optional<TraceDifference> compareTraces(const Trace& original, const Trace& transformed);

// ---- Running ------------------------------------------------------------------------------------

struct RunLimits {
  // A step of controller code runs a few hundred statements, a few ten thousand with loops over
  // large tables; a step that runs this many has gone into an endless loop. The limit is per step
  // so that an endless loop is found as soon in a long run as in a short one.
  static constexpr std::uint64_t kDefaultMaxStatementsPerStep = 1'000'000;
  static constexpr std::size_t kDefaultMaxCallDepth = 1000;

  std::uint64_t steps = 1;  // passes of "#main"; 0 counts as 1, since the body runs before the loop test
  std::uint64_t maxStatementsPerStep = kDefaultMaxStatementsPerStep;
  std::size_t maxCallDepth = kDefaultMaxCallDepth;
};

// Told what a run does that constant propagation made claims about (see checkPropagation).
class RunObserver {
public:
  virtual ~RunObserver() = default;
  // An SSA version of a scalar variable that is neither volatile nor an array was defined where the
  // run is, and its variable now holds `value`. Phi functions, value returns and virtual assignments
  // count, though they compute nothing: the version is the value the variable holds there.
  virtual void defined(KvCCfgVariable& version, double value, std::uint64_t step) = 0;
  // The condition of block `block` sent control to its true or its false edge.
  virtual void branched(ssaopt::node block, bool taken, std::uint64_t step) = 0;
};

namespace detail {
struct ProgramCode;
}

// A program made ready to run: every block's statements, successors and expressions resolved once,
// so that a run costs time linear in the statements it executes. It reads the graph as it is when
// made and points to the program's variables and calls: make a new one after transforming the
// program, and none may outlive its program.
class Interpreter {
public:
  explicit Interpreter(const Program& program);
  ~Interpreter();
  Interpreter(const Interpreter&) = delete;
  Interpreter& operator=(const Interpreter&) = delete;

  // Runs from the start with every variable at its initial value, telling `pObserver`, when given,
  // of every definition and branch.
  Trace run(const RunLimits& limits, InputStreams& inputs, RunObserver* pObserver = nullptr) const;

private:
  std::unique_ptr<const detail::ProgramCode> m_pCode;
};

// ---- The differential check ---------------------------------------------------------------------

struct CheckSettings {
  std::uint64_t runs = 20;
  std::uint64_t firstSeed = 1;  // run r reads the streams of seed firstSeed + r
  RunLimits limits;
};

struct InconclusiveRun {
  std::uint64_t seed;
  bool inOriginal;  // which program stopped at a guard (the original when both did)
  Trace trace;
};

struct BehaviourDifference {
  std::uint64_t seed;
  TraceDifference where;
};

struct CheckReport {
  std::uint64_t sameRuns = 0;
  std::vector<InconclusiveRun> inconclusive;
  std::optional<BehaviourDifference> difference;  // the first; no run is made after it
};

// Runs both programs on the same streams, run after run, until the first difference.
CheckReport checkBehaviour(const Program& original, const Program& transformed,
                           const CheckSettings& settings);

// One line per inconclusive run, then the difference, or "same behaviour on N runs".
std::string formatReport(const CheckReport& report);

// ---- The oracle of constant propagation ---------------------------------------------------------

// The first claim of constant propagation that a run contradicts: where, and what.
struct PropagationViolation {
  std::uint64_t seed;
  std::uint64_t step;
  std::string fact;  // "x.5 = 32767, outside its propagated range [-32768, -32768]"
};

struct PropagationReport {
  std::uint64_t runs = 0;  // runs that contradicted nothing
  std::optional<PropagationViolation> violation;
};

// Runs `program` as constant propagation left it (before later steps change it) on the streams of
// `settings`, and checks what propagation claims against every run, until the first contradiction:
// wherever a version is defined, the value its variable holds equals the version's constant and lies
// in its range (a bound that is not a constant claims nothing); every branch goes the way its
// condition's constant says; and no run faults, which after propagation means that control took an
// edge that dead-code removal took away as never executed. A run stopped at a guard still counts up
// to there.
PropagationReport checkPropagation(const Program& program, const CheckSettings& settings);

// The contradiction, or "propagated values held on N runs".
std::string formatPropagationReport(const PropagationReport& report);

}  // namespace ssaopt::client
