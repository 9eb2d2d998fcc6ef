// Programs as the printer writes them back: the canonical text of what was read, which reads back to
// the same text (more in tests/filetests/printing).
#include "client_testing.h"

namespace {

class RoundTrip : public clienttest::ClientTest {
protected:
  // Prints `text`, reads the print and prints again; both prints must agree.
  std::string printTwice(const std::string& text) {
    std::string once = print(text);
    EXPECT_EQ(print(once), once) << "from:\n" << text;
    return once;
  }
};

TEST_F(RoundTrip, EveryExampleReadsBackToTheSameText) {
  for (const char* name : clienttest::kExamples) {
    SCOPED_TRACE(name);
    std::string text = clienttest::readExample(name);
    ASSERT_FALSE(text.empty());
    printTwice(text);
  }
}

TEST_F(RoundTrip, OutlinedBlocksBecomeProceduresCalledWhereTheyWereReached) {
  EXPECT_EQ(printTwice(clienttest::readExample("outline")),
            "var int16 level volatile;\n"
            "var bool alarm output = 0;\n"
            "var int16 count = 0;\n"
            "\n"
            "proc #main {\n"
            "  count = count + 1;\n"
            "  if level > 100 goto high else low;\n"
            "high:\n"
            "  alarm = 1;\n"
            "  call #block_3();\n"
            "  goto end;\n"
            "low:\n"
            "  alarm = 0;\n"
            "  call #block_3();\n"
            "}\n"
            "\n"
            "proc #block_3 {\n"
            "report:\n"
            "  count = count % 1000;\n"
            "  extern log_event uses(alarm, count);\n"
            "}\n");
}

}  // namespace
