// Writes random programs that keep every rule the front end enforces: formals are variables of their
// own that only their procedure reads, and no argument reads a formal of its callee; a call of a
// procedure declared later is plain, while a call of the caller itself or of an earlier procedure
// (recursion, direct or mutual) runs only while a shared depth counter is below a small bound, so
// every chain of calls ends; a loop's counter is written by its loop alone and bounded by a
// constant, so every loop ends; a lone literal assigned or passed to a variable is one it holds;
// external calls modify only volatile variables and arrays.
#include "ssaopt/client/generator.h"

#include <algorithm>
#include <sstream>
#include <vector>

namespace ssaopt::client {

namespace {

// splitmix64 (Steele, Lea and Flood): the same sequence on every platform and standard library.
class Random {
public:
  explicit Random(std::uint64_t seed) : m_State(seed) {}

  std::uint64_t next() {
    std::uint64_t z = (m_State += 0x9e3779b97f4a7c15ull);
    z = (z ^ (z >> 30)) * 0xbf58476d1ce4e5b9ull;
    z = (z ^ (z >> 27)) * 0x94d049bb133111ebull;
    return z ^ (z >> 31);
  }

  std::size_t below(std::size_t count) { return static_cast<std::size_t>(next() % count); }
  bool chance(unsigned percent) { return below(100) < percent; }

  template <class T>
  const T& pick(const std::vector<T>& items) {
    return items[below(items.size())];
  }

private:
  std::uint64_t m_State;
};

struct DataType {
  const char* name;
  bool isInteger;
  bool isSigned;
  const char* lsb;  // of a scaling that still holds the small literals the generator assigns
};

const std::vector<DataType> kTypes = {
    {"bool", false, false, nullptr},  {"int8", true, true, "0.5"},       {"uint8", true, false, "0.25"},
    {"int16", true, true, "0.01"},    {"uint16", true, false, "0.1"},    {"int32", true, true, "0.001"},
    {"uint32", true, false, "0.001"}, {"float32", false, true, nullptr}, {"float64", false, true, nullptr}};
const DataType& kBool = kTypes[0];
const DataType& kCounterType = kTypes[3];

// Every saturation holds 0 to 3, the literals assigned alone.
const std::vector<std::string> kSignedSaturations = {" saturate(-20..20)", " saturate(..20)",
                                                     " saturate(-20..)"};
const std::vector<std::string> kUnsignedSaturations = {" saturate(0..20)", " saturate(..20)"};

// Inside and outside 0/1, so that conditions on Boolean variables are sometimes decided by their
// type alone.
const std::vector<std::string> kCompared = {"0", "1", "2", "-1", "5"};
const std::vector<std::string> kOperandLiterals = {"0", "1", "2", "3", "-1", "7", "100", "0.5"};
const std::vector<std::string> kBinaryOperators = {"+",  "-",  "*",  "/", "%",  "&", "|",  "^",  "<<",
                                                   ">>", "==", "!=", "<", "<=", ">", ">=", "&&", "||"};
const std::vector<std::string> kUnaryOperators = {"-", "!", "~", "abs", "sgn"};

// Bounds that keep the text, and the statements a run executes, small: nesting of if/else and loops,
// loops inside loops, iterations of a loop, procedures besides #main, formals of a procedure.
constexpr int kMaxDepth = 3;
constexpr int kMaxLoopDepth = 2;
constexpr std::size_t kMaxIterations = 3;
constexpr std::size_t kMaxProcedures = 4;
constexpr std::size_t kMaxFormals = 2;
// Recursive calls nested at most this deep.
constexpr std::size_t kMaxRecursion = 2;

enum class Role { Plain, Input, Array, Counter, Formal };

constexpr std::size_t kNoProcedure = ~std::size_t(0);

struct Variable {
  std::string name;
  const DataType* pType;
  Role role;
  std::size_t length;  // of an array
};

struct Procedure {
  std::string name;
  std::vector<std::size_t> formals;  // indexes into the variables
};

class Generator {
public:
  Generator(std::uint64_t seed, std::uint64_t size)
      : m_Random(seed), m_Size(static_cast<std::size_t>(std::max<std::uint64_t>(size, 1))) {}

  std::string generate() {
    declareGlobals();
    declareProcedures();
    m_RecursionDepth = declare(Variable{"depth", &kCounterType, Role::Counter, 0}, " = 0");
    std::ostringstream procedures;
    for (m_Current = 0; m_Current < m_Procedures.size(); ++m_Current) writeProcedure(procedures);
    return m_Declarations.str() + procedures.str();
  }

private:
  // ---- Declarations ------------------------------------------------------------------------------

  void declareGlobals() {
    // The first input and the first plain variable are Boolean, so conditions always find one.
    declareInput(kBool);
    for (std::size_t i = 0; i < 1 + m_Size / 5; ++i) declareInput(m_Random.pick(kTypes));
    declarePlain(kBool);
    for (std::size_t i = 0; i < 3 + m_Size / 3; ++i) declarePlain(m_Random.pick(kTypes));
    for (std::size_t i = 0; i < 1 + m_Size / 10; ++i) declareArray(m_Random.pick(kTypes));
  }

  void declareInput(const DataType& type) {
    std::string attributes = type.isInteger && m_Random.chance(30) ? scaling(type) : "";
    declare(Variable{"in" + std::to_string(m_Variables.size()), &type, Role::Input, 0},
            attributes + " volatile");
  }

  void declarePlain(const DataType& type) {
    std::string attributes;
    if (type.isInteger && m_Random.chance(30)) attributes += scaling(type);
    if (&type != &kBool && m_Random.chance(30)) attributes += saturation(type);
    if (m_Random.chance(25))
      attributes += " output";
    else if (m_Random.chance(30))
      attributes += " erasable";
    Variable variable{"v" + std::to_string(m_Variables.size()), &type, Role::Plain, 0};
    declare(variable, attributes + " = " + fittingLiteral(variable));
  }

  void declareArray(const DataType& type) {
    Variable array{"a" + std::to_string(m_Variables.size()), &type, Role::Array, 2 + m_Random.below(4)};
    declare(array, " = 0");
  }

  std::string scaling(const DataType& type) {
    std::string offset = type.isSigned && m_Random.chance(50) ? ", -2" : "";
    return std::string(" scale(") + type.lsb + offset + ")";
  }

  std::string saturation(const DataType& type) {
    return m_Random.pick(type.isSigned ? kSignedSaturations : kUnsignedSaturations);
  }

  std::size_t declare(const Variable& variable, const std::string& rest) {
    m_Declarations << "var " << variable.pType->name << " " << variable.name;
    if (variable.role == Role::Array) m_Declarations << "[" << variable.length << "]";
    m_Declarations << rest << ";\n";
    m_Variables.push_back(variable);
    return m_Variables.size() - 1;
  }

  // #main first; each procedure calls only those after it.
  void declareProcedures() {
    m_Procedures.push_back(Procedure{"#main", {}});
    std::size_t count = std::min(kMaxProcedures, 1 + m_Size / 4);
    for (std::size_t i = 1; i <= count; ++i) {
      Procedure procedure{"f" + std::to_string(i), {}};
      std::size_t formals = m_Random.below(kMaxFormals + 1);
      for (std::size_t j = 0; j < formals; ++j) {
        Variable formal{"p" + std::to_string(i) + "_" + std::to_string(j), &m_Random.pick(kTypes),
                        Role::Formal, 0};
        procedure.formals.push_back(declare(formal, m_Random.chance(30) ? " erasable = 0" : " = 0"));
      }
      m_Procedures.push_back(procedure);
    }
  }

  // ---- Procedures and statements -----------------------------------------------------------------

  void writeProcedure(std::ostream& out) {
    const Procedure& procedure = m_Procedures[m_Current];
    out << "\nproc " << procedure.name;
    if (!procedure.formals.empty()) {
      out << "(";
      for (std::size_t i = 0; i < procedure.formals.size(); ++i)
        out << (i ? ", " : "") << m_Variables[procedure.formals[i]].name;
      out << ")";
    }
    out << " {\n";
    writeStatements(1 + m_Random.below(m_Size), 0, out);
    out << "}\n";
  }

  void writeStatements(std::size_t count, int depth, std::ostream& out) {
    for (std::size_t i = 0; i < count; ++i) writeStatement(depth, out);
  }

  void writeStatement(int depth, std::ostream& out) {
    std::size_t choice = m_Random.below(100);
    bool nests = depth < kMaxDepth;
    if (choice < 35) return writeAssignment(out);
    if (choice < 45) return writeElementWrite(out);
    if (choice < 55 && m_Current + 1 < m_Procedures.size()) return writeCall(laterProcedure(), out);
    if (choice < 57 && m_Current > 0) return writeRecursiveCall(out);
    if (choice < 65) return writeExternCall(out);
    if (choice < 85 && nests) return writeIfElse(depth, out);
    if (choice < 93 && nests && m_LoopDepth < kMaxLoopDepth) return writeLoop(depth, out);
    if (nests) return writeDecidedIfElse(depth, out);
    writeAssignment(out);
  }

  void writeAssignment(std::ostream& out) {
    const Variable& target = m_Variables[pickVariable(Role::Plain, nullptr)];
    std::string value = m_Random.chance(25) ? fittingLiteral(target) : expression();
    out << "  " << target.name << " = " << value << ";\n";
  }

  void writeElementWrite(std::ostream& out) {
    out << "  " << elementOf(pickVariable(Role::Array, nullptr)) << " = " << expression() << ";\n";
  }

  std::size_t laterProcedure() { return m_Current + 1 + m_Random.below(m_Procedures.size() - m_Current - 1); }

  // The arguments never read the callee's formals, which the callee's own calls may be changing.
  void writeCall(std::size_t callee, std::ostream& out) {
    out << "  call " << m_Procedures[callee].name << "(";
    const std::vector<std::size_t>& formals = m_Procedures[callee].formals;
    m_Callee = callee;
    for (std::size_t i = 0; i < formals.size(); ++i)
      out << (i ? ", " : "")
          << (m_Random.chance(25) ? fittingLiteral(m_Variables[formals[i]]) : expression());
    m_Callee = kNoProcedure;
    out << ");\n";
  }

  // A call of the current procedure or of an earlier one except #main, guarded by the depth counter.
  void writeRecursiveCall(std::ostream& out) {
    std::string label = std::to_string(m_Labels++);
    const std::string& depth = m_Variables[m_RecursionDepth].name;
    out << "  if " << depth << " < " << kMaxRecursion << " goto recurse" << label << " else skip" << label
        << ";\n";
    out << "recurse" << label << ":\n";
    out << "  " << depth << " = " << depth << " + 1;\n";
    writeCall(1 + m_Random.below(m_Current), out);
    out << "  " << depth << " = " << depth << " - 1;\n";
    out << "skip" << label << ":\n";
  }

  // An external function reads some variables and may change inputs and arrays only.
  void writeExternCall(std::ostream& out) {
    out << "  extern ext" << m_Random.below(3);
    std::vector<std::string> used =
        distinctNames(m_Random.below(3), [this] { return readableScalar(nullptr); });
    if (!used.empty()) out << " uses(" << joined(used) << ")";
    std::vector<std::string> modified = distinctNames(1 + m_Random.below(2), [this] {
      return m_Variables[pickVariable(m_Random.chance(50) ? Role::Input : Role::Array, nullptr)].name;
    });
    out << " modifies(" << joined(modified) << ");\n";
  }

  void writeIfElse(int depth, std::ostream& out) { writeBranches(condition(), depth, out); }

  // A Boolean variable set to a constant just before the branch that tests it: constant propagation
  // decides the branch.
  void writeDecidedIfElse(int depth, std::ostream& out) {
    const Variable& flag = m_Variables[pickVariable(Role::Plain, &kBool)];
    out << "  " << flag.name << " = " << m_Random.below(2) << ";\n";
    writeBranches(booleanTest(flag.name), depth, out);
  }

  // Both branches sometimes begin with the same assignment, which reads no input, for hoisting.
  void writeBranches(const std::string& test, int depth, std::ostream& out) {
    std::string label = std::to_string(m_Labels++);
    std::string twin;
    if (m_Random.chance(40)) {
      m_ReadsInputs = false;
      twin = "  " + m_Variables[pickVariable(Role::Plain, nullptr)].name + " = " + expression() + ";\n";
      m_ReadsInputs = true;
    }
    out << "  if " << test << " goto yes" << label << " else no" << label << ";\n";
    out << "yes" << label << ":\n" << twin;
    writeStatements(m_Random.below(3), depth + 1, out);
    out << "  goto join" << label << ";\n";
    out << "no" << label << ":\n" << twin;
    writeStatements(m_Random.below(3), depth + 1, out);
    out << outlineMark() << "join" << label << ":\n";
  }

  // Sometimes the code from a join on becomes a procedure of its own.
  std::string outlineMark() { return m_Random.chance(10) ? "outline " : ""; }

  void writeLoop(int depth, std::ostream& out) {
    std::string label = std::to_string(m_Labels++);
    std::string counter =
        m_Variables[declare(Variable{"c" + label, &kCounterType, Role::Counter, 0}, " = 0")].name;
    ++m_LoopDepth;
    out << "  " << counter << " = 0;\n";
    out << "loop" << label << ":\n";
    out << "  if " << counter << " < " << 1 + m_Random.below(kMaxIterations) << " goto body" << label
        << " else exit" << label << ";\n";
    out << "body" << label << ":\n";
    writeStatements(1 + m_Random.below(3), depth + 1, out);
    out << "  " << counter << " = " << counter << " + 1;\n";
    out << "  goto loop" << label << ";\n";
    out << "exit" << label << ":\n";
    --m_LoopDepth;
  }

  // ---- Conditions and expressions ----------------------------------------------------------------

  std::string condition() {
    std::size_t form = m_Random.below(4);
    if (form == 0) return readableScalar(nullptr) + " " + m_Random.pick(kBinaryOperators) + " " + operand();
    if (form == 1) return booleanTest(readableScalar(&kBool)) + " && " + booleanTest(readableScalar(&kBool));
    return booleanTest(readableScalar(&kBool));
  }

  // The forms the valid-condition step recognises: x, !x, x == c, x != c.
  std::string booleanTest(const std::string& name) {
    switch (m_Random.below(4)) {
      case 0:
        return name;
      case 1:
        return "!" + name;
      case 2:
        return name + " == " + m_Random.pick(kCompared);
      default:
        return name + " != " + m_Random.pick(kCompared);
    }
  }

  // Never a lone literal, which would have to fit the variable it is assigned to.
  std::string expression() {
    switch (m_Random.below(4)) {
      case 0:
        return readableScalar(nullptr);
      case 1:
        return unary(readableScalar(nullptr));
      case 2:
        return readableScalar(nullptr) + " " + m_Random.pick(kBinaryOperators) + " " + operand();
      default:
        return "(" + operand() + " " + m_Random.pick(kBinaryOperators) + " " + readableScalar(nullptr) +
               ") " + m_Random.pick(kBinaryOperators) + " " + operand();
    }
  }

  std::string unary(const std::string& operand) {
    const std::string& op = m_Random.pick(kUnaryOperators);
    return op.size() > 1 ? op + "(" + operand + ")" : op + operand;
  }

  std::string operand() {
    std::size_t form = m_Random.below(3);
    if (form == 0) return m_Random.pick(kOperandLiterals);
    if (form == 1) return elementOf(pickVariable(Role::Array, nullptr));
    return readableScalar(nullptr);
  }

  // The index is sometimes a variable, which may lie outside the array.
  std::string elementOf(std::size_t array) {
    const Variable& variable = m_Variables[array];
    std::string index =
        m_Random.chance(25) ? readableScalar(nullptr) : std::to_string(m_Random.below(variable.length));
    return variable.name + "[" + index + "]";
  }

  // A scalar the current procedure may read, of `pType` unless null: a global or one of its own
  // formals; no input where inputs are not wanted.
  std::string readableScalar(const DataType* pType) {
    std::vector<std::size_t> candidates;
    for (std::size_t i = 0; i < m_Variables.size(); ++i)
      if (isReadableScalar(i) && (!pType || m_Variables[i].pType == pType)) candidates.push_back(i);
    return m_Variables[m_Random.pick(candidates)].name;
  }

  bool isReadableScalar(std::size_t index) const {
    const Variable& variable = m_Variables[index];
    if (variable.role == Role::Array || (variable.role == Role::Input && !m_ReadsInputs)) return false;
    if (variable.role != Role::Formal) return true;
    return isFormalOf(m_Current, index) && (m_Callee == kNoProcedure || !isFormalOf(m_Callee, index));
  }

  bool isFormalOf(std::size_t procedure, std::size_t variable) const {
    const std::vector<std::size_t>& formals = m_Procedures[procedure].formals;
    return std::find(formals.begin(), formals.end(), variable) != formals.end();
  }

  std::size_t pickVariable(Role role, const DataType* pType) {
    std::vector<std::size_t> candidates;
    for (std::size_t i = 0; i < m_Variables.size(); ++i)
      if (m_Variables[i].role == role && (!pType || m_Variables[i].pType == pType)) candidates.push_back(i);
    return m_Random.pick(candidates);
  }

  // A literal every variable of the generator holds: within its type, saturation and scaling.
  std::string fittingLiteral(const Variable& variable) {
    return std::to_string(m_Random.below(variable.pType == &kBool ? 2 : 4));
  }

  template <class Draw>
  std::vector<std::string> distinctNames(std::size_t count, Draw draw) {
    std::vector<std::string> names;
    for (std::size_t i = 0; i < count; ++i) {
      std::string name = draw();
      if (std::find(names.begin(), names.end(), name) == names.end()) names.push_back(name);
    }
    return names;
  }

  static std::string joined(const std::vector<std::string>& names) {
    std::string text;
    for (const std::string& name : names) text += (text.empty() ? "" : ", ") + name;
    return text;
  }

  Random m_Random;
  std::size_t m_Size;
  std::ostringstream m_Declarations;
  std::vector<Variable> m_Variables;
  std::vector<Procedure> m_Procedures;
  std::size_t m_Current = 0;            // the procedure being written
  std::size_t m_Callee = kNoProcedure;  // the procedure whose arguments are being written
  std::size_t m_RecursionDepth = 0;     // the variable that counts nested recursive calls
  std::size_t m_Labels = 0;
  int m_LoopDepth = 0;
  bool m_ReadsInputs = true;
};

}  // namespace

std::string generateProgram(std::uint64_t seed, std::uint64_t size) {
  return Generator(seed, size).generate();
}

}  // namespace ssaopt::client
