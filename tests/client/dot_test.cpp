// The Graphviz output: Graphviz's dot accepts it for every example, and it shows procedures, branches
// and SSA edges as intended.
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

TEST_F(Dot, EveryExampleRendersBeforeAndAfterDividingBlocks) {
  for (const char* name : clienttest::kExamples) {
    SCOPED_TRACE(name);
    ssaopt::client::Program* pProgram = load(clienttest::readExample(name));
    EXPECT_TRUE(rendersThroughDot(ssaopt::client::writeDot(*pProgram)));
    pProgram->graph().divideBasicBlock();
    EXPECT_TRUE(rendersThroughDot(ssaopt::client::writeDot(*pProgram)));
  }
}

TEST_F(Dot, ShowsOneClusterPerProcedureAndLabelsBranches) {
  ssaopt::client::Program* pProgram = load(clienttest::readExample("procedures"));
  std::string graph = ssaopt::client::writeDot(*pProgram);
  EXPECT_EQ(count(graph, "subgraph cluster_"), 3u);
  EXPECT_NE(graph.find("label=\"accumulate\""), std::string::npos);
  EXPECT_EQ(count(graph, "[label=\"T\"]"), 1u);  // the loop around #main
  EXPECT_EQ(count(graph, "[label=\"F\"]"), 1u);
}

TEST_F(Dot, EscapesWhatRecordsAndStringsGiveMeaningTo) {
  ssaopt::client::Program* pProgram =
      load("var int16 x; var int16 y;\nproc #main { if x < y || x > 2 goto end else end; }\n");
  std::string graph = ssaopt::client::writeDot(*pProgram);
  EXPECT_NE(graph.find("if x \\< y \\|\\| x \\> 2\\l"), std::string::npos) << graph;
  EXPECT_TRUE(rendersThroughDot(graph));
}

TEST_F(Dot, DrawsSSAEdgesDashed) {
  ssaopt::client::Program* pProgram = load("var int16 x;\nproc #main {\n  x = 1;\nnext:\n  x = x + 1;\n}\n");
  KvCControlFlowGraph& graph = pProgram->graph();
  ssaopt::node first = graph.target(graph.first_adj_edge(graph.findProcedure("#main")->getEntryNode()));
  graph.new_edge(first, graph.target(graph.first_adj_edge(first)), new KvCSSAEdge());
  std::string dot = ssaopt::client::writeDot(*pProgram);
  EXPECT_EQ(count(dot, "style=dashed"), 1u);
  EXPECT_TRUE(rendersThroughDot(dot));
}

}  // namespace
