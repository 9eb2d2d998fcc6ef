// The differential check: a program and its transformed copy run on the same input streams, run
// after run, and their traces must agree.
#include "ssaopt/client/interpreter.h"

namespace ssaopt::client {

CheckReport checkBehaviour(const Program& original, const Program& transformed,
                           const CheckSettings& settings) {
  Interpreter before(original);
  Interpreter after(transformed);
  CheckReport report;
  for (std::uint64_t run = 0; run < settings.runs && !report.difference; ++run) {
    std::uint64_t seed = settings.firstSeed + run;
    SeededInputs originalInputs(seed);
    SeededInputs transformedInputs(seed);
    Trace expected = before.run(settings.limits, originalInputs);
    Trace actual = after.run(settings.limits, transformedInputs);
    if (!isConclusive(expected) || !isConclusive(actual)) {
      bool inOriginal = !isConclusive(expected);
      report.inconclusive.push_back(InconclusiveRun{seed, inOriginal, inOriginal ? expected : actual});
    } else if (std::optional<TraceDifference> where = compareTraces(expected, actual)) {
      report.difference = BehaviourDifference{seed, *where};
    } else {
      ++report.sameRuns;
    }
  }
  return report;
}

std::string formatReport(const CheckReport& report) {
  std::string text;
  for (const InconclusiveRun& run : report.inconclusive)
    text += "input seed " + std::to_string(run.seed) + ": the " +
            (run.inOriginal ? "original" : "transformed") + " program is " + formatEnding(run.trace) + "\n";
  if (report.difference) {
    const TraceDifference& where = report.difference->where;
    return text + "different behaviour with input seed " + std::to_string(report.difference->seed) +
           " in step " + std::to_string(where.step) + ":\n  original:    " + where.original +
           "\n  transformed: " + where.transformed + "\n";
  }
  text += "same behaviour on " + std::to_string(report.sameRuns) + (report.sameRuns == 1 ? " run" : " runs");
  if (!report.inconclusive.empty())
    text += ", " + std::to_string(report.inconclusive.size()) + " inconclusive";
  return text + "\n";
}

}  // namespace ssaopt::client
