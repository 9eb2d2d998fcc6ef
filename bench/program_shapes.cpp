#include "program_shapes.h"

#include <sstream>
#include <vector>

#include "program_writing.h"

namespace ssaopt::bench {

namespace {

constexpr int kCounters = 4;
constexpr int kFlags = 4;
constexpr int kSettings = 4;
constexpr std::size_t kLargeStages = 4;
constexpr std::size_t kSmallProcedureStatements = 24;

void declareVariables(std::ostringstream& out) {
  declareNumbered(out, kInputs, "int16", "in", " scale(0.01) volatile");
  out << "var uint8 mode volatile;\n";
  declareNumbered(out, kTemporaries, "int16", "t", " scale(0.01) erasable = 0");
  declareNumbered(out, kStates, "int32", "s", " scale(0.001) saturate(-50..50) = 0");
  declareNumbered(out, kOutputs, "int16", "out", " scale(0.1) saturate(0..100) output = 0");
  declareNumbered(out, kCounters, "uint8", "k", " erasable = 0");
  declareNumbered(out, kFlags, "bool", "b", " erasable = 0");
  declareNumbered(out, kSettings, "int16", "c", " erasable = 0");
  out << "var float32 kp = 0.8;\nvar float32 ki = 0.05;\n";
  out << "var int16 u scale(0.01) erasable = 0;\n";
}

// Writes the body of one procedure: straight-line arithmetic on scaled and saturated variables, with
// if/else diamonds, branches on constants, bounded loops and the calls it is given, in the middle.
class BodyWriter : ControllerNames {
public:
  BodyWriter(std::ostringstream& out, Random& random) : ControllerNames(random), m_Text(out) {}

  // Returns the statements written.
  std::size_t write(std::size_t budget, bool readsParameter, const std::vector<std::string>& calls) {
    if (readsParameter) line(temp() + " = u * 2;");
    while (m_Text.statements() < budget / 2) writeSegment();
    for (const std::string& call : calls) line(call);
    while (m_Text.statements() < budget) writeSegment();
    line(output() + " = " + state() + " + " + temp() + ";");
    return m_Text.statements();
  }

private:
  void writeSegment() {
    switch (m_Random.below(10)) {
      case 0:
      case 1:
      case 2:
        line(temp() + " = " + input() + " - " + input() + ";");
        break;
      case 3:
        line(state() + " = " + state() + " + ki * " + temp() + ";");
        break;
      case 4:
        line(output() + " = kp * " + temp() + " + " + state() + ";");
        break;
      case 5:
        writeSetting();
        break;
      case 6:
      case 7:
        writeDiamond();
        break;
      case 8:
        writeConstantBranch();
        break;
      default:
        writeLoop();
        break;
    }
  }

  // A setting assigned a literal and then read: constant propagation replaces the read.
  void writeSetting() {
    std::string setting = "c" + std::to_string(m_Random.below(kSettings));
    line(setting + " = " + std::to_string(1 + m_Random.below(9)) + ";");
    std::string target = temp();
    line(target + " = " + temp() + " * " + setting + ";");
  }

  // Both branches begin with the same assignment, which hoisting moves before the condition.
  void writeDiamond() {
    std::string yes = label(), no = label(), join = label();
    std::string tested = temp(), target = temp(), shared = target + " = " + tested + " * 2;";
    std::string out = output();
    line("if " + tested + " > 5 goto " + yes + " else " + no + ";");
    open(yes);
    line(shared);
    line(out + " = " + state() + ";");
    m_Text.jump(join);
    open(no);
    line(shared);
    line(out + " = 0;");
    open(join);
  }

  // A flag set just before it is tested: one branch is never taken and goes away.
  void writeConstantBranch() {
    std::string flag = "b" + std::to_string(m_Random.below(kFlags));
    std::string yes = label(), no = label(), join = label(), target = temp();
    line(flag + " = 1;");
    line("if " + flag + " goto " + yes + " else " + no + ";");
    open(yes);
    line(target + " = " + input() + ";");
    m_Text.jump(join);
    open(no);
    line(target + " = 0;");
    open(join);
  }

  void writeLoop() {
    std::string counter = "k" + std::to_string(m_Random.below(kCounters));
    std::string head = label(), body = label(), done = label(), accumulated = state();
    line(counter + " = 0;");
    open(head);
    line("if " + counter + " < 4 goto " + body + " else " + done + ";");
    open(body);
    line(accumulated + " = " + accumulated + " + " + temp() + " / 4;");
    line(counter + " = " + counter + " + 1;");
    m_Text.jump(head);
    open(done);
  }

  void line(const std::string& statement) { m_Text.line(statement); }
  void open(const std::string& name) { m_Text.open(name); }
  std::string label() { return m_Text.label(); }

  BodyText m_Text;
};

// A procedure reads its parameter u when it has one; arguments read temporaries only.
std::string callOf(const std::string& name, bool hasParameter, Random& random) {
  std::string arguments = hasParameter ? "t" + std::to_string(random.below(kTemporaries)) + " + 1" : "";
  return "call " + name + "(" + arguments + ");";
}

struct Procedure {
  std::string name;
  bool hasParameter = false;
  std::vector<std::string> calls;
};

std::size_t writeProcedure(std::ostringstream& out, Random& random, const Procedure& procedure,
                           std::size_t budget) {
  out << "\nproc " << procedure.name << (procedure.hasParameter ? "(u)" : "") << " {\n";
  std::size_t written = 0;
  if (procedure.name == "#main") {
    out << "  extern read_inputs modifies(in0, in1, in2, in3, in4, in5, in6, in7, mode);\n";
    ++written;
  }
  written += BodyWriter(out, random).write(budget, procedure.hasParameter, procedure.calls);
  out << "}\n";
  return written;
}

// #main calls stages 1 and 2 twice each (they stay procedures) and stages 0 and 3 once (inlined).
std::vector<Procedure> largeProcedures(Random& random) {
  std::vector<Procedure> procedures(kLargeStages + 1);
  procedures[0].name = "#main";
  for (std::size_t i = 1; i <= kLargeStages; ++i) {
    procedures[i].name = "stage" + std::to_string(i - 1);
    procedures[i].hasParameter = i % 2 == 0;
  }
  for (std::size_t i : {1, 2, 3, 2, 4, 3})
    procedures[0].calls.push_back(callOf(procedures[i].name, procedures[i].hasParameter, random));
  return procedures;
}

// Procedure j (#main is 0) is called by procedure (j - 1) / 2 and, for every third j, also by the
// procedure before that one, so calls go from lower to higher numbers and nothing recurses.
std::vector<Procedure> smallProcedures(std::size_t count, Random& random) {
  std::vector<Procedure> procedures(count + 1);
  procedures[0].name = "#main";
  for (std::size_t j = 1; j <= count; ++j) {
    procedures[j].name = "p" + std::to_string(j);
    procedures[j].hasParameter = j % 4 == 1;
    std::string call = callOf(procedures[j].name, procedures[j].hasParameter, random);
    std::size_t caller = (j - 1) / 2;
    procedures[caller].calls.push_back(call);
    if (j % 3 == 0 && caller >= 1) procedures[caller - 1].calls.push_back(call);
  }
  return procedures;
}

std::string makeProceduresProgram(std::size_t statements, Shape shape) {
  Random random(statements * 2 + (shape == Shape::FewLargeProcedures ? 0 : 1));
  std::vector<Procedure> procedures =
      shape == Shape::FewLargeProcedures
          ? largeProcedures(random)
          : smallProcedures(statements / kSmallProcedureStatements + 1, random);
  std::ostringstream out;
  out << "// A generated controller of " << statements << " statements in " << shapeName(shape)
      << " procedures.\n";
  declareVariables(out);
  std::size_t written = 0;
  for (std::size_t i = 0; i < procedures.size(); ++i) {
    std::size_t remaining = statements > written ? statements - written : 0;
    std::size_t budget = remaining / (procedures.size() - i);
    written += writeProcedure(out, random, procedures[i], budget);
  }
  return out.str();
}

}  // namespace

const char* shapeName(Shape shape) {
  switch (shape) {
    case Shape::FewLargeProcedures:
      return "large";
    case Shape::ManySmallProcedures:
      return "small";
    case Shape::SharedVariables:
      return "shared";
    case Shape::StateMachine:
      return "chart";
  }
  return "";
}

std::optional<Shape> shapeNamed(const std::string& name) {
  for (Shape shape : kShapes)
    if (name == shapeName(shape)) return shape;
  return std::nullopt;
}

std::vector<std::size_t> benchmarkSizes(Shape shape) {
  if (shape == Shape::SharedVariables) return {100, 1000, 10000, 100000};
  return {1000, 10000, 100000, 1000000};
}

std::string makeControllerProgram(std::size_t statements, Shape shape) {
  switch (shape) {
    case Shape::SharedVariables:
      return detail::makeSharedVariablesProgram(statements);
    case Shape::StateMachine:
      return detail::makeStateMachineProgram(statements);
    default:
      return makeProceduresProgram(statements, shape);
  }
}

}  // namespace ssaopt::bench
