// The interpreter's machine: runs the lowered code of a program with an explicit call stack, counts
// what it executes against the guards, and records the trace.
#include <algorithm>

#include "interpreter_code.h"
#include "ssaopt/values/arithmetic.h"

namespace ssaopt::client {

double storedValue(const KvCCfgVariable& variable, double value) {
  KvCCfgValue stored(value);
  if (variable.ConsiderSaturation(stored)) return stored.getValue();
  if (variable.isScaled())
    stored.changeToRepresentedValue(variable.getScaling());
  else
    cast(variable.getDataType(), stored, true);
  return stored.getValue();
}

namespace detail {

namespace {

// The value arithmetic gives no number for a remainder without a 32-bit result (x % 0, and
// -2147483648 % -1); C leaves them undefined. 0 is the true remainder of the latter, and constant
// propagation takes neither as a constant, so any number would do.
constexpr double kRemainderWithoutResult = 0.0;

// What an element read outside its array gives.
constexpr double kElementOutsideArray = 0.0;

class Machine {
public:
  Machine(const ProgramCode& code, const RunLimits& limits, InputStreams& inputs, RunObserver* pObserver)
      : m_Code(code),
        m_Limits(limits),
        m_Inputs(inputs),
        m_pObserver(pObserver),
        m_Memory(code.initialMemory) {}

  Trace run() {
    if (m_Code.start == kNoNode) fault("the program has no start node");
    m_Node = m_Code.start;
    while (!m_Ended) {
      const NodeCode& node = m_Code.nodes[m_Node];
      // What only the observer sees is no statement: it leaves the count and the guard alone.
      if (m_NextOp < node.ops.size() && std::holds_alternative<DefineOp>(node.ops[m_NextOp])) {
        execute(std::get<DefineOp>(node.ops[m_NextOp++]));
        continue;
      }
      if (++m_Trace.statements - m_StatementsBeforeStep > m_Limits.maxStatementsPerStep) {
        end(Ending::StatementLimit,
            "more than " + std::to_string(m_Limits.maxStatementsPerStep) + " statements in one step");
        break;
      }
      if (m_NextOp < node.ops.size())
        std::visit([this](const auto& op) { execute(op); }, node.ops[m_NextOp++]);
      else
        leave(node);
    }
    return std::move(m_Trace);
  }

private:
  struct Frame {
    std::uint32_t node;
    std::size_t nextOp;
    const KvCCfgProcedureCall* pCall;
  };

  std::uint64_t currentStep() const { return m_StepsDone + 1; }

  void end(Ending ending, std::string detail) {
    m_Trace.ending = ending;
    m_Trace.step = ending == Ending::Completed ? m_StepsDone : currentStep();
    m_Trace.detail = std::move(detail);
    m_Ended = true;
  }

  void fault(std::string message) { end(Ending::Fault, std::move(message)); }

  // ---- Control flow ------------------------------------------------------------------------------

  void enter(std::uint32_t node) {
    m_Node = node;
    m_NextOp = 0;
  }

  void leave(const NodeCode& node) {
    switch (node.flow) {
      case Flow::Jump:
        enter(node.next);
        return;
      case Flow::Branch: {
        double condition = 0.0;
        if (!evaluate(node.condition, condition)) return;
        if (m_pObserver) m_pObserver->branched(node.origin, condition != 0.0, currentStep());
        follow(node, condition != 0.0);
        return;
      }
      case Flow::MainLoop:
        ++m_StepsDone;
        m_StatementsBeforeStep = m_Trace.statements;
        follow(node, m_StepsDone < m_Limits.steps);
        return;
      case Flow::Return:
        returnFromCall();
        return;
      case Flow::Fault:
        fault(node.fault);
        return;
    }
  }

  void follow(const NodeCode& node, bool onTrue) {
    std::uint32_t target = onTrue ? node.next : node.onFalse;
    if (target == kNoNode)
      fault(node.name + " goes " + (onTrue ? "true" : "false") + " but has no such edge");
    else
      enter(target);
  }

  void returnFromCall() {
    if (m_Frames.empty()) {
      finish();
      return;
    }
    const Frame& frame = m_Frames.back();
    m_Node = frame.node;
    m_NextOp = frame.nextOp;
    m_pCall = frame.pCall;
    m_Frames.pop_back();
  }

  void finish() {
    for (std::uint32_t slot : m_Code.outputs) {
      Observation observation = observe(slot);
      m_Trace.events.push_back(Event{Event::Kind::Output, m_StepsDone, observation.variable, {observation}});
    }
    end(Ending::Completed, "");
  }

  // ---- Operations --------------------------------------------------------------------------------

  void execute(const StoreOp& op) {
    double value = 0.0;
    if (!evaluate(op.value, value)) return;
    store(op.slot, value);
    tellDefined(op.pVersion, op.slot);
  }

  void execute(const DefineOp& op) { tellDefined(op.pVersion, op.slot); }

  void tellDefined(Observed pVersion, std::uint32_t slot) {
    if (m_pObserver && pVersion)
      m_pObserver->defined(*pVersion, m_Memory[m_Code.slots[slot].base], currentStep());
  }

  void execute(const ElementStoreOp& op) {
    double ignored = 0.0;
    evaluate(op.code, ignored);
  }

  void execute(const CallOp& op) {
    if (m_Frames.size() >= m_Limits.maxCallDepth) {
      end(Ending::CallDepthLimit,
          "calls nested more than " + std::to_string(m_Limits.maxCallDepth) + " deep");
      return;
    }
    if (m_Code.argumentsAtCalls && !passArguments(op)) return;
    m_Frames.push_back(Frame{m_Node, m_NextOp, m_pCall});
    m_pCall = op.pCall;
    enter(op.entry);
  }

  // All arguments are evaluated before any formal changes, as the call's semantics promise.
  bool passArguments(const CallOp& op) {
    m_Arguments.clear();
    for (const Argument& argument : op.arguments) {
      double value = 0.0;
      if (!evaluate(argument.value, value)) return false;
      m_Arguments.push_back(value);
    }
    for (std::size_t i = 0; i < op.arguments.size(); ++i) store(op.arguments[i].formal, m_Arguments[i]);
    return true;
  }

  void execute(const ParamOp& op) {
    auto found = m_pCall ? op.arguments.find(m_pCall) : op.arguments.end();
    if (found == op.arguments.end()) {
      fault("the parameter statement of " + op.name + " has no argument for the call that runs it");
      return;
    }
    double value = 0.0;
    if (found->second) {
      if (!evaluate(*found->second, value)) return;
      store(op.formal, value);
    }
    tellDefined(op.pVersion, op.formal);
  }

  void execute(const ExternOp& op) {
    Event event{Event::Kind::ExternCall, currentStep(), op.name, {}};
    for (std::uint32_t slot : op.used) event.observations.push_back(observe(slot));
    m_Trace.events.push_back(std::move(event));
    for (std::uint32_t slot : op.refreshed) refresh(slot);
  }

  void execute(const FaultOp& op) { fault(op.message); }

  Observation observe(std::uint32_t slot) const {
    const Slot& observed = m_Code.slots[slot];
    auto first = m_Memory.begin() + observed.base;
    return Observation{observed.pVariable->getName(), std::vector<double>(first, first + observed.length),
                       observed.isArray};
  }

  void refresh(std::uint32_t slot) {
    const Slot& array = m_Code.slots[slot];
    for (std::uint32_t i = 0; i < array.length && !m_Ended; ++i) {
      double value = 0.0;
      if (input(array, value)) m_Memory[array.base + i] = value;
    }
  }

  // ---- Values ------------------------------------------------------------------------------------

  // A whole array takes the value in every element.
  void store(std::uint32_t slot, double value) {
    const Slot& target = m_Code.slots[slot];
    std::fill_n(m_Memory.begin() + target.base, target.length, storedValue(*target.pVariable, value));
  }

  bool input(const Slot& slot, double& value) {
    std::optional<double> next = m_Inputs.next(*slot.pVariable);
    if (!next) {
      end(Ending::InputExhausted, "no more input for '" + slot.pVariable->getName() + "'");
      return false;
    }
    value = *next;
    return true;
  }

  bool read(std::uint32_t slot, double& value) {
    const Slot& variable = m_Code.slots[slot];
    if (variable.isVolatile) return input(variable, value);
    value = m_Memory[variable.base];
    return true;
  }

  // The memory index of element `index` of the array in `slot`; none outside the array.
  std::optional<std::size_t> element(std::uint32_t slot, double index) const {
    const Slot& array = m_Code.slots[slot];
    std::int32_t i = ssaopt::integerView(index);
    if (i < 0 || static_cast<std::uint32_t>(i) >= array.length) return std::nullopt;
    return array.base + static_cast<std::uint32_t>(i);
  }

  bool readElement(std::uint32_t slot, double index, double& value) {
    if (m_Code.slots[slot].isVolatile) return input(m_Code.slots[slot], value);
    std::optional<std::size_t> at = element(slot, index);
    value = at ? m_Memory[*at] : kElementOutsideArray;
    return true;
  }

  void writeElement(std::uint32_t slot, double index, double value) {
    std::optional<std::size_t> at = element(slot, index);
    if (at) m_Memory[*at] = storedValue(*m_Code.slots[slot].pVariable, value);
  }

  // Computes `code` on the value stack; false when the run ended meanwhile (an input ran out).
  bool evaluate(const Code& code, double& result) {
    m_Stack.clear();
    for (const Term& term : code)
      if (!apply(term)) return false;
    result = m_Stack.back();
    return true;
  }

  bool apply(const Term& term) {
    double value = 0.0;
    switch (term.op) {
      case TermOp::Literal:
        m_Stack.push_back(term.number);
        return true;
      case TermOp::Variable:
        if (!read(term.slot, value)) return false;
        m_Stack.push_back(value);
        return true;
      case TermOp::ElementRead:
        if (!readElement(term.slot, pop(), value)) return false;
        m_Stack.push_back(value);
        return true;
      case TermOp::ElementWrite: {
        double written = pop();
        writeElement(term.slot, pop(), written);
        m_Stack.push_back(written);
        return true;
      }
      default:
        m_Stack.push_back(arityOf(term.op) == 1 ? compute(applyUnary(term.op, KvCCfgValue(pop())))
                                                : computeBinary(term.op));
        return true;
    }
  }

  double computeBinary(TermOp op) {
    double right = pop();
    double left = pop();
    return compute(applyBinary(op, KvCCfgValue(left), KvCCfgValue(right)));
  }

  static double compute(const KvCCfgValue& result) {
    return result.isConstant() ? result.getValue() : kRemainderWithoutResult;
  }

  double pop() {
    double top = m_Stack.back();
    m_Stack.pop_back();
    return top;
  }

  const ProgramCode& m_Code;
  const RunLimits& m_Limits;
  InputStreams& m_Inputs;
  RunObserver* m_pObserver;
  std::vector<double> m_Memory;
  std::vector<double> m_Stack;
  std::vector<double> m_Arguments;
  std::vector<Frame> m_Frames;
  std::uint32_t m_Node = kNoNode;
  std::size_t m_NextOp = 0;
  const KvCCfgProcedureCall* m_pCall = nullptr;  // whose callee runs; null in "#main"
  std::uint64_t m_StepsDone = 0;
  std::uint64_t m_StatementsBeforeStep = 0;
  Trace m_Trace;
  bool m_Ended = false;
};

}  // namespace

}  // namespace detail

Interpreter::Interpreter(const Program& program)
    : m_pCode(std::make_unique<const detail::ProgramCode>(detail::lowerProgram(program))) {}

Interpreter::~Interpreter() = default;

Trace Interpreter::run(const RunLimits& limits, InputStreams& inputs, RunObserver* pObserver) const {
  return detail::Machine(*m_pCode, limits, inputs, pObserver).run();
}

}  // namespace ssaopt::client
