// Procedure inlining where programs cannot go (calls of "#main", calls that break the graph's
// promises), and the regressions. What takes the place of a call is shown by programs
// (tests/tools/pipeline_test.cpp).
#include <gtest/gtest.h>

#include <cstdlib>
#include <cstring>
#include <functional>
#include <unordered_map>

#include "cfg/cfg_testing.h"
#include "ssaopt/frame/report.h"
#include "ssaopt/ir/statement.h"

#if defined(__SANITIZE_ADDRESS__)
#include <sanitizer/asan_interface.h>
#else
#define ASAN_POISON_MEMORY_REGION(address, size) ((void)(address), (void)(size))
#define ASAN_UNPOISON_MEMORY_REGION(address, size) ((void)(address), (void)(size))
#endif

using namespace cfgtest;

namespace {

class InliningTest : public QuietCfgTest {
protected:
  // A block of `pProcedure` holding only a call of `name`.
  node callBlock(KvCCfgProcedure* pProcedure, const char* name) {
    node v = block(pProcedure);
    blockOf(v).append(new KvCCfgProcedureCall(name));
    return v;
  }
  // The nodes from `v` on along single successors, up to the first node without one.
  Nodes chainFrom(node v) {
    Nodes chain{v};
    while (G.outdeg(v) == 1 && chain.size() <= static_cast<std::size_t>(G.number_of_nodes()))
      chain.push_back(v = G.target(G.first_adj_edge(v)));
    return chain;
  }
  bool reported(const char* condition, int line) {
    for (const ssaopt::ReportLog::Consistency& failure : m_Log.consistencyFailures())
      if (failure.condition == condition && failure.line == line && failure.file == "KvCControlFlowGraph")
        return true;
    return false;
  }
};

}  // namespace

using Inlining = InliningTest;

// A call of "#main" would make it look like any procedure called once; inlining it would take the
// main procedure out of the table.
TEST_F(Inlining, MainIsNeverInlinedEvenWhenSomethingCallsIt) {
  KvCCfgProcedure* pBack = procedure("back");
  node back = startWith(pBack, callBlock(pBack, "#main"));
  node m = startWith(pMain, callBlock(pMain, "back"));
  G.placeExitNodes();

  G.inlineProcedures();

  EXPECT_EQ(G.findProcedure("#main"), pMain);
  EXPECT_EQ(G.findProcedure("back"), nullptr);
  EXPECT_EQ(procedureOf(back), pMain);
  EXPECT_EQ(G.number_of_nodes(), 4) << "entry, parameter block, the call of #main, exit";
  (void)m;
  expectInvariants(G);
}

// A procedure whose only call is in its own body, and two procedures that only call each other:
// after the first of them is inlined into the second, the second holds the only call of itself.
// Inlining either call deleted the caller's own entry and exit.
TEST_F(Inlining, RegressionACallFromInsideItsOwnProcedureIsNeverInlined) {
  KvCCfgProcedure *pSelf = procedure("self"), *pPing = procedure("ping"), *pPong = procedure("pong");
  startWith(pMain, block(pMain, 1));
  node self = startWith(pSelf, callBlock(pSelf, "self"));
  node callsPong = startWith(pPing, callBlock(pPing, "pong"));
  node callsPing = startWith(pPong, callBlock(pPong, "ping"));
  G.placeExitNodes();

  G.inlineProcedures();

  EXPECT_EQ(G.findProcedure("self"), pSelf);
  EXPECT_EQ(firstBlock(pSelf), self);
  EXPECT_EQ(G.findProcedure("ping"), pPing);
  EXPECT_EQ(G.findProcedure("pong"), nullptr);
  EXPECT_EQ(procedureOf(callsPing), pPing);
  EXPECT_EQ(chainFrom(pPing->getEntryNode()).at(2), callsPing);
  EXPECT_TRUE(G.checkConsistency());
  expectInvariants(G);
  (void)callsPong;
}

// ---- Calls that are left alone ------------------------------------------------------------------

// Procedure c<i> calls p<i> once from a block that the case then changes so that the call cannot be
// inlined: the graph must stay as it was, with the failed condition reported (nothing for a callee
// that never returns: spliced in, it would leave the code after the call without a way in).
TEST_F(Inlining, CallsThatCannotBeInlinedAreLeftAloneAndReported) {
  m_ReportsExpected = true;
  struct Case {
    const char* condition;
    int line;
    std::function<void(node c, KvCCfgProcedure* pCaller, KvCCfgProcedure* pCallee)> breakCall;
  };
  const Case cases[] = {
      {"StmtList.size() == 1", 2931,
       [&](node c, KvCCfgProcedure*, KvCCfgProcedure*) { blockOf(c).append(new irtest::TestStatement()); }},
      {"outdeg(x) == 1", 2990,
       [&](node c, KvCCfgProcedure* pCaller, KvCCfgProcedure*) {
         blockOf(c).appendBranch(new irtest::TestExpression());
         onTrue(c, block(pCaller, 1));
         onFalse(c, block(pCaller, 1));
       }},
      {"outdeg(ProcedureEntryNode) == 1", 2978,
       [&](node, KvCCfgProcedure*, KvCCfgProcedure* pCallee) {
         plain(pCallee->getEntryNode(), block(pCallee, 1));
       }},
      {"pCallerProc", 2949,
       [&](node c, KvCCfgProcedure*, KvCCfgProcedure*) { G.inf(c)->setProcedure(nullptr); }},
      {nullptr, 0,
       [&](node c, KvCCfgProcedure* pCaller, KvCCfgProcedure* pCallee) {
         plain(c, block(pCaller, 1));
         node s = firstBlock(pCallee);
         plain(s, s);
       }},
  };
  startWith(pMain, block(pMain, 1));
  std::vector<std::string> callees;
  for (const Case& c : cases) {
    std::string index = std::to_string(callees.size());
    callees.push_back("p" + index);
    KvCCfgProcedure *pCaller = procedure(("c" + index).c_str()), *pCallee = procedure(callees.back().c_str());
    node call = startWith(pCaller, callBlock(pCaller, callees.back().c_str()));
    startWith(pCallee, block(pCallee, 1));
    c.breakCall(call, pCaller, pCallee);
  }
  G.placeExitNodes();
  std::vector<int> before = shape();

  G.inlineProcedures();

  EXPECT_EQ(shape(), before);
  for (const std::string& name : callees) EXPECT_NE(G.findProcedure(name.c_str()), nullptr) << name;
  EXPECT_EQ(m_Log.count(), 4u);
  for (const Case& c : cases) EXPECT_TRUE(!c.condition || reported(c.condition, c.line)) << c.condition;
}

// ---- Freed memory -------------------------------------------------------------------------------

namespace {

// Hands out heap blocks and keeps every freed block until the end, filled with a pattern (and, under
// AddressSanitizer, poisoned): a read of freed memory finds nonsense or is caught, where a pool
// would have handed the block out again.
class QuarantineMemController : public KvCMemController {
public:
  ~QuarantineMemController() override {
    for (const auto& block : m_Sizes) {
      ASAN_UNPOISON_MEMORY_REGION(block.first, block.second);
      std::free(block.first);
    }
  }
  void* allocMemBlock(unsigned long size) override {
    void* pBlock = std::malloc(size);
    m_Sizes[pBlock] = size;
    return pBlock;
  }
  void freeMemBlock(void* pBlock) override {
    std::memset(pBlock, 0xdb, m_Sizes.at(pBlock));
    ASAN_POISON_MEMORY_REGION(pBlock, m_Sizes.at(pBlock));
  }

private:
  std::unordered_map<void*, std::size_t> m_Sizes;
};

class InliningFreedMemory : public ::testing::Test {
protected:
  QuarantineMemController m_Memory;
  ssaopt::PoolMemController::Scope m_Scope{&m_Memory};
  KvCControlFlowGraph G;
};

}  // namespace

// #main calls `first` and then `second`, each once; both callees' entries and exits come before and
// after the call blocks in node order. The second pass must neither visit the deleted call block,
// entry and exit nodes nor read the parameter statements that went with `first`.
TEST_F(InliningFreedMemory, RegressionTheSecondPassNeverTouchesWhatAnInliningDeleted) {
  auto newBlock = [&](KvCCfgProcedure* pProcedure, KvCCfgStatement* pStatement) {
    KvCBasicBlock* pBlock = new KvCBasicBlock();
    pBlock->setProcedure(pProcedure);
    pBlock->append(pStatement);
    return G.new_node(pBlock);
  };
  auto link = [&](node v, node w) { G.new_edge(v, w, new KvCCfgEdgeInfo()); };
  KvCCfgProcedure *pFirst = nullptr, *pMain = nullptr, *pSecond = nullptr;
  node firstEntry = G.demandProcedureEntryNode("first", pFirst);
  node body = newBlock(pFirst, new irtest::TestStatement());
  link(firstEntry, body);
  node mainEntry = G.demandProcedureEntryNode("#main", pMain);
  node c1 = newBlock(pMain, new KvCCfgProcedureCall("first"));
  node c2 = newBlock(pMain, new KvCCfgProcedureCall("second"));
  link(mainEntry, c1);
  link(c1, c2);
  node secondEntry = G.demandProcedureEntryNode("second", pSecond);
  link(secondEntry, newBlock(pSecond, new irtest::TestStatement()));
  irtest::TestVariable p;
  irtest::TestExpression argument;
  ssaopt::list<KvCCfgVariable*> formals{&p};
  ssaopt::list<KvCCfgExpression*> arguments{&argument};
  G.setParametersOfCall(G.getBasicBlock(c1)->getStatementSeq().front()->isProcedureCall(), formals,
                        arguments);
  G.placeExitNodes();

  G.inlineProcedures();

  EXPECT_EQ(G.getProcedures().size(), 1u);
  EXPECT_EQ(G.number_of_nodes(), 6) << "entry, two parameter blocks, two bodies, exit";
  EXPECT_TRUE(G.checkConsistency());
  for (ssaopt::node v : G.nodes()) EXPECT_EQ(G.inf(v)->getProcedure(), pMain);
  ssaopt::node parameters = G.target(G.first_adj_edge(mainEntry));
  ASSERT_EQ(G.getBasicBlock(parameters)->getStatementSeq().size(), 1u);
  EXPECT_EQ(G.getBasicBlock(parameters)->getStatementSeq().front()->isAssignment()->getRHS(), &argument);
  EXPECT_EQ(G.target(G.first_adj_edge(parameters)), body);
}
