// Helpers of the client's tests. Every test runs with a pool memory controller installed, as the tool
// does: the graph deletes no payload by design, and the pool takes everything back when the test ends.
#pragma once

#include <gtest/gtest.h>

#include <fstream>
#include <memory>
#include <sstream>
#include <string>
#include <vector>

#include "ssaopt/client/front_end.h"
#include "ssaopt/client/printer.h"
#include "ssaopt/client/statements.h"
#include "ssaopt/frame/pool.h"
#include "ssaopt/ir/edge_info.h"
#include "ssaopt/ir/node_info.h"
#include "ssaopt/ir/procedure.h"

namespace clienttest {

inline const char* const kExamples[] = {"typical_run", "controller", "procedures", "loop", "outline"};

inline std::string readExample(const std::string& name) {
  std::ifstream file(std::string(SSAOPT_EXAMPLES_DIR) + "/" + name + ".ssa");
  std::ostringstream text;
  text << file.rdbuf();
  return text.str();
}

class ClientTest : public ::testing::Test {
protected:
  // Object indexes start at 0 in every test, so that generated names ("bb3", "#block_3") are stable.
  ClientTest() { ssaopt::client::restartObjectNumbering(); }

  // The program, or null with the test failed and the diagnostics shown.
  ssaopt::client::Program* load(const std::string& text) {
    ssaopt::client::LoadResult result = ssaopt::client::loadProgram(text);
    if (!result.program) {
      ADD_FAILURE() << "does not load:\n" << diagnosticsOf(result) << text;
      return nullptr;
    }
    m_Programs.push_back(std::move(result.program));
    return m_Programs.back().get();
  }

  // The formatted diagnostics of loading `text`, one per line.
  std::string diagnosticsOf(const std::string& text) {
    ssaopt::client::LoadResult result = ssaopt::client::loadProgram(text);
    if (result.program) m_Programs.push_back(std::move(result.program));
    return diagnosticsOf(result);
  }

  std::string print(const std::string& text) {
    ssaopt::client::Program* pProgram = load(text);
    return pProgram ? ssaopt::client::printProgram(*pProgram) : "";
  }

  static std::string diagnosticsOf(const ssaopt::client::LoadResult& result) {
    std::string text;
    for (const ssaopt::client::Diagnostic& diagnostic : result.diagnostics)
      text += ssaopt::client::formatDiagnostic("t.ssa", diagnostic) + "\n";
    return text;
  }

  // The blocks of the graph in node order.
  static std::vector<KvCBasicBlock*> blocksOf(ssaopt::client::Program& program) {
    std::vector<KvCBasicBlock*> blocks;
    for (ssaopt::node v : program.graph().nodes())
      if (KvCBasicBlock* pBlock = program.graph().getBasicBlock(v)) blocks.push_back(pBlock);
    return blocks;
  }

  // The first statement of the program that is an assignment, and its right-hand side.
  static KvCCfgSFAssignment* firstAssignment(ssaopt::client::Program& program) {
    for (KvCBasicBlock* pBlock : blocksOf(program))
      for (KvCCfgStatement* pStatement : pBlock->getStatementSeq())
        if (KvCCfgSFAssignment* pAssignment = pStatement->isSFAssignment()) return pAssignment;
    return nullptr;
  }

private:
  ssaopt::PoolMemController m_Pool;
  ssaopt::PoolMemController::Scope m_Scope{&m_Pool};
  std::vector<std::unique_ptr<ssaopt::client::Program>> m_Programs;
};

}  // namespace clienttest
