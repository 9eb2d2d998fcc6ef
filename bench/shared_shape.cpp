// Programs like the random generator's: many variables, each read and written by many procedures.
//
// Procedures come in modules of up to kModuleProcedures. Procedure j of a module calls j + 1 inside
// a branch and its children 2j + 1 and 2j + 2 in straight-line code, so every procedure but the
// module's first is called from two places and stays a procedure, and procedure j reaches every
// procedure after it. Each reads and writes a window of its module's variables and a few of a pool
// that all modules share; #main calls every module's first procedure in both branches of a mode
// test. A procedure's summary then holds most of what the rest of its module touches, and SSA form
// gives it parameter statements, value-return statements after each of its calls and phi functions
// at its joins for all of it: about ten statements after SSA for every statement written.
#include <algorithm>
#include <sstream>
#include <string>

#include "program_shapes.h"
#include "program_writing.h"

namespace ssaopt::bench::detail {

namespace {

constexpr std::size_t kModuleProcedures = 16;
constexpr std::size_t kProcedureStatements = 24;
constexpr int kModuleVariables = 64;
constexpr int kWindow = 16;  // the module variables that one procedure reads and writes
constexpr int kStride = 3;   // how far the window of procedure j + 1 lies after that of j
constexpr int kPool = 32;    // variables that all modules share

// Four kinds of variables take turns: scaled, saturated, Boolean and small unsigned integers.
const char* const kModuleVariableKinds[] = {"int16 %s scale(0.01) erasable = 0",
                                            "int32 %s saturate(-1000..1000) = 0", "bool %s erasable = 0",
                                            "uint8 %s = 0"};

std::string moduleVariable(std::size_t module, int i) {
  return "m" + std::to_string(module) + "v" + std::to_string(i);
}

std::string procedureName(std::size_t module, std::size_t j) {
  return "m" + std::to_string(module) + "p" + std::to_string(j);
}

void declareModuleVariables(std::ostringstream& out, std::size_t module) {
  for (int i = 0; i < kModuleVariables; ++i) {
    std::string declaration = kModuleVariableKinds[i % 4];
    declaration.replace(declaration.find("%s"), 2, moduleVariable(module, i));
    out << "var " << declaration << ";\n";
  }
  out << "var uint8 m" << module << "k = 0;\n";
}

// One procedure of a module: arithmetic over its window and the shared pool, a diamond, sometimes a
// loop (counted by its module's counter, which nothing else writes), and its calls.
class SharedBodyWriter {
public:
  SharedBodyWriter(std::ostringstream& out, Random& random, std::size_t module, std::size_t j)
      : m_Text(out), m_Random(random), m_Module(module), m_J(j) {}

  std::size_t write(std::size_t budget, std::size_t procedures) {
    std::size_t next = m_J + 1, first = 2 * m_J + 1, second = 2 * m_J + 2;
    while (m_Text.statements() < budget / 3) writeSegment();
    if (first < procedures) m_Text.line("call " + procedureName(m_Module, first) + "();");
    writeDiamond(next < procedures ? "call " + procedureName(m_Module, next) + "();" : "");
    if (second < procedures) m_Text.line("call " + procedureName(m_Module, second) + "();");
    while (m_Text.statements() < budget) writeSegment();
    return m_Text.statements();
  }

private:
  void writeSegment() {
    switch (m_Random.below(8)) {
      case 0:
        m_Text.line(local() + " = in" + std::to_string(m_Random.below(kInputs)) + " - " + local() + ";");
        break;
      case 1:
        m_Text.line(pool() + " = " + pool() + " + " + local() + ";");
        break;
      case 2:
        m_Text.line(local() + " = " + pool() + " * 2;");
        break;
      case 3:
        writeDiamond("");
        break;
      case 4:
        writeLoop();
        break;
      default:
        m_Text.line(local() + " = " + local() + " + " + local() + ";");
        break;
    }
  }

  // `inBranch`, when given, is the first statement of the true branch.
  void writeDiamond(const std::string& inBranch) {
    std::string yes = m_Text.label(), no = m_Text.label(), join = m_Text.label();
    m_Text.branch(local() + " > 3", yes, no);
    m_Text.open(yes);
    if (!inBranch.empty()) m_Text.line(inBranch);
    m_Text.line(local() + " = " + local() + " + 1;");
    m_Text.jump(join);
    m_Text.open(no);
    m_Text.line(local() + " = " + pool() + ";");
    m_Text.open(join);
  }

  void writeLoop() {
    std::string counter = "m" + std::to_string(m_Module) + "k";
    std::string head = m_Text.label(), body = m_Text.label(), done = m_Text.label();
    m_Text.line(counter + " = 0;");
    m_Text.open(head);
    m_Text.branch(counter + " < 3", body, done);
    m_Text.open(body);
    m_Text.line(local() + " = " + local() + " + " + pool() + ";");
    m_Text.line(counter + " = " + counter + " + 1;");
    m_Text.jump(head);
    m_Text.open(done);
  }

  std::string local() {
    int i = (static_cast<int>(m_J) * kStride + m_Random.below(kWindow)) % kModuleVariables;
    return moduleVariable(m_Module, i);
  }
  std::string pool() { return "g" + std::to_string(m_Random.below(kPool)); }

  BodyText m_Text;
  Random& m_Random;
  std::size_t m_Module;
  std::size_t m_J;
};

// Both branches of a mode test call every module.
std::size_t writeMain(std::ostringstream& out, Random& random, std::size_t modules) {
  out << "\nproc #main {\n";
  BodyText text(out);
  text.line("extern read_inputs modifies(in0, in1, in2, in3, in4, in5, in6, in7, mode);");
  text.branch("mode == 0", "normal", "degraded");
  for (const char* branch : {"normal", "degraded"}) {
    text.open(branch);
    text.line("g0 = in" + std::to_string(random.below(kInputs)) + ";");
    for (std::size_t module = 0; module < modules; ++module)
      text.line("call " + procedureName(module, 0) + "();");
    text.jump("report");
  }
  text.open("report");
  for (int i = 0; i < kOutputs; ++i)
    text.line("out" + std::to_string(i) + " = g" + std::to_string(i + 1) + ";");
  out << "}\n";
  return text.statements();
}

}  // namespace

std::string makeSharedVariablesProgram(std::size_t statements) {
  Random random(statements * 2 + 7);
  std::size_t procedures = std::max<std::size_t>(1, statements / kProcedureStatements);
  std::size_t perModule = std::min(procedures, kModuleProcedures);
  std::size_t modules = std::max<std::size_t>(1, procedures / perModule);
  std::ostringstream out;
  out << "// A generated program of " << statements << " statements in " << modules << " modules of "
      << perModule << " procedures that share variables.\n";
  declareNumbered(out, kInputs, "int16", "in", " scale(0.01) volatile");
  out << "var uint8 mode volatile;\n";
  declareNumbered(out, kPool, "int16", "g", " scale(0.01) saturate(-100..100) = 0");
  declareNumbered(out, kOutputs, "int16", "out", " scale(0.1) output = 0");
  for (std::size_t module = 0; module < modules; ++module) declareModuleVariables(out, module);

  std::size_t written = writeMain(out, random, modules);
  std::size_t count = modules * perModule;
  for (std::size_t k = 0; k < count; ++k) {
    std::size_t module = k / perModule, j = k % perModule;
    std::size_t remaining = statements > written ? statements - written : 0;
    std::size_t budget = std::max<std::size_t>(1, remaining / (count - k));
    out << "\nproc " << procedureName(module, j) << " {\n";
    written += SharedBodyWriter(out, random, module, j).write(budget, perModule);
    out << "}\n";
  }
  return out.str();
}

}  // namespace ssaopt::bench::detail
