// State machines as a chart front end writes them. #main compares the state variable with one state
// after another; each state's arm runs its during actions, then the state machine of its sub-states
// (a chain of comparisons of its sub-state variable, each sub-state with actions and a transition),
// then its own outgoing transition, and every arm ends in the one block after the chain:
//
//   ck0: if state == 0 goto st0 else ck1;      st0: ... if in2 > 50 goto st0x else done;
//   ck1: if state == 1 goto st1 else ck2;      st0x: state = 8; sub0 = 0; goto done;
//   ...                                        done: out0 = s3 + t1; ...
//
// The join has two in-edges per arm, and SSA form gives it a phi function of as many operands for
// every variable that some arm assigns.
#include <algorithm>
#include <sstream>
#include <string>

#include "program_shapes.h"
#include "program_writing.h"

namespace ssaopt::bench {

namespace {

constexpr std::size_t kStatementsPerArm = 100;
constexpr std::size_t kMinimumArms = 10;
constexpr int kSubStates = 6;
constexpr int kSubStateVariables = 8;  // arm i keeps its sub-state in sub(i % 8)
constexpr int kDuringActions = 6;

void declareVariables(std::ostringstream& out) {
  declareNumbered(out, kInputs, "int16", "in", " scale(0.01) volatile");
  out << "var uint8 mode volatile;\n";
  out << "var uint16 state = 0;\n";
  declareNumbered(out, kSubStateVariables, "uint8", "sub", " = 0");
  out << "var uint16 ticks = 0;\n";
  declareNumbered(out, kTemporaries, "int16", "t", " scale(0.01) erasable = 0");
  declareNumbered(out, kStates, "int32", "s", " scale(0.001) saturate(-50..50) = 0");
  declareNumbered(out, kOutputs, "int16", "out", " scale(0.1) saturate(0..100) output = 0");
}

class ChartWriter : ControllerNames {
public:
  ChartWriter(std::ostringstream& out, Random& random, std::size_t arms)
      : ControllerNames(random), m_Text(out), m_Arms(arms) {}

  std::size_t write(std::size_t statements) {
    m_Text.line("extern read_inputs modifies(in0, in1, in2, in3, in4, in5, in6, in7, mode);");
    std::size_t armBudget = std::max<std::size_t>(1, statements / m_Arms);
    for (std::size_t i = 0; i < m_Arms; ++i) {
      std::string here = "st" + std::to_string(i);
      std::string next = i + 1 < m_Arms ? "ck" + std::to_string(i + 1) : "done";
      if (i > 0) m_Text.open("ck" + std::to_string(i));
      m_Text.branch("state == " + std::to_string(i), here, next);
      writeArm(i, armBudget);
    }
    m_Text.open("done");
    for (int i = 0; i < kOutputs; ++i) m_Text.line(output() + " = " + state() + " + " + temp() + ";");
    return m_Text.statements();
  }

private:
  void writeArm(std::size_t i, std::size_t budget) {
    std::size_t start = m_Text.statements();
    std::string arm = "st" + std::to_string(i);
    std::string sub = "sub" + std::to_string(i % kSubStateVariables);
    m_Text.open(arm);
    m_Text.line("ticks = ticks + 1;");
    for (int k = 0; k < kDuringActions; ++k) writeAction();
    std::size_t used = m_Text.statements() - start;
    std::size_t perSubState = budget > used + 4 ? (budget - used - 4) / kSubStates : 1;
    for (int s = 0; s < kSubStates; ++s) writeSubState(arm, sub, s, perSubState);
    m_Text.open(arm + "j");
    m_Text.branch(input() + " > 50", arm + "x", "done");
    m_Text.open(arm + "x");
    std::size_t target = (i * 7 + 1) % m_Arms;
    m_Text.line("state = " + std::to_string(target) + ";");
    m_Text.line("sub" + std::to_string(target % kSubStateVariables) + " = 0;");
    m_Text.line("ticks = 0;");
    m_Text.jump("done");
  }

  // Sub-state s of an arm: its test in the chain, its actions, and a transition to the next one.
  void writeSubState(const std::string& arm, const std::string& sub, int s, std::size_t budget) {
    std::string here = arm + "s" + std::to_string(s);
    std::string next = s + 1 < kSubStates ? arm + "c" + std::to_string(s + 1) : arm + "j";
    if (s > 0) m_Text.open(arm + "c" + std::to_string(s));
    m_Text.branch(sub + " == " + std::to_string(s), here, next);
    m_Text.open(here);
    for (std::size_t k = 3; k < budget; ++k) writeAction();
    m_Text.branch(temp() + " > 5", here + "x", arm + "j");
    m_Text.open(here + "x");
    m_Text.line(sub + " = " + std::to_string((s + 1) % kSubStates) + ";");
    m_Text.jump(arm + "j");
  }

  void writeAction() {
    switch (m_Random.below(4)) {
      case 0:
        m_Text.line(temp() + " = " + input() + " - " + input() + ";");
        break;
      case 1:
        m_Text.line(state() + " = " + state() + " + " + temp() + " / 4;");
        break;
      case 2:
        m_Text.line(output() + " = " + temp() + " + " + state() + ";");
        break;
      default:
        m_Text.line(temp() + " = " + temp() + " * 2;");
        break;
    }
  }

  BodyText m_Text;
  std::size_t m_Arms;
};

}  // namespace

std::size_t chartArms(std::size_t statements) {
  return std::max(kMinimumArms, statements / kStatementsPerArm);
}

namespace detail {

std::string makeStateMachineProgram(std::size_t statements) {
  Random random(statements * 2 + 5);
  std::size_t arms = chartArms(statements);
  std::ostringstream out;
  out << "// A generated state machine of " << statements << " statements: " << arms << " states of "
      << kSubStates << " sub-states each.\n";
  declareVariables(out);
  out << "\nproc #main {\n";
  ChartWriter(out, random, arms).write(statements);
  out << "}\n";
  return out.str();
}

}  // namespace detail

}  // namespace ssaopt::bench
