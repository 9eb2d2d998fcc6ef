// What the interpreter runs: the program's graph lowered once into blocks of operations over numbered
// variable slots, with each block's successors looked up in advance, so that a run never searches
// the graph, a set or a name.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <unordered_map>
#include <variant>
#include <vector>

#include "ssaopt/client/interpreter.h"
#include "ssaopt/client/operators.h"

namespace ssaopt::client::detail {

inline constexpr std::uint32_t kNoNode = UINT32_MAX;

// A variable of the program: `length` numbers of the memory from `base`, one for a scalar.
struct Slot {
  const KvCCfgSFVariable* pVariable;
  std::size_t base;
  std::uint32_t length;
  bool isArray;
  bool isVolatile;
};

// An expression in postfix order, its variables resolved to slots.
struct Term {
  TermOp op;
  double number;       // of a Literal
  std::uint32_t slot;  // of a Variable, ElementRead or ElementWrite
};
using Code = std::vector<Term>;

// The SSA version a definition of a scalar that is neither volatile nor an array defines, for the
// observer of a run; null for any other definition.
using Observed = KvCCfgVariable*;

// x = e. A whole array takes the value in every element.
struct StoreOp {
  std::uint32_t slot;
  Code value;
  Observed pVersion;
};

// a[i] = e, whose code ends in the element write.
struct ElementStoreOp {
  Code code;
};

struct Argument {
  std::uint32_t formal;
  Code value;
};

struct CallOp {
  const KvCCfgProcedureCall* pCall;
  std::uint32_t entry;
  // Passed at the call, while the parameter statements do not stand in blocks.
  std::vector<Argument> arguments;
};

// A parameter statement: per call, the argument, or nothing where the call passes the variable to
// itself. The call whose callee runs picks the argument.
struct ParamOp {
  std::uint32_t formal;
  std::unordered_map<const KvCCfgProcedureCall*, std::optional<Code>> arguments;
  std::string name;  // of the formal, for the fault of a call without argument
  Observed pVersion;
};

// A definition that computes nothing (a phi function, a value return, a virtual assignment): its
// version is what the variable holds where it stands. Only the observer sees it, and it does not
// count as a statement executed.
struct DefineOp {
  std::uint32_t slot;
  Observed pVersion;
};

struct ExternOp {
  std::string name;
  std::vector<std::uint32_t> used;       // in declaration order
  std::vector<std::uint32_t> refreshed;  // the non-volatile arrays it may modify
};

// A statement the interpreter cannot run; the run ends with this fault when it gets there.
struct FaultOp {
  std::string message;
};

using Op = std::variant<StoreOp, ElementStoreOp, CallOp, ParamOp, ExternOp, FaultOp, DefineOp>;

// How control leaves a node once its operations ran.
enum class Flow {
  Jump,      // to `next`
  Branch,    // to `next` when the condition holds, else to `onFalse`
  MainLoop,  // to `next` while steps remain, else to `onFalse`
  Return,    // an exit: back to the caller, or the end of the run
  Fault,     // `fault` says why control cannot go on
};

struct NodeCode {
  ssaopt::node origin;  // the node of the graph
  std::string name;     // "bb7", "entry of f", for faults
  std::vector<Op> ops;
  Flow flow = Flow::Fault;
  std::uint32_t next = kNoNode;
  std::uint32_t onFalse = kNoNode;
  Code condition;
  std::string fault = "no such node";
};

struct ProgramCode {
  std::vector<Slot> slots;  // in declaration order
  std::vector<double> initialMemory;
  std::vector<std::uint32_t> outputs;  // slots of the output variables
  std::vector<NodeCode> nodes;         // by node index
  std::uint32_t start = kNoNode;
  // Calls pass their arguments themselves until the SSA transformation places parameter statements.
  bool argumentsAtCalls = true;
};

ProgramCode lowerProgram(const Program& program);

}  // namespace ssaopt::client::detail
