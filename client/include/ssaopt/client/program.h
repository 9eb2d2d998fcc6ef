// A program of the reference client: the control-flow graph that the front end built, and everything
// of the client's that the graph points to (variables, expressions) or that printing needs (block
// labels, formal parameters, the order of declarations).
//
// Ownership: the graph deletes no payload, statement or expression by design. The program deletes the
// variables and expressions that the client made; what the library made (blocks, edges, SSA versions,
// interface statements, procedure records) is left to the memory pool it came from (the module's own
// between KvCSSAControl::boot() and shutdown(), or a PoolMemController), so a program is destroyed
// before that pool ends.
#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "ssaopt/cfg/control_flow_graph.h"
#include "ssaopt/client/expression.h"
#include "ssaopt/client/variable.h"

namespace ssaopt::client {

class Program {
public:
  Program();
  ~Program();
  Program(const Program&) = delete;
  Program& operator=(const Program&) = delete;

  KvCControlFlowGraph& graph() { return *m_pGraph; }
  const KvCControlFlowGraph& graph() const { return *m_pGraph; }
  ExpressionStore& expressions() { return m_Expressions; }
  const ExpressionStore& expressions() const { return m_Expressions; }

  // Variables in declaration order.
  KvCCfgSFVariable* addVariable(std::unique_ptr<KvCCfgSFVariable> pVariable);
  const std::vector<std::unique_ptr<KvCCfgSFVariable>>& variables() const { return m_Variables; }
  KvCCfgSFVariable* findVariable(std::string_view name) const;

  // The formal parameters a procedure was declared with; none for procedures the library made.
  void setFormals(const std::string& procedure, std::vector<KvCCfgSFVariable*> formals);
  const std::vector<KvCCfgSFVariable*>& formalsOf(const std::string& procedure) const;

  // The label a block was written with in the text, by block index; null for blocks without one.
  void setBlockLabel(std::uint32_t blockIndex, std::string label);
  const std::string* blockLabel(std::uint32_t blockIndex) const;
  // Block `from` leaves the place its label names, and block `to` takes that place: the label goes to
  // `to`, unless `to` has one of its own.
  void passBlockLabel(std::uint32_t from, std::uint32_t to);
  void dropBlockLabel(std::uint32_t blockIndex) { m_BlockLabels.erase(blockIndex); }
  // Runs a transformation that replaces blocks by new ones holding the same phi functions, statements
  // and conditions (divideBasicBlock), and gives each label to the new block that starts with what
  // the labelled block started with.
  void transformKeepingLabels(const std::function<void()>& transform);

  // The condition of the block that closes "#main" into a loop.
  void setMainLoopCondition(KvCCfgExpression* pCondition) { m_pMainLoopCondition = pCondition; }
  KvCCfgExpression* mainLoopCondition() const { return m_pMainLoopCondition; }

private:
  std::vector<std::unique_ptr<KvCCfgSFVariable>> m_Variables;
  std::unordered_map<std::string_view, KvCCfgSFVariable*> m_VariablesByName;
  std::unordered_map<std::string, std::vector<KvCCfgSFVariable*>> m_Formals;
  std::unordered_map<std::uint32_t, std::string> m_BlockLabels;
  ExpressionStore m_Expressions;
  KvCCfgExpression* m_pMainLoopCondition = nullptr;
  // Declared last, so destroyed first: nothing of the client may go while the graph points to it.
  std::unique_ptr<KvCControlFlowGraph> m_pGraph;
};

}  // namespace ssaopt::client
