// The parts of the C emitter: C names and storage of the program's variables, and the C text of
// expressions and statements. The emitter (c_emitter.cpp) arranges them into functions.
#pragma once

#include <cstdint>
#include <optional>
#include <set>
#include <string>
#include <unordered_map>
#include <utility>
#include <vector>

#include "infix_text.h"
#include "ssaopt/client/program.h"

namespace ssaopt::client::detail {

// What every emitted unit starts with: the include, the floating-point contract, the macros and the
// declarations of the hooks that the embedding program supplies.
const char* cPreludeText();

// A function that emitted code may call, by its name.
struct CHelper {
  std::string name;
  std::string text;
};

// The helpers of the value arithmetic, each after those it calls.
const std::vector<CHelper>& cRuntimeHelpers();

// The names in C code, outside comments and string literals, that may name a function or macro of the
// unit: a helper (ssa_..., SSA_...) or a procedure (proc_..., sys_...), which the program's own names
// never are.
std::vector<std::string> functionNamesIn(const std::string& code);

// The text of the helpers that `code` calls, directly or through other helpers, in the order of
// `helpers`: a unit holds no function it does not use.
std::string calledHelpersText(const std::vector<const CHelper*>& helpers, const std::string& code);

// A C identifier of the program's own that C does not reserve and that the emitter's names
// (ssa_..., proc_..., sys_...) cannot take.
bool isFreeCIdentifier(const std::string& name);

// The least and greatest number that an expression can have, as propagation found them, and whether
// it may be NaN instead (which no range holds, and which no C conversion to an integer takes).
struct ValueRange {
  double lo;
  double hi;
  bool mayBeNaN;
};

// Where a value's range makes a check needless, the code leaves the check out and marks the value
// with the range it relies on: SSA_RANGE(value, lo, hi), or SSA_RANGE_OR_NAN. The mark is the value
// itself, or, compiled with -DSSA_CHECK_RANGES, a fault where the value lies outside the range.
std::string rangeMark(const std::string& value, const ValueRange& range);

// The text before and after a number that gives its 32-bit integer view, on which the integer
// operators, element accesses and integer casts work: ssa_int(x), or a direct conversion where the
// range shows it to be defined.
std::pair<std::string, std::string> integerViewAround(const std::optional<ValueRange>& range);

// What a term knows of an operand that stands for an integer: the integer literal it is, or its range.
struct IntegerOperand {
  std::optional<double> literal;  // where the operand is a whole literal within 32 bits
  std::optional<ValueRange> range;
};

// How a variable is held in C.
struct CVariable {
  const KvCCfgSFVariable* pVariable = nullptr;
  std::string name;  // the C identifier
  std::string type;  // the C type of the variable or of each element
  bool heldAsDouble = false;
  bool hasStoreHelper = false;  // saturated or scaled: stores go through ssa_store_NAME
  bool stored = false;          // written, read or observed: the emitted code needs the global
  bool readsInput = false;      // volatile and read: the emitted code calls its input hook
  bool refilled = false;        // an array that an external call gives new values from its stream
};

class CVariables {
public:
  explicit CVariables(const Program& program);

  // The variable that `pVariable` or the SSA version `pVariable` stands for.
  CVariable& of(KvCCfgVariable* pVariable);
  // The same, or null for a variable of no program.
  CVariable* find(KvCCfgVariable* pVariable);
  std::vector<CVariable>& all() { return m_Variables; }

  // The C text that reads the variable as a double, that reads the next value of its input stream,
  // and that converts `value` as assigning to it stores it; where the value's range (if known) makes
  // the saturation or the cast needless, without them.
  std::string readText(CVariable& variable);
  std::string inputText(CVariable& variable);
  std::string storeText(CVariable& variable, const std::string& value,
                        const std::optional<ValueRange>& range = std::nullopt);
  // The same as the text before and after the value.
  std::pair<std::string, std::string> storeAround(CVariable& variable,
                                                  const std::optional<ValueRange>& range);
  // The C text before and after an index that names the element directly, for an index whose range
  // lies within the array: without the helper that checks the index.
  std::pair<std::string, std::string> elementAround(CVariable& variable, const ValueRange& index);
  // Whether the range shows that every index it allows lies within the array.
  static bool withinArray(const CVariable& variable, const ValueRange& range);
  // The C constant of what assigning `number` to the variable stores.
  std::string storedConstant(CVariable& variable, double number);
  // Whether assigning `number` to the variable stores the value it starts with.
  static bool storesInitialValue(const CVariable& variable, double number);
  // Whether the C code calls the variable's input hook.
  static bool hasInputHook(const CVariable& variable) { return variable.readsInput || variable.refilled; }

  // The declarations of the input hooks and of the globals of the used variables.
  std::string declarations() const;
  // The helpers of the used variables: stores, element access, observation, refill.
  std::vector<CHelper> helpers() const;
  std::string inputHook(const CVariable& variable) const { return "ssa_input_" + variable.name; }

private:
  std::vector<CVariable> m_Variables;
  std::unordered_map<const KvCCfgVariable*, std::size_t> m_Index;
};

// A piece of C that the interpreter cannot run; the emitted code calls ssa_fault there.
struct Unemittable {
  std::string message;
};

// Statements as C lines, each computed value sequenced as the interpreter sequences it.
class CStatements {
public:
  // With `useRanges`, checks that the propagated ranges make needless are left out.
  CStatements(CVariables& variables, bool useRanges) : m_Variables(variables), m_UseRanges(useRanges) {}

  // A parameter statement that stands in a block: in SSA form, calls pass only these arguments.
  void placeParameter(const KvCCfgParamStatement* pParam) { m_PlacedParameters.insert(pParam); }

  // The C lines of one statement (none for those that generate no code); throws Unemittable.
  std::vector<std::string> statement(KvCCfgStatement& statement, const KvCControlFlowGraph& graph,
                                     bool argumentsAtCalls);
  // Whether the assignment stores a constant that is the variable's initial value.
  static bool storesInitialValue(KvCCfgAssignment& assignment, const CVariable& variable);
  // "if (...) JUMP" for a branch condition; throws Unemittable.
  std::vector<std::string> branch(KvCCfgExpression* pCondition, const std::string& jump);

  static std::string procedureName(const std::string& name);

private:
  struct Code {
    std::vector<std::string> prelude;  // declarations of temporaries, in evaluation order
    std::string text;
    std::optional<ValueRange> range;  // where ranges are used and both bounds are known
  };

  static KvCCfgVariable* onlyVariableOf(KvCCfgExpression* pExpression);
  Code expression(KvCCfgExpression* pExpression, bool condition);
  Code libraryExpression(KvCCfgExpression* pExpression);
  std::optional<std::pair<std::string, std::string>> directElement(CVariable& array,
                                                                   const IntegerOperand& index);
  InfixText::Term elementReadTerm(CVariable& array, const IntegerOperand& index);
  InfixText::Term elementWriteTerm(CVariable& array, const IntegerOperand& index,
                                   const std::optional<ValueRange>& value);
  Code terms(const KvCCfgSFExpression& expression, bool condition);
  struct Terms;
  InfixText::Term termText(Terms& terms, std::size_t i, bool& readsTemporary);
  InfixText::Term variableTerm(Terms& terms, std::size_t i, bool& readsTemporary);
  std::vector<std::string> assignment(KvCCfgAssignment& assignment);
  std::vector<std::string> call(KvCCfgProcedureCall& call, const KvCControlFlowGraph& graph,
                                bool argumentsAtCalls);
  std::vector<std::string> externCall(KvCCfgExternCall& call);
  std::string temporary(const std::string& kind);

  std::optional<ValueRange> rangeOf(const KvCCfgValue& lo, const KvCCfgValue& hi, bool mayBeNaN) const;

  CVariables& m_Variables;
  bool m_UseRanges;
  std::set<const KvCCfgParamStatement*> m_PlacedParameters;
  int m_Temporaries = 0;
};

// Wraps lines that declare temporaries into a block of their own.
std::vector<std::string> scoped(std::vector<std::string> prelude, const std::vector<std::string>& lines);

}  // namespace ssaopt::client::detail
