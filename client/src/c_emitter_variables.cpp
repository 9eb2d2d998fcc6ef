// The program's variables in C: their identifiers, the C type each is held in, and the helpers that
// store, index, observe and refill them as the interpreter does.
#include <cmath>
#include <cstdint>
#include <set>
#include <sstream>

#include "c_emitter_code.h"
#include "ssaopt/client/data_types.h"
#include "ssaopt/client/interpreter.h"
#include "ssaopt/client/numbers.h"
#include "ssaopt/values/arithmetic.h"

namespace ssaopt::client::detail {

namespace {

const std::set<std::string> kCKeywords = {
    "auto",     "break",  "case",   "char",     "const",      "continue", "default",  "do",
    "double",   "else",   "enum",   "extern",   "float",      "for",      "goto",     "if",
    "inline",   "int",    "long",   "register", "restrict",   "return",   "short",    "signed",
    "sizeof",   "static", "struct", "switch",   "typedef",    "union",    "unsigned", "void",
    "volatile", "while",  "_Bool",  "_Complex", "_Imaginary", "main"};

bool startsWith(const std::string& text, const char* prefix) { return text.rfind(prefix, 0) == 0; }

bool endsWith(const std::string& text, const std::string& suffix) {
  return text.size() >= suffix.size() &&
         text.compare(text.size() - suffix.size(), suffix.size(), suffix) == 0;
}

// <stdint.h> declares types ending in _t and macros such as INT16_MAX and UINT8_C.
bool isStdintName(const std::string& name) {
  return endsWith(name, "_t") || startsWith(name, "INT") || startsWith(name, "UINT") ||
         endsWith(name, "_MIN") || endsWith(name, "_MAX") || endsWith(name, "_C");
}

const char* cTypeOf(const KV_DataType* pType) {
  if (pType == KV_DataType::boolean()) return "_Bool";
  if (pType == KV_DataType::float32()) return "float";
  if (pType == KV_DataType::float64()) return "double";
  static const std::pair<const KV_DataType* (*)(), const char*> kIntegers[] = {
      {&KV_DataType::int8, "int8_t"},   {&KV_DataType::uint8, "uint8_t"},
      {&KV_DataType::int16, "int16_t"}, {&KV_DataType::uint16, "uint16_t"},
      {&KV_DataType::int32, "int32_t"}, {&KV_DataType::uint32, "uint32_t"}};
  for (const auto& entry : kIntegers)
    if (entry.first() == pType) return entry.second;
  return "double";
}

bool sameBits(double a, double b) { return a == b && std::signbit(a) == std::signbit(b); }

// Whether the saturation limits, which a store keeps exactly, are values of the C type.
bool typeHoldsLimits(const KvCCfgSFVariable& variable) {
  for (bool upper : {false, true}) {
    if (!(upper ? variable.isUpperBorderSaturated() : variable.isLowerBorderSaturated())) continue;
    double limit = upper ? variable.getUpperLimit() : variable.getLowerLimit();
    KvCCfgValue cast(limit);
    ::cast(variable.getDataType(), cast, true);
    if (!sameBits(cast.getValue(), limit)) return false;
  }
  return true;
}

// A number as a C constant of type double that reads back exactly.
std::string doubleLiteral(double number) {
  if (std::isnan(number)) return "SSA_NAN";
  if (std::isinf(number)) return number < 0 ? "-SSA_INF" : "SSA_INF";
  std::string text = formatNumber(number);
  if (text.find_first_of(".e") == std::string::npos) text += ".0";
  return text;
}

std::string literalOf(const CVariable& variable, double number) {
  return variable.heldAsDouble || variable.type == "float" ? doubleLiteral(number) : formatNumber(number);
}

using Around = std::pair<std::string, std::string>;

Around around(const Around& outer, const Around& inner) {
  return {outer.first + inner.first, inner.second + outer.second};
}

Around rangeMarkAround(const ValueRange& range) {
  return {range.mayBeNaN ? "SSA_RANGE_OR_NAN(" : "SSA_RANGE(",
          ", " + doubleLiteral(range.lo) + ", " + doubleLiteral(range.hi) + ")"};
}

// Whether C's conversion of every number in the range to an integer type from `least` to `greatest`
// is defined, truncating as the integer view does.
bool convertsWithin(const ValueRange& range, double least, double greatest) {
  return !range.mayBeNaN && range.lo > least - 1.0 && range.hi < greatest + 1.0;
}

// What converts a value to the type: the cast helpers of integer types take its integer view.
Around castAround(const KV_DataType* pType, const std::optional<ValueRange>& range) {
  if (pType == KV_DataType::float64() || cTypeOf(pType) == std::string("double")) return {"", ""};
  std::string helper = std::string("ssa_to_") + nameOfDataType(pType) + "(";
  if (!isIntegerType(pType)) return {helper, ")"};
  return around({helper, ")"}, integerViewAround(range));
}

// The text before and after a value that stores it in the variable.
Around storeCall(const CVariable& variable) {
  if (variable.hasStoreHelper) return {"ssa_store_" + variable.name + "(", ")"};
  return castAround(variable.pVariable->getDataType(), std::nullopt);
}

std::string storeCall(const CVariable& variable, const std::string& value) {
  Around store = storeCall(variable);
  return store.first + value + store.second;
}

// The program's name where C allows it; a name C or the emitter reserves gets a prefix, and a name
// taken already a number.
std::string uniqueName(const std::string& wanted, std::set<std::string>& taken) {
  std::string base = isFreeCIdentifier(wanted) ? wanted : "v_" + wanted;
  std::string name = base;
  for (int suffix = 1; !isFreeCIdentifier(name) || !taken.insert(name).second; ++suffix)
    name = base + "_" + std::to_string(suffix);
  return name;
}

}  // namespace

bool isFreeCIdentifier(const std::string& name) {
  if (name.empty() || std::isdigit(static_cast<unsigned char>(name[0]))) return false;
  for (char c : name)
    if (!std::isalnum(static_cast<unsigned char>(c)) && c != '_') return false;
  bool reservedByC =
      startsWith(name, "__") || (name[0] == '_' && std::isupper(static_cast<unsigned char>(name[1])));
  bool emitterName = startsWith(name, "ssa_") || startsWith(name, "SSA_") || startsWith(name, "proc_") ||
                     startsWith(name, "sys_");
  return !reservedByC && !emitterName && !kCKeywords.count(name) && !isStdintName(name);
}

CVariables::CVariables(const Program& program) {
  std::set<std::string> taken;
  for (const std::unique_ptr<KvCCfgSFVariable>& pVariable : program.variables()) {
    CVariable variable;
    variable.pVariable = pVariable.get();
    variable.name = uniqueName(pVariable->getName(), taken);
    variable.heldAsDouble = pVariable->isScaled() || pVariable->getDataType() == KV_DataType::float64() ||
                            !typeHoldsLimits(*pVariable);
    variable.type = variable.heldAsDouble ? "double" : cTypeOf(pVariable->getDataType());
    variable.hasStoreHelper =
        pVariable->isScaled() || pVariable->isUpperBorderSaturated() || pVariable->isLowerBorderSaturated();
    variable.stored = pVariable->isOutput();
    m_Index.emplace(pVariable.get(), m_Variables.size());
    m_Variables.push_back(variable);
  }
}

CVariable& CVariables::of(KvCCfgVariable* pVariable) {
  CVariable* pFound = find(pVariable);
  if (!pFound) throw Unemittable{"reads or writes a variable of no program"};
  return *pFound;
}

CVariable* CVariables::find(KvCCfgVariable* pVariable) {
  auto found = m_Index.find(originalOf(pVariable));
  return found == m_Index.end() ? nullptr : &m_Variables[found->second];
}

std::string CVariables::inputText(CVariable& variable) {
  variable.readsInput = true;
  return inputHook(variable) + "()";
}

std::string CVariables::readText(CVariable& variable) {
  variable.stored = true;
  return variable.heldAsDouble ? variable.name : "(double)" + variable.name;
}

std::string CVariables::storedConstant(CVariable& variable, double number) {
  variable.stored = true;
  return literalOf(variable, storedValue(*variable.pVariable, number));
}

std::string rangeMark(const std::string& value, const ValueRange& range) {
  Around mark = rangeMarkAround(range);
  return mark.first + value + mark.second;
}

Around integerViewAround(const std::optional<ValueRange>& range) {
  if (range && convertsWithin(*range, INT32_MIN, INT32_MAX))
    return around({"(int32_t)", ""}, rangeMarkAround(*range));
  return {"ssa_int(", ")"};
}

std::string CVariables::storeText(CVariable& variable, const std::string& value,
                                  const std::optional<ValueRange>& range) {
  Around store = storeAround(variable, range);
  return store.first + value + store.second;
}

namespace {

// Whether the type holds every number of the range once truncated, so that no wrapping is needed.
bool convertsExactly(const KV_DataType* pType, const ValueRange& range) {
  std::optional<double> least = typeMinimum(pType), greatest = typeMaximum(pType);
  return isIntegerType(pType) && least && greatest && convertsWithin(range, *least, *greatest);
}

bool withinLimits(const KvCCfgSFVariable& variable, const ValueRange& range) {
  return (!variable.isUpperBorderSaturated() || range.hi <= variable.getUpperLimit()) &&
         (!variable.isLowerBorderSaturated() || range.lo >= variable.getLowerLimit());
}

}  // namespace

Around CVariables::storeAround(CVariable& variable, const std::optional<ValueRange>& range) {
  variable.stored = true;
  const KvCCfgSFVariable& declared = *variable.pVariable;
  bool saturated = declared.isUpperBorderSaturated() || declared.isLowerBorderSaturated();
  if (!range || (saturated && !withinLimits(declared, *range))) return storeCall(variable);
  // The saturation, if any, is needless: a NaN passes a saturation unchanged, so whether the value may
  // be NaN does not matter. What is left converts the value; the value is marked with its range where
  // the code relies on it.
  Around leftOut = saturated ? rangeMarkAround(*range) : Around{"", ""};
  if (declared.isScaled()) {
    const KV_Scaling& scaling = *declared.getScaling();
    if (scaling.getLSB() == 0.0) return leftOut;
    return around({"ssa_represent(",
                   ", " + doubleLiteral(scaling.getLSB()) + ", " + doubleLiteral(scaling.getOffset()) + ")"},
                  leftOut);
  }
  if (!variable.heldAsDouble && convertsExactly(declared.getDataType(), *range))
    return around({"(" + variable.type + ")", ""}, rangeMarkAround(*range));
  Around cast = castAround(declared.getDataType(), range);
  bool castMarks = cast.first.find("SSA_RANGE") != std::string::npos;
  return castMarks ? cast : around(cast, leftOut);
}

bool CVariables::withinArray(const CVariable& variable, const ValueRange& range) {
  return !range.mayBeNaN && range.lo > -1.0 &&
         range.hi < static_cast<double>(variable.pVariable->getArrayLength());
}

Around CVariables::elementAround(CVariable& variable, const ValueRange& index) {
  variable.stored = true;
  return around({variable.name + "[(int32_t)", "]"}, rangeMarkAround(index));
}

bool CVariables::storesInitialValue(const CVariable& variable, double number) {
  const KvCCfgSFVariable& declared = *variable.pVariable;
  return sameBits(storedValue(declared, number), storedValue(declared, declared.getInitValue()->getValue()));
}

namespace {

std::string commentOf(const CVariable& variable) {
  const KvCCfgSFVariable& declared = *variable.pVariable;
  std::string notes;
  if (variable.heldAsDouble && declared.getDataType() != KV_DataType::float64())
    notes += std::string(nameOfDataType(declared.getDataType())) +
             (declared.isScaled() ? " scaled: the value it stands for" : " with limits its type cannot hold");
  if (declared.isOutput()) notes += std::string(notes.empty() ? "" : ", ") + "output";
  if (declared.isVolatile()) notes += std::string(notes.empty() ? "" : ", ") + "input";
  return notes.empty() ? "" : " /* " + notes + " */";
}

std::string declarationOf(const CVariable& variable) {
  const KvCCfgSFVariable& declared = *variable.pVariable;
  std::string initial = literalOf(variable, storedValue(declared, declared.getInitValue()->getValue()));
  std::string text = "static " + variable.type + " " + variable.name;
  if (declared.isArray()) {
    text += "[" + std::to_string(declared.getArrayLength()) + "] = {";
    bool allZero = initial == "0" || initial == "0.0";
    for (std::uint32_t i = 0; i < (allZero ? 1 : declared.getArrayLength()); ++i)
      text += (i ? ", " : "") + initial;
    text += "}";
  } else {
    text += " = " + initial;
  }
  return text + ";" + commentOf(variable) + "\n";
}

std::string unsaturatedStore(const CVariable& variable) {
  const KvCCfgSFVariable& declared = *variable.pVariable;
  if (declared.isScaled()) {
    const KV_Scaling& scaling = *declared.getScaling();
    if (scaling.getLSB() == 0.0) return "x";
    return "ssa_represent(x, " + doubleLiteral(scaling.getLSB()) + ", " + doubleLiteral(scaling.getOffset()) +
           ")";
  }
  Around cast = castAround(declared.getDataType(), std::nullopt);
  return cast.first + "x" + cast.second;
}

CHelper storeHelper(const CVariable& variable) {
  const KvCCfgSFVariable& declared = *variable.pVariable;
  std::ostringstream out;
  out << "static inline " << variable.type << " ssa_store_" << variable.name << "(double x) {\n";
  bool saturated = declared.isUpperBorderSaturated() || declared.isLowerBorderSaturated();
  if (saturated) out << "  int saturated = 0;\n";
  if (declared.isUpperBorderSaturated())
    out << "  if (x > " << doubleLiteral(declared.getUpperLimit())
        << ") {\n    x = " << doubleLiteral(declared.getUpperLimit()) << ";\n    saturated = 1;\n  }\n";
  if (declared.isLowerBorderSaturated())
    out << "  if (x < " << doubleLiteral(declared.getLowerLimit())
        << ") {\n    x = " << doubleLiteral(declared.getLowerLimit()) << ";\n    saturated = 1;\n  }\n";
  if (saturated) out << "  if (saturated) return x;\n";
  out << "  return " << unsaturatedStore(variable) << ";\n}\n";
  return CHelper{"ssa_store_" + variable.name, out.str()};
}

// The streams give values the variable holds already; only the C type needs converting.
std::string refilledValue(const CVariable& variable, const std::string& hook) {
  if (variable.heldAsDouble) return hook + "()";
  Around cast = castAround(variable.pVariable->getDataType(), std::nullopt);
  return cast.first + hook + "()" + cast.second;
}

void addArrayHelpers(const CVariable& variable, const std::string& hook, std::vector<CHelper>& helpers) {
  const KvCCfgSFVariable& declared = *variable.pVariable;
  const std::string& name = variable.name;
  std::string length = std::to_string(declared.getArrayLength());
  std::string store = storeCall(variable, "ssa_new");
  std::string element = variable.heldAsDouble ? name + "[ssa_i]" : "(double)" + name + "[ssa_i]";
  std::string loop = "  int ssa_i;\n  for (ssa_i = 0; ssa_i < " + length + "; ++ssa_i) ";
  helpers.push_back({"ssa_read_" + name, "static inline double ssa_read_" + name +
                                             "(int32_t ssa_i) {\n  return ssa_i >= 0 && ssa_i < " + length +
                                             " ? " + element + " : 0.0;\n}\n"});
  helpers.push_back(
      {"ssa_write_" + name, "static inline void ssa_write_" + name +
                                "(int32_t ssa_i, double ssa_new) {\n  if (ssa_i >= 0 && ssa_i < " + length +
                                ") " + name + "[ssa_i] = " + store + ";\n}\n"});
  helpers.push_back({"ssa_fill_" + name, "static inline void ssa_fill_" + name + "(double ssa_new) {\n" +
                                             loop + name + "[ssa_i] = " + store + ";\n}\n"});
  helpers.push_back({"ssa_observe_" + name, "static inline void ssa_observe_" + name +
                                                "(void) {\n  int ssa_i;\n  ssa_array_begin(\"" +
                                                declared.getName() + "\");\n  for (ssa_i = 0; ssa_i < " +
                                                length + "; ++ssa_i) ssa_element(" + element +
                                                ");\n  ssa_array_end();\n}\n"});
  helpers.push_back({"ssa_refill_" + name, "static inline void ssa_refill_" + name + "(void) {\n" + loop +
                                               name + "[ssa_i] = " + refilledValue(variable, hook) +
                                               ";\n}\n"});
}

}  // namespace

std::string CVariables::declarations() const {
  std::string hooks, globals;
  for (const CVariable& variable : m_Variables) {
    if (hasInputHook(variable)) hooks += "double " + inputHook(variable) + "(void);\n";
    if (variable.stored) globals += declarationOf(variable);
  }
  std::string text;
  for (const std::string& section : {hooks, globals})
    if (!section.empty()) text += section + "\n";
  return text;
}

std::vector<CHelper> CVariables::helpers() const {
  std::vector<CHelper> helpers;
  for (const CVariable& variable : m_Variables) {
    if (!variable.stored) continue;
    if (variable.hasStoreHelper) helpers.push_back(storeHelper(variable));
    if (variable.pVariable->isArray()) addArrayHelpers(variable, inputHook(variable), helpers);
  }
  return helpers;
}

}  // namespace ssaopt::client::detail
