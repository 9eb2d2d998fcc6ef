// Edge payloads, dominator trees, and the object indexes of the six counted families.
#include "doubles.h"
#include "ssaopt/frame/control.h"
#include "ssaopt/ir/dominator_tree.h"
#include "ssaopt/ir/edge_info.h"
#include "ssaopt/ir/procedure.h"

using irtest::TestExpression;
using irtest::TestVariable;

namespace {

// A branch payload that tells when it is destroyed.
class WatchedBranch : public KvCCfgTrueBranch {
public:
  explicit WatchedBranch(bool* pDestroyed) : m_pDestroyed(pDestroyed) {}
  ~WatchedBranch() override { *m_pDestroyed = true; }

private:
  bool* m_pDestroyed;
};

template <class... Object>
std::vector<std::uint32_t> indexesOf(const Object&... objects) {
  return {objects.getIndex()...};
}

}  // namespace

TEST(EdgePayload, ASubclassDeletedThroughTheBaseIsDestroyed) {
  bool destroyed = false;
  KvCCfgEdgeInfo* pPayload = new WatchedBranch(&destroyed);
  EXPECT_EQ(pPayload->isTrueBranch(), pPayload);
  EXPECT_EQ(pPayload->isSSAEdge(), nullptr);
  delete pPayload;
  EXPECT_TRUE(destroyed);
}

TEST(DominatorTree, ACopyHasItsOwnNodesAndItsOwnRoot) {
  ssaopt::graph cfg;
  ssaopt::node entry = cfg.new_node(), body = cfg.new_node();
  KvCDominatorTree tree, assigned;
  tree.new_node(body);  // the root need not be the first node
  ssaopt::node root = tree.new_node(entry);
  tree.new_edge(root, tree.first_node());
  tree.setRoot(root);
  KvCDominatorTree copy(tree);
  assigned = tree;
  for (const KvCDominatorTree* pTree : {&copy, &assigned}) {
    EXPECT_NE(pTree->getRoot(), root);
    EXPECT_EQ(pTree->inf(pTree->getRoot()), entry);
    EXPECT_EQ(pTree->outdeg(pTree->getRoot()), 1);
  }
}

TEST(ObjectIndexes, EachFamilyCountsFromZeroAfterBootAndCopiesKeepTheirIndex) {
  KvCCfgVariable::boot();
  TestVariable v0, v1;
  KvCSSAVariable v2(&v0);
  EXPECT_EQ(indexesOf(v0, v1, v2), (std::vector<std::uint32_t>{0, 1, 2}));

  KvCCfgExpression::boot();
  KvCCfgValueExpression e0, e1(true);
  TestExpression e2;
  KvCCfgValueExpression copyOfE1(e1);
  EXPECT_EQ(indexesOf(e0, e1, e2, copyOfE1), (std::vector<std::uint32_t>{0, 1, 2, 1}));

  KvCCfgStatement::boot();
  KvCCfgOutputStatement s0(&v0);
  KvCPhiFunction s1(&v0, 2);
  KvCCfgOutputStatement copyOfS0(s0);
  KvCPhiFunction* pS2 = s1.clone();
  EXPECT_EQ(indexesOf(s0, s1, copyOfS0, *pS2), (std::vector<std::uint32_t>{0, 1, 0, 2}));
  delete pS2;

  KvCBasicBlock::boot();
  KvCBasicBlock b0, b1;
  KvCBasicBlock copyOfB1(b1);
  EXPECT_EQ(indexesOf(b0, b1, copyOfB1), (std::vector<std::uint32_t>{0, 1, 1}));

  KvCCfgEdgeInfo::boot();
  KvCCfgEdgeInfo d0;
  KvCCfgTrueBranch d1;
  KvCSSAEdge d2;
  KvCCfgTrueBranch copyOfD1(d1);
  EXPECT_EQ(indexesOf(d0, d1, d2, copyOfD1), (std::vector<std::uint32_t>{0, 1, 2, 1}));

  KvCCfgProcedure::boot();
  KvCCfgProcedure p0, p1;
  KvCCfgProcedure copyOfP1(p1);
  EXPECT_EQ(indexesOf(p0, p1, copyOfP1), (std::vector<std::uint32_t>{0, 1, 1}));

  KvCSSAControl control;
  EXPECT_TRUE(control.boot());  // starting the module leaves the counters alone
  EXPECT_EQ(indexesOf(TestVariable(), KvCCfgProcedure()), (std::vector<std::uint32_t>{3, 2}));
}
