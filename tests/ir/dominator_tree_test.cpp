// Dominator trees: a copy, by construction or assignment, owns its nodes.
#include "ssaopt/ir/dominator_tree.h"

#include <gtest/gtest.h>

#include <optional>

// Handles are creation numbers, so a copy's root has the number of the original's; but the nodes
// and edges are the copy's own, and serve after the original is gone.
TEST(DominatorTree, ACopyHasItsOwnNodesAndItsOwnRoot) {
  ssaopt::graph cfg;
  ssaopt::node entry = cfg.new_node(), body = cfg.new_node();
  std::optional<KvCDominatorTree> tree(std::in_place);
  tree->new_node(body);  // the root need not be the first node
  ssaopt::node root = tree->new_node(entry);
  tree->new_edge(root, tree->first_node());
  tree->setRoot(root);
  KvCDominatorTree copy(*tree);
  KvCDominatorTree assigned;
  assigned = *tree;
  tree.reset();
  for (const KvCDominatorTree* pTree : {&copy, &assigned}) {
    EXPECT_EQ(pTree->inf(pTree->getRoot()), entry);
    EXPECT_EQ(pTree->outdeg(pTree->getRoot()), 1);
    EXPECT_EQ(pTree->inf(pTree->target(pTree->first_adj_edge(pTree->getRoot()))), body);
  }
}
