// Procedure inlining: what takes the place of a call, which calls stay, and the regressions.
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

class InliningTest : public CfgTest {
protected:
  void TearDown() override { EXPECT_TRUE(m_ReportsExpected || m_Log.empty()) << "unexpected reports"; }

  // A block of `pProcedure` holding only a call of `name`.
  node callBlock(KvCCfgProcedure* pProcedure, const char* name) {
    node v = block(pProcedure);
    blockOf(v).append(new KvCCfgProcedureCall(name));
    return v;
  }
  KvCCfgProcedureCall* callIn(node v) { return blockOf(v).getStatementSeq().back()->isProcedureCall(); }
  // The nodes from `v` on along single successors, up to the first node without one.
  Nodes chainFrom(node v) {
    Nodes chain{v};
    while (G.outdeg(v) == 1 && chain.size() <= static_cast<std::size_t>(G.number_of_nodes()))
      chain.push_back(v = G.target(G.first_adj_edge(v)));
    return chain;
  }
  std::vector<int> shape() {
    return {G.number_of_nodes(), G.number_of_edges(), static_cast<int>(G.getProcedures().size())};
  }
  bool reported(const char* condition, int line) {
    for (const ssaopt::ReportLog::Consistency& failure : m_Log.consistencyFailures())
      if (failure.condition == condition && failure.line == line && failure.file == "KvCControlFlowGraph")
        return true;
    return false;
  }

  irtest::InternalInfoOn m_Info;
  ssaopt::ReportLog m_Log;
  bool m_ReportsExpected = false;
  KvCCfgProcedure* pMain = procedure("#main");
};

}  // namespace

using Inlining = InliningTest;

// E -> a -> c [call scale(x1, y1)] -> d,  scale(p, q): E' -> s
TEST_F(Inlining, AProcedureCalledOnceTakesThePlaceOfItsCall) {
  KvCCfgProcedure* pScale = procedure("scale");
  node a = startWith(pMain, block(pMain, 1)), c = callBlock(pMain, "scale"), d = block(pMain, 1);
  plain(a, c);
  plain(c, d);
  node s = startWith(pScale, block(pScale, 1));
  irtest::TestVariable p, q;
  irtest::TestExpression x1, y1;
  ssaopt::list<KvCCfgVariable*> formals{&p, &q};
  ssaopt::list<KvCCfgExpression*> arguments{&x1, &y1};
  KvCCfgProcedureCall* pCall = callIn(c);
  G.setParametersOfCall(pCall, formals, arguments);
  G.placeExitNodes();
  node mainExit = pMain->getExitNode();

  G.inlineProcedures();

  EXPECT_EQ(G.findProcedure("scale"), nullptr);
  EXPECT_EQ(irtest::items(pScale->getCalls()), std::vector<KvCCfgProcedureCall*>{pCall}) << "registered";
  Nodes chain = chainFrom(pMain->getEntryNode());
  ASSERT_EQ(chain.size(), 6u);
  node parameters = chain[2];
  EXPECT_EQ(chain, (Nodes{pMain->getEntryNode(), a, parameters, s, d, mainExit}));
  auto inits = irtest::items(blockOf(parameters).getStatementSeq());
  ASSERT_EQ(inits.size(), 2u);
  std::vector<std::pair<KvCCfgVariable*, KvCCfgExpression*>> assigned;
  for (KvCCfgStatement* pInit : inits) {
    ASSERT_NE(pInit->isAssignment(), nullptr);
    EXPECT_FALSE(pInit->getIsVirtual());
    assigned.emplace_back(pInit->isAssignment()->getLHS(), pInit->isAssignment()->getRHS());
  }
  EXPECT_EQ(assigned, (decltype(assigned){{&p, &x1}, {&q, &y1}}));
  EXPECT_EQ(procedureOf(s), pMain);
  EXPECT_EQ(G.number_of_nodes(), 6);
  expectInvariants(G);
}

TEST_F(Inlining, AProcedureWithoutParametersGetsAnEmptyBlock) {
  KvCCfgProcedure* pStep = procedure("step");
  node c = startWith(pMain, callBlock(pMain, "step"));
  node s = startWith(pStep, block(pStep, 1));
  G.placeExitNodes();

  G.inlineProcedures();

  Nodes chain = chainFrom(pMain->getEntryNode());
  ASSERT_EQ(chain.size(), 4u);
  EXPECT_NE(chain[1], c);
  EXPECT_TRUE(blockOf(chain[1]).getStatementSeq().empty());
  EXPECT_EQ(chain[2], s);
  expectInvariants(G);
}

TEST_F(Inlining, ProceduresCalledTwiceStay) {
  KvCCfgProcedure* pTwice = procedure("twice");
  node c1 = startWith(pMain, callBlock(pMain, "twice")), c2 = callBlock(pMain, "twice");
  plain(c1, c2);
  startWith(pTwice, block(pTwice, 1));
  G.placeExitNodes();
  std::vector<int> before = shape();

  G.inlineProcedures();

  EXPECT_EQ(shape(), before);
  EXPECT_EQ(irtest::items(pTwice->getCalls()), (std::vector<KvCCfgProcedureCall*>{callIn(c1), callIn(c2)}));
  EXPECT_TRUE(pMain->getCalls().empty());
}

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

// #main: E -> m1 -> c0 [call outer] -> m2,  outer: E -> c1 [call inner] -> o2,  inner: E -> i1
class NestedInlining : public InliningTest {
protected:
  void buildAndInline(bool innerBlocksFirst) {
    KvCCfgProcedure *pOuter = procedure("outer"), *pInner = procedure("inner");
    auto buildInner = [&] { i1 = startWith(pInner, block(pInner, 1)); };
    auto buildOuter = [&] {
      c1 = startWith(pOuter, callBlock(pOuter, "inner"));
      o2 = block(pOuter, 1);
      plain(c1, o2);
    };
    if (innerBlocksFirst) {
      buildInner();
      buildOuter();
    }
    m1 = startWith(pMain, block(pMain, 1));
    node c0 = callBlock(pMain, "outer");
    m2 = block(pMain, 1);
    plain(m1, c0);
    plain(c0, m2);
    if (!innerBlocksFirst) {
      buildOuter();
      buildInner();
    }
    G.placeExitNodes();
    G.inlineProcedures();
  }

  void expectAllInlined() {
    EXPECT_EQ(G.getProcedures().size(), 1u);
    Nodes chain = chainFrom(pMain->getEntryNode());
    ASSERT_EQ(chain.size(), 8u);
    EXPECT_EQ(chain,
              (Nodes{pMain->getEntryNode(), m1, chain[2], chain[3], i1, o2, m2, pMain->getExitNode()}));
    EXPECT_TRUE(blockOf(chain[2]).getStatementSeq().empty() && blockOf(chain[3]).getStatementSeq().empty());
    expectInvariants(G);
  }

  node m1, m2, c1, o2, i1;
};

TEST_F(NestedInlining, OuterCallBlockFirstInNodeOrder) {
  buildAndInline(false);
  expectAllInlined();
}

TEST_F(NestedInlining, InnerCallBlockFirstInNodeOrder) {
  buildAndInline(true);
  expectAllInlined();
}

// E -> f [if] -T-> c [call p] -> d,  f -F-> d;  p: E' -> s [if] -T-> t,  s -F-> exit'
TEST_F(Inlining, BranchEdgesIntoTheCallAndOutOfTheBodyKeepTheirPayloads) {
  KvCCfgProcedure* pP = procedure("p");
  node f = startWith(pMain, block(pMain, 1, true)), c = callBlock(pMain, "p"), d = block(pMain, 1);
  edge intoCall = onTrue(f, c);
  onFalse(f, d);
  plain(c, d);
  node s = startWith(pP, block(pP, 0, true)), t = block(pP, 1);
  edge toT = onTrue(s, t);
  G.placeExitNodes();
  edge toExit = onFalse(s, pP->getExitNode());
  KvCCfgEdgeInfo *pTrue = G.inf(intoCall), *pFalse = G.inf(toExit);

  G.inlineProcedures();

  node parameters = G.target(intoCall);
  EXPECT_EQ(G.source(intoCall), f);
  EXPECT_EQ(G.inf(intoCall), pTrue);
  EXPECT_EQ(successors(parameters), Nodes{s});
  EXPECT_EQ(G.source(toExit), s);
  EXPECT_EQ(G.target(toExit), d);
  EXPECT_EQ(G.inf(toExit), pFalse);
  EXPECT_EQ(G.target(toT), t);
  EXPECT_EQ(successors(t), Nodes{d});
  expectInvariants(G);
}

// while (true) call p: the call block is its own successor.
TEST_F(Inlining, ACallBlockThatLoopsToItselfLoopsToTheInlinedBody) {
  KvCCfgProcedure* pP = procedure("p");
  node c = startWith(pMain, callBlock(pMain, "p"));
  plain(c, c);
  node s = startWith(pP, block(pP, 1));
  G.placeExitNodes();

  G.inlineProcedures();

  node parameters = firstBlock(pMain);
  EXPECT_EQ(successors(parameters), Nodes{s});
  EXPECT_EQ(successors(s), Nodes{parameters});
  EXPECT_EQ(predecessors(parameters), (Nodes{pMain->getEntryNode(), s}));
  EXPECT_EQ(procedureOf(s), pMain);
  EXPECT_EQ(G.getProcedures().size(), 1u);
}

TEST_F(Inlining, ASecondRunInlinesNothingMoreAndCountsEveryCallAgain) {
  KvCCfgProcedure *pOnce = procedure("once"), *pTwice = procedure("twice");
  node c1 = startWith(pMain, callBlock(pMain, "once")), c2 = callBlock(pMain, "twice"),
       c3 = callBlock(pMain, "twice");
  plain(c1, c2);
  plain(c2, c3);
  startWith(pOnce, block(pOnce, 1));
  startWith(pTwice, block(pTwice, 1));
  G.placeExitNodes();
  G.inlineProcedures();
  ASSERT_EQ(G.findProcedure("once"), nullptr);
  std::vector<int> afterFirstRun = shape();

  G.inlineProcedures();

  EXPECT_EQ(shape(), afterFirstRun);
  EXPECT_EQ(pTwice->getCalls().size(), 4u);
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

// "#main" calls `p` once from the block `c`, which `breakCall` then changes so that the call cannot be
// inlined; the graph must stay as it was, with `condition` at `line` reported (nothing when null).
class CallLeftAlone : public InliningTest {
protected:
  void expectLeftAlone(const std::function<void(node c)>& breakCall, const char* condition, int line) {
    m_ReportsExpected = true;
    pP = procedure("p");
    node c = startWith(pMain, callBlock(pMain, "p"));
    startWith(pP, block(pP, 1));
    breakCall(c);
    G.placeExitNodes();
    std::vector<int> before = shape();

    G.inlineProcedures();

    EXPECT_EQ(shape(), before);
    EXPECT_EQ(G.findProcedure("p"), pP);
    EXPECT_EQ(m_Log.count(), condition ? 1u : 0u);
    if (condition) {
      EXPECT_TRUE(reported(condition, line)) << condition;
    }
  }

  KvCCfgProcedure* pP = nullptr;
};

TEST_F(CallLeftAlone, WhenItSharesItsBlock) {
  expectLeftAlone([&](node c) { blockOf(c).append(new irtest::TestStatement()); }, "StmtList.size() == 1",
                  2931);
}

TEST_F(CallLeftAlone, WhenItHasTwoSuccessors) {
  expectLeftAlone(
      [&](node c) {
        blockOf(c).appendBranch(new irtest::TestExpression());
        onTrue(c, block(pMain, 1));
        onFalse(c, block(pMain, 1));
      },
      "outdeg(x) == 1", 2990);
}

TEST_F(CallLeftAlone, WhenTheCalleesEntryForks) {
  expectLeftAlone([&](node) { plain(pP->getEntryNode(), block(pP, 1)); }, "outdeg(ProcedureEntryNode) == 1",
                  2978);
}

TEST_F(CallLeftAlone, WhenItsBlockHasNoProcedure) {
  expectLeftAlone([&](node c) { G.inf(c)->setProcedure(nullptr); }, "pCallerProc", 2949);
}

TEST_F(CallLeftAlone, WithoutReportWhileInternalInformationIsOff) {
  ssaopt::setShowInternalInfo(false);
  expectLeftAlone([&](node c) { blockOf(c).append(new irtest::TestStatement()); }, nullptr, 0);
}

// Nothing reaches the exit of `p`: spliced in, it would leave the code after the call without a way
// in.
TEST_F(CallLeftAlone, WhenTheCalleeNeverReturns) {
  expectLeftAlone(
      [&](node c) {
        plain(c, block(pMain, 1));
        node s = firstBlock(pP);
        plain(s, s);
      },
      nullptr, 0);
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
