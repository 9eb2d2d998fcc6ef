// Building blocks for the control-flow graph tests: a graph that lives in a memory pool, shorthands
// for blocks and edges, and the check of the graph invariants.
#pragma once

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "ir/doubles.h"
#include "ssaopt/cfg/control_flow_graph.h"
#include "ssaopt/frame/graph_algorithms.h"
#include "ssaopt/frame/pool.h"
#include "ssaopt/frame/report.h"
#include "ssaopt/ir/procedure.h"

// The private members that later transformations use, opened to the tests.
class KvCControlFlowGraphTestAccess {
public:
  static void buildFunctionCallGraph(KvCControlFlowGraph& G, ssaopt::graph& fcg,
                                     ssaopt::map<ssaopt::node, KvCCfgProcedure*>& procedureOf) {
    G.buildFunctionCallGraph(fcg, procedureOf);
  }
  static bool isVisited(const KvCControlFlowGraph& G, ssaopt::node v) { return G.isVisited(v); }
};

namespace cfgtest {

using ssaopt::edge;
using ssaopt::node;
using Nodes = std::vector<node>;

// The graph deletes no payload, statement or expression: everything a test makes comes from a pool
// that returns it all when the test ends.
class CfgTest : public ::testing::Test {
protected:
  KvCCfgProcedure* procedure(const char* name) {
    KvCCfgProcedure* pProcedure = nullptr;
    G.demandProcedureEntryNode(name, pProcedure);
    return pProcedure;
  }
  // A block of `pProcedure` with `statements` test statements and, when `branching`, a condition.
  node block(KvCCfgProcedure* pProcedure, int statements = 0, bool branching = false) {
    KvCBasicBlock* pBlock = new KvCBasicBlock();
    pBlock->setProcedure(pProcedure);
    for (int i = 0; i < statements; ++i) pBlock->append(new irtest::TestStatement());
    if (branching) pBlock->appendBranch(new irtest::TestExpression());
    return G.new_node(pBlock);
  }
  // The entry of `pProcedure` leads to `first`.
  node startWith(KvCCfgProcedure* pProcedure, node first) {
    plain(pProcedure->getEntryNode(), first);
    return first;
  }
  edge plain(node v, node w) { return G.new_edge(v, w, new KvCCfgEdgeInfo()); }
  edge onTrue(node v, node w) { return G.new_edge(v, w, new KvCCfgTrueBranch()); }
  edge onFalse(node v, node w) { return G.new_edge(v, w, new KvCCfgFalseBranch()); }

  KvCBasicBlock& blockOf(node v) { return *G.getBasicBlock(v); }
  KvCCfgStatement* statement(node v, int i) { return irtest::items(blockOf(v).getStatementSeq()).at(i); }
  KvCCfgExpression* condition(node v) { return blockOf(v).getBranchCond(); }
  KvCCfgProcedure* procedureOf(node v) { return G.inf(v)->getProcedure(); }
  node firstBlock(KvCCfgProcedure* pProcedure) {
    return G.target(G.first_adj_edge(pProcedure->getEntryNode()));
  }

  Nodes successors(node v) {
    Nodes result;
    for (edge e : G.out(v)) result.push_back(G.target(e));
    return result;
  }
  Nodes predecessors(node v) {
    Nodes result;
    for (edge e : G.in(v)) result.push_back(G.source(e));
    return result;
  }
  // The names of the procedures that the block of `v` calls, in statement order.
  std::vector<std::string> callsIn(node v) {
    std::vector<std::string> names;
    for (KvCCfgStatement* pStatement : blockOf(v).getStatementSeq())
      if (KvCCfgProcedureCall* pCall = pStatement->isProcedureCall())
        names.push_back(pCall->getName().cstring());
    return names;
  }
  std::string procedureNamedAfter(node v) { return "#block_" + std::to_string(blockOf(v).getIndex()); }

  ssaopt::PoolMemController m_Pool;
  ssaopt::PoolMemController::Scope m_Scope{&m_Pool};
  KvCControlFlowGraph G;
};

// Internal checks on throughout; a test that expects reports says so, any other must leave them quiet.
class QuietCfgTest : public CfgTest {
protected:
  void TearDown() override { EXPECT_TRUE(m_ReportsExpected || m_Log.empty()) << "unexpected reports"; }
  // What a refusal must leave as it was.
  std::vector<int> shape() {
    return {G.number_of_nodes(), G.number_of_edges(), static_cast<int>(G.getProcedures().size())};
  }

  irtest::InternalInfoOn m_Info;
  ssaopt::ReportLog m_Log;
  bool m_ReportsExpected = false;
  KvCCfgProcedure* pMain = procedure("#main");
};

// The invariants of a finished graph (every procedure entered at its first block), as the library's
// verifier checks them for the state the graph is in.
inline void expectInvariants(const KvCControlFlowGraph& G) {
  ssaopt::ReportLog log;
  bool holds = G.verify();
  std::string reports;
  for (const ssaopt::ReportLog::Consistency& failure : log.consistencyFailures())
    reports += failure.condition + "\n";
  EXPECT_TRUE(holds) << reports;
}

}  // namespace cfgtest
