// Dominator trees: a copy, by construction or assignment, owns its nodes.
#include "ssaopt/ir/dominator_tree.h"

#include <gtest/gtest.h>

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
