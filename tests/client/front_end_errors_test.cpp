// What the front end says about programs it rejects, beyond what tests/filetests/errors shows through
// the tool: the limit on nesting, which no program of reasonable size reaches, and a file that cannot
// be read. Every diagnostic comes with the line it points into.
#include "client_testing.h"

namespace {

class FrontEndLimits : public clienttest::ClientTest {};

TEST_F(FrontEndLimits, ExpressionsNestedTooDeeplyAreRejectedNotOverflowed) {
  std::string deep(1001, '(');
  std::string line = "  x = " + deep + "1" + std::string(1001, ')') + ";";
  ssaopt::client::LoadResult result =
      ssaopt::client::loadProgram("var int16 x;\nproc #main {\n" + line + "\n}\n");
  ASSERT_EQ(result.diagnostics.size(), 1u);
  EXPECT_EQ(result.program, nullptr);
  const ssaopt::client::Diagnostic& error = result.diagnostics[0];
  EXPECT_EQ(error.message, "expression nested deeper than 1000 levels");
  EXPECT_EQ(error.pos.line, 3u);
  EXPECT_EQ(error.pos.column, 1007u);
  EXPECT_EQ(error.sourceLine, line);
  // A line that long is shown around the column, with the caret under it.
  std::string shown = ssaopt::client::formatDiagnostic("t.ssa", error);
  EXPECT_EQ(shown.substr(shown.find('\n') + 1),
            "..." + line.substr(1006 - 70, 140) + "...\n" + std::string(73, ' ') + "^");
  std::string fine(999, '(');
  EXPECT_NE(load("var int16 x;\nproc #main {\n  x = " + fine + "1" + std::string(999, ')') + ";\n}\n"),
            nullptr);
}

TEST_F(FrontEndLimits, AnUnreadableFileIsAnErrorWithoutPosition) {
  ssaopt::client::LoadResult result = ssaopt::client::loadProgramFile("/nonexistent/program.ssa");
  ASSERT_EQ(result.program, nullptr);
  EXPECT_EQ(ssaopt::client::formatDiagnostic("p.ssa", result.diagnostics.at(0)),
            "p.ssa: error: cannot read the file");
}

}  // namespace
