// Programs as the printer writes them back: the canonical text of what was read, which reads back to
// the same text.
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

TEST_F(RoundTrip, DeclarationsAreWrittenInOneOrder) {
  EXPECT_EQ(printTwice("var int16 s erasable saturate(..100) output scale(0.5, 1) = 2;\n"
                       "var bool b = true;\n"
                       "var uint8 t[3] volatile;\n"
                       "var float64 f saturate(-1.5..) = -0.25;\n"
                       "proc #main {}\n"),
            "var int16 s scale(0.5, 1) saturate(..100) output erasable = 2;\n"
            "var bool b = 1;\n"
            "var uint8 t[3] volatile;\n"
            "var float64 f saturate(-1.5..) = -0.25;\n"
            "\n"
            "proc #main {\n"
            "}\n");
}

TEST_F(RoundTrip, ExpressionsKeepOnlyTheParenthesesTheyNeed) {
  EXPECT_EQ(printTwice("var int32 a; var int32 b; var int32 c; var int32 t[4];\n"
                       "proc #main {\n"
                       "  a = ((a + b) * c) - (b - c) - -3;\n"
                       "  a = a - (b - (c));\n"
                       "  a = -(-a) + ~(!b);\n"
                       "  b = !(a && b) || (c == 1);\n"
                       "  c = (t[a + 1] << 2) & 255 | abs(a - 1) ^ sgn(-b);\n"
                       "  t[c % 4] = 0.1 + 1e-7 * inf;\n"
                       "}\n"),
            "var int32 a;\nvar int32 b;\nvar int32 c;\nvar int32 t[4];\n"
            "\n"
            "proc #main {\n"
            "  a = (a + b) * c - (b - c) - -3;\n"
            "  a = a - (b - c);\n"
            "  a = -(-a) + ~!b;\n"
            "  b = !(a && b) || c == 1;\n"
            "  c = t[a + 1] << 2 & 255 | abs(a - 1) ^ sgn(-b);\n"
            "  t[c % 4] = 0.1 + 1e-07 * inf;\n"
            "}\n");
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

// Procedures follow the text, empty ones stay empty, and blocks split at calls read back as written.
TEST_F(RoundTrip, ProceduresAndCallsReadBackAsWritten) {
  EXPECT_EQ(printTwice("var int16 x; var int16 p;\n"
                       "proc z {}\n"
                       "proc f(p) { x = p; }\n"
                       "proc #main {\n"
                       "  x = 1;\n"
                       "  call f(x);\n"
                       "  call f(2);\n"
                       "  if x > 0 goto end else end;\n"
                       "}\n"
                       "proc a { goto end; }\n"),
            "var int16 x;\nvar int16 p;\n\nproc z {\n}\n\nproc f(p) {\n  x = p;\n}\n\n"
            "proc #main {\n"
            "  x = 1;\n"
            "  call f(x);\n"
            "  call f(2);\n"
            "  if x > 0 goto end else end;\n"
            "}\n\nproc a {\n}\n");
}

// Jumps are written only where control does not fall through; empty blocks that only lead to the end
// read as the end.
TEST_F(RoundTrip, JumpsAreWrittenOnlyWhereNeeded) {
  EXPECT_EQ(printTwice("var uint8 i;\n"
                       "var bool b volatile;\n"
                       "proc #main {\n"
                       "  i = 0;\n"
                       "head:\n"
                       "  if i < 8 goto body else done;\n"
                       "done:\n"
                       "  if b goto again else end;\n"
                       "again:\n"
                       "  goto last;\n"
                       "last:\n"
                       "  goto end;\n"
                       "body:\n"
                       "  i = i + 1;\n"
                       "  goto head;\n"
                       "}\n"),
            "var uint8 i;\nvar bool b volatile;\n\n"
            "proc #main {\n"
            "  i = 0;\n"
            "head:\n"
            "  if i < 8 goto body else done;\n"
            "done:\n"
            "  if b goto end else end;\n"
            "body:\n"
            "  i = i + 1;\n"
            "  goto head;\n"
            "}\n");
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
