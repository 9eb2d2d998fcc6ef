// Deterministic controller-like programs in the textual format, of a given number of statements, for
// the benchmarks and for the golden outputs that keep the pipeline's results fixed while it is made
// faster.
#pragma once

#include <cstddef>
#include <string>

namespace ssaopt::bench {

enum class Shape {
  // #main and a few stages of hundreds of thousands of statements each at the largest size.
  FewLargeProcedures,
  // Thousands of procedures of a few dozen statements, calling one another; a third of them are
  // called from two places and stay procedures, the others are inlined.
  ManySmallProcedures,
};

// "large" or "small".
const char* shapeName(Shape shape);

// A valid program of about `statements` statements (assignments, calls, external calls and branch
// conditions; the count is met to within one segment of a few statements). The same arguments give
// the same text.
std::string makeControllerProgram(std::size_t statements, Shape shape);

}  // namespace ssaopt::bench
