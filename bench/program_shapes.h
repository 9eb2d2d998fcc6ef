// Deterministic controller-like programs in the textual format, of a given number of statements, for
// the benchmarks and for the golden outputs that keep the pipeline's results fixed while it is made
// faster.
#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <vector>

namespace ssaopt::bench {

enum class Shape {
  // #main and a few stages of hundreds of thousands of statements each at the largest size.
  FewLargeProcedures,
  // Thousands of procedures of a few dozen statements, calling one another; a third of them are
  // called from two places and stay procedures, the others are inlined.
  ManySmallProcedures,
  // Procedures in modules of a few dozen, each called from two places, every one of them reading
  // and writing many of the hundred variables of its module and of a pool that all modules share,
  // as random programs do: SSA form adds interface statements for every variable a procedure
  // reaches, about ten times the statements written.
  SharedVariables,
  // State machines as a chart front end writes them: a chain of comparisons of a state variable,
  // one arm per state with a state machine of its own inside, all arms joining one block. One arm
  // per 100 statements: 10 arms at 10^3 statements, 10,000 at 10^6.
  StateMachine,
};

inline constexpr Shape kShapes[] = {Shape::FewLargeProcedures, Shape::ManySmallProcedures,
                                    Shape::SharedVariables, Shape::StateMachine};

// "large", "small", "shared" or "chart".
const char* shapeName(Shape shape);
std::optional<Shape> shapeNamed(const std::string& name);

// A valid program of about `statements` statements (assignments, calls, external calls and branch
// conditions; the count is met to within one segment of a few statements). The same arguments give
// the same text.
std::string makeControllerProgram(std::size_t statements, Shape shape);

// The sizes the benchmarks measure in `shape`, smallest first; the golden outputs keep the results
// at the two smallest. The shared shape is measured at a tenth of the others' sizes, which SSA form
// makes about as large as theirs.
std::vector<std::size_t> benchmarkSizes(Shape shape);

// The arms of the outer state machine of a StateMachine program of `statements` statements.
std::size_t chartArms(std::size_t statements);

// Programs that each push one dimension to its limit, of a size: a flat expression of that many terms
// (a = x + x + ...), one join of that many in-edges (a phi function of as many operands), and loops
// nested that deep.
enum class Corner { FlatExpression, WideJoin, LoopNest };
inline constexpr Corner kCorners[] = {Corner::FlatExpression, Corner::WideJoin, Corner::LoopNest};

// "flat", "join" or "nest".
const char* cornerName(Corner corner);
std::optional<Corner> cornerNamed(const std::string& name);
std::string makeCornerProgram(Corner corner, std::size_t size);

namespace detail {
std::string makeSharedVariablesProgram(std::size_t statements);
std::string makeStateMachineProgram(std::size_t statements);
}  // namespace detail

}  // namespace ssaopt::bench
