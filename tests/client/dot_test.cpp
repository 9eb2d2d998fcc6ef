// The Graphviz output shows procedures, branches and SSA edges as intended, and dot accepts it.
#include "ssaopt/client/dot.h"

#include <cstdio>
#include <cstdlib>

#include "client_testing.h"

namespace {

class Dot : public clienttest::ClientTest {
protected:
  // Whether `dot -Tsvg` renders `graph` without complaint.
  static bool rendersThroughDot(const std::string& graph) {
    const ::testing::TestInfo* pTest = ::testing::UnitTest::GetInstance()->current_test_info();
    std::string path = ::testing::TempDir() + "ssaopt_" + pTest->name() + ".dot";
    std::FILE* pFile = std::fopen(path.c_str(), "w");
    if (!pFile) return false;
    std::fputs(graph.c_str(), pFile);
    std::fclose(pFile);
    std::string command = "dot -Tsvg '" + path + "' -o /dev/null";
    return std::system(command.c_str()) == 0;
  }

  static std::size_t count(const std::string& text, const std::string& what) {
    std::size_t n = 0;
    for (std::size_t at = text.find(what); at != std::string::npos; at = text.find(what, at + 1)) ++n;
    return n;
  }
};

// A cluster per procedure, labelled branches, dashed SSA edges, and escaped what records and strings
// give meaning to; Graphviz's dot accepts the result.
TEST_F(Dot, ShowsProceduresBranchesAndSSAEdges) {
  ssaopt::client::Program* pProgram = load(
      "var int16 x; var int16 y;\n"
      "proc f { x = 1; }\n"
      "proc #main {\n  call f();\n  if x < y || x > 2 goto end else end;\n}\n");
  KvCControlFlowGraph& graph = pProgram->graph();
  ssaopt::node first = graph.target(graph.first_adj_edge(graph.findProcedure("#main")->getEntryNode()));
  graph.new_edge(first, graph.target(graph.first_adj_edge(first)), new KvCSSAEdge());
  std::string dot = ssaopt::client::writeDot(*pProgram);
  EXPECT_EQ(count(dot, "subgraph cluster_"), 2u);
  EXPECT_NE(dot.find("label=\"f\""), std::string::npos);
  EXPECT_EQ(count(dot, "[label=\"T\"]"), 2u);  // the branch and the loop around #main
  EXPECT_EQ(count(dot, "[label=\"F\"]"), 2u);
  EXPECT_EQ(count(dot, "style=dashed"), 1u);
  EXPECT_NE(dot.find("if x \\< y \\|\\| x \\> 2\\l"), std::string::npos) << dot;
  EXPECT_TRUE(rendersThroughDot(dot));
}

}  // namespace
