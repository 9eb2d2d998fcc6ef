// The interpreter as the oracle of constant propagation: what propagation leaves in the versions and
// in the graph holds on every run, and a claim that a run contradicts is caught and named.
#include "client_testing.h"
#include "passes.h"
#include "ssaopt/client/interpreter.h"
#include "ssaopt/ir/statement.h"
#include "ssaopt/ir/variable.h"
#include "values/value_testing.h"

namespace {

using ssaopt::client::Program;

class PropagationOracle : public clienttest::ClientTest {
protected:
  // `text` after the default pipeline's steps up to the propagation, with dead-code removal.
  Program* propagated(const std::string& text) {
    Program* pProgram = load(text);
    if (pProgram)
      ssaopt::tool::runPipeline({"inline", "valid-conditions", "ssa", "divide", "sccp"}, *pProgram);
    return pProgram;
  }

  static std::string oracle(const Program& program) {
    ssaopt::client::CheckSettings settings;
    settings.limits.steps = 3;
    return ssaopt::client::formatPropagationReport(ssaopt::client::checkPropagation(program, settings));
  }

  // The version that the one assignment (not an initialisation) of variable `name` defines.
  static KvCCfgVariable* assignedVersion(const Program& program, const std::string& name) {
    const KvCControlFlowGraph& G = program.graph();
    for (ssaopt::node v : G.nodes()) {
      KvCBasicBlock* pBlock = G.getBasicBlock(v);
      for (KvCCfgStatement* pStatement :
           pBlock ? pBlock->getStatementSeq() : ssaopt::list<KvCCfgStatement*>()) {
        KvCCfgAssignment* pAssignment = pStatement->isAssignment();
        if (!pAssignment || dynamic_cast<KvCCfgInitAssignment*>(pAssignment)) continue;
        KvCCfgSFVariable* pNamed = ssaopt::client::originalOf(pAssignment->getLHS())->isSFVariable();
        if (pNamed && pNamed->getName() == name) return pAssignment->getLHS();
      }
    }
    ADD_FAILURE() << "no assignment of " << name;
    return nullptr;
  }
};

// count counts the steps: 1, 2, 3, so propagation leaves its loop undetermined; level and sum vary.
constexpr const char* kCounting =
    "var int16 level volatile saturate(0..100);\n"
    "var int16 count = 0;\n"
    "var int8 sum output = 0;\n"
    "proc #main {\n"
    "  count = count + 1;\n"
    "  sum = level + 100;\n"
    "  if level > 50 goto high else end;\n"
    "high:\n"
    "  call report(count);\n"
    "}\n"
    "proc report(count) {\n"
    "  extern log uses(count);\n"
    "}\n";

TEST_F(PropagationOracle, WhatPropagationLeavesHoldsOnTheExamplesAndOnWrappingRanges) {
  for (const char* name : clienttest::kExamples) {
    Program* pProgram = propagated(clienttest::readExample(name));
    ASSERT_NE(pProgram, nullptr) << name;
    EXPECT_EQ(oracle(*pProgram), "propagated values held on 20 runs\n") << name;
  }
  Program* pProgram = propagated(kCounting);
  ASSERT_NE(pProgram, nullptr);
  EXPECT_EQ(oracle(*pProgram), "propagated values held on 20 runs\n");
}

TEST_F(PropagationOracle, ANarrowedRangeIsCaughtWithTheVersionAndTheValue) {
  Program* pProgram = propagated(kCounting);
  ASSERT_NE(pProgram, nullptr);
  assignedVersion(*pProgram, "count")->setVarRange(constant(0), constant(1));
  EXPECT_EQ(oracle(*pProgram),
            "propagation claims what a run contradicts, with input seed 1 in step 2:\n"
            "  count.3 = 2, outside its propagated range [0, 1]\n");
  // sum = level + 100 in an int8 wraps above 127; a range that clamps instead claims too little.
  assignedVersion(*pProgram, "count")->setVarRange(nonConstant, nonConstant);
  assignedVersion(*pProgram, "sum")->setVarRange(constant(100), constant(127));
  EXPECT_EQ(oracle(*pProgram),
            "propagation claims what a run contradicts, with input seed 1 in step 3:\n"
            "  sum.3 = -92, outside its propagated range [100, 127]\n");
}

TEST_F(PropagationOracle, AWrongConstantIsCaught) {
  Program* pProgram = propagated(kCounting);
  ASSERT_NE(pProgram, nullptr);
  KvCCfgVariable* pCount = assignedVersion(*pProgram, "count");
  KvCCfgValue* pOld = pCount->getValue();
  KvCCfgValue one = constant(1);
  pCount->setVarValue(one);
  delete pOld;
  EXPECT_EQ(oracle(*pProgram),
            "propagation claims what a run contradicts, with input seed 1 in step 2:\n"
            "  count.3 = 2, not its propagated constant 1\n");
}

// Dead-code removal takes away the edges propagation never marked executable; a run that needs one
// cannot go on.
TEST_F(PropagationOracle, ARunThatTakesARemovedEdgeIsCaught) {
  Program* pProgram = propagated(kCounting);
  ASSERT_NE(pProgram, nullptr);
  KvCControlFlowGraph& G = pProgram->graph();
  for (ssaopt::node v : G.nodes()) {
    KvCBasicBlock* pBlock = G.getBasicBlock(v);
    if (!pBlock || !pBlock->getBranchCond() || pBlock->getBranchCond() == pProgram->mainLoopCondition())
      continue;
    for (ssaopt::edge e : G.out(v))
      if (G.inf(e)->isTrueBranch()) {
        G.del_edge(e);
        break;
      }
  }
  EXPECT_EQ(oracle(*pProgram),
            "propagation claims what a run contradicts, with input seed 2 in step 1:\n"
            "  the run ends in a fault: bb12 goes true but has no such edge\n");
}

}  // namespace
