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

TEST_F(RoundTrip, LongAndDeeplyNestedExpressionsReadBackWhole) {
  // Each term's text is written once: no copying of operands into their parents, which costs the
  // square of the length, and no recursion as deep as the nesting.
  std::string sum = "b";
  for (int i = 1; i < 100000; ++i) sum += " + b";
  std::string nested = "b - b";
  for (int i = 1; i < 900; ++i) nested = "b - (" + nested + ")";
  std::string printed = printTwice("var int32 a;\nvar int32 b;\n\nproc #main {\n  a = " + sum +
                                   ";\n  a = " + nested + ";\n}\n");
  EXPECT_NE(printed.find("  a = " + sum + ";\n  a = " + nested + ";\n"), std::string::npos);
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
