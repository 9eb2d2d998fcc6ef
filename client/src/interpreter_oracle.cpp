// The interpreter as the oracle of constant propagation: a front end emits code from the values and
// ranges propagation leaves in the versions and from the blocks it leaves standing, so every run of
// the propagated program must agree with them. A run that does not is a miscompile in waiting, even
// where no step of the library reads the fact it breaks.
#include <cmath>
#include <memory>

#include "program_view.h"
#include "ssaopt/client/interpreter.h"
#include "ssaopt/client/numbers.h"
#include "statement_text.h"

namespace ssaopt::client {

namespace {

// The claim of a bound: none unless it is a constant. NaN lies in no range.
bool breaksLowerBound(const KvCCfgValue* pBound, double value) {
  return pBound && pBound->isConstant() && !(value >= pBound->getValue());
}

bool breaksUpperBound(const KvCCfgValue* pBound, double value) {
  return pBound && pBound->isConstant() && !(value <= pBound->getValue());
}

// The lattice's equality of constants (+0.0 is -0.0), and NaN is NaN.
bool holdsConstant(const KvCCfgValue& constant, double value) {
  return constant.getValue() == value || (std::isnan(constant.getValue()) && std::isnan(value));
}

class FactChecker : public RunObserver {
public:
  explicit FactChecker(const Program& program) : m_Program(program) {}

  void defined(KvCCfgVariable& version, double value, std::uint64_t step) override {
    if (m_Broken) return;
    const KvCCfgValue* pValue = version.getValue();
    if (pValue && pValue->isConstant() && !holdsConstant(*pValue, value))
      breakFact(step,
                holds(version, value) + ", not its propagated constant " + formatNumber(pValue->getValue()));
    else if (breaksLowerBound(version.getMinValue(), value) || breaksUpperBound(version.getMaxValue(), value))
      breakFact(step, holds(version, value) + ", outside its propagated range [" +
                          detail::valueText(*version.getMinValue()) + ", " +
                          detail::valueText(*version.getMaxValue()) + "]");
  }

  void branched(ssaopt::node block, bool taken, std::uint64_t step) override {
    if (m_Broken) return;
    KvCCfgExpression* pCondition = m_Program.graph().getBasicBlock(block)->getBranchCond();
    KvCCfgValue condition = pCondition->evaluate();
    if (condition.isConstant() && (condition.getValue() != 0.0) != taken)
      breakFact(step, blockName(block) + " goes " + (taken ? "true" : "false") +
                          ", though its condition was propagated as the constant " +
                          formatNumber(condition.getValue()));
  }

  // A fault ends a run only where control cannot go on: after propagation, where it takes an edge
  // that dead-code removal took away as never executed.
  void ended(const Trace& trace) {
    if (!m_Broken && trace.ending == Ending::Fault)
      breakFact(trace.step, "the run ends in a fault: " + trace.detail);
  }

  bool broken() const { return m_Broken; }
  std::uint64_t step() const { return m_Step; }
  const std::string& fact() const { return m_Fact; }

private:
  std::string holds(KvCCfgVariable& version, double value) {
    return view().nameOf(&version) + " = " + formatNumber(value);
  }

  std::string blockName(ssaopt::node block) {
    const std::string& label = view().labelOf(block);
    return label.empty() ? "bb" + std::to_string(m_Program.graph().getBasicBlock(block)->getIndex()) : label;
  }

  // Laying the program out to name its versions and blocks costs more than a run: only a broken fact
  // needs it.
  const detail::ProgramView& view() {
    if (!m_pView) m_pView = std::make_unique<detail::ProgramView>(m_Program);
    return *m_pView;
  }

  void breakFact(std::uint64_t step, std::string fact) {
    m_Broken = true;
    m_Step = step;
    m_Fact = std::move(fact);
  }

  const Program& m_Program;
  std::unique_ptr<detail::ProgramView> m_pView;
  bool m_Broken = false;
  std::uint64_t m_Step = 0;
  std::string m_Fact;
};

}  // namespace

PropagationReport checkPropagation(const Program& program, const CheckSettings& settings) {
  Interpreter interpreter(program);
  PropagationReport report;
  for (std::uint64_t run = 0; run < settings.runs && !report.violation; ++run) {
    std::uint64_t seed = settings.firstSeed + run;
    SeededInputs inputs(seed);
    FactChecker checker(program);
    checker.ended(interpreter.run(settings.limits, inputs, &checker));
    if (checker.broken())
      report.violation = PropagationViolation{seed, checker.step(), checker.fact()};
    else
      ++report.runs;
  }
  return report;
}

std::string formatPropagationReport(const PropagationReport& report) {
  if (report.violation)
    return "propagation claims what a run contradicts, with input seed " +
           std::to_string(report.violation->seed) + " in step " + std::to_string(report.violation->step) +
           ":\n  " + report.violation->fact + "\n";
  return "propagated values held on " + std::to_string(report.runs) + (report.runs == 1 ? " run" : " runs") +
         "\n";
}

}  // namespace ssaopt::client
