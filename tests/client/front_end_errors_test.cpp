// What the front end says about programs it rejects: one case per kind of error, each with the exact
// position, and the warning for a block that is dropped.
#include "client_testing.h"

namespace {

struct ErrorCase {
  const char* name;
  const char* program;
  const char* diagnostic;
};

const ErrorCase kErrorCases[] = {
    // ---- Syntax ----
    {"MissingSemicolon", "var int16 x\nproc #main {}\n",
     "t.ssa:2:1: error: expected an attribute (scale, saturate, "
     "output, volatile, erasable), '=' or ';', found 'proc'"},
    {"UnexpectedCharacter", "proc #main {\n  x = $;\n}\n", "t.ssa:2:7: error: unexpected character '$'"},
    {"MalformedNumber", "var int16 x = 1e;\n",
     "t.ssa:1:16: error: malformed number: exponent without digits"},
    {"MissingClosingBrace", "proc #main {\n", "t.ssa:2:1: error: expected '}', found the end of the input"},
    {"ReservedWordAsName", "var int16 end;\n",
     "t.ssa:1:11: error: 'end' is a reserved word and cannot name a variable"},
    {"StatementAfterGoto", "proc #main {\n  goto end;\n  x = 1;\n}\n",
     "t.ssa:3:3: error: this cannot be reached after 'goto' or 'if'; give it a label"},
    {"CallInsideAnExpression", "var int16 x;\nproc #main {\n  x = f(1);\n}\n",
     "t.ssa:3:7: error: 'f' is not a function; procedures are called by 'call f(...);'"},
    {"AttributeTwice", "var int16 x output output;\nproc #main {}\n",
     "t.ssa:1:20: error: 'output' is given twice"},
    // ---- Names ----
    {"UnknownVariable", "var int16 x;\nproc #main {\n  x = y + 1;\n}\n",
     "t.ssa:3:7: error: unknown variable 'y'"},
    {"UnknownProcedure", "proc #main {\n  call f();\n}\n", "t.ssa:2:8: error: unknown procedure 'f'"},
    {"UnknownDataType", "var int64 x;\nproc #main {}\n", "t.ssa:1:5: error: unknown data type 'int64'"},
    {"DuplicateVariable", "var int16 x;\nvar bool x;\nproc #main {}\n",
     "t.ssa:2:10: error: variable 'x' is already declared at line 1"},
    {"DuplicateProcedure", "proc f {}\nproc f {}\nproc #main {}\n",
     "t.ssa:2:6: error: procedure 'f' is already declared at line 1"},
    {"DuplicateLabel", "proc #main {\nL:\n  goto L;\nL:\n}\n",
     "t.ssa:4:1: error: label 'L' is already used at line 2"},
    {"JumpToMissingLabel", "proc #main {\n  goto nowhere;\n}\n",
     "t.ssa:2:8: error: no block 'nowhere' in procedure '#main'"},
    {"MissingMain", "proc f {}\n", "t.ssa:2:1: error: the program has no procedure '#main'"},
    // ---- Types ----
    {"ArrayReadWithoutIndex", "var int16 a[4];\nvar int16 x;\nproc #main {\n  x = a + 1;\n}\n",
     "t.ssa:4:7: error: 'a' is an array; read an element: a[i]"},
    {"ArrayAssignedWithoutIndex", "var int16 a[4];\nproc #main {\n  a = 1;\n}\n",
     "t.ssa:3:3: error: 'a' is an array; assign an element: a[i] = ..."},
    {"IndexOfAScalar", "var int16 x;\nproc #main {\n  x[1] = 2;\n}\n",
     "t.ssa:3:3: error: 'x' is not an array"},
    {"IndexOutsideTheArray", "var int16 a[4];\nvar int16 x;\nproc #main {\n  x = a[4];\n}\n",
     "t.ssa:4:9: error: index 4 is outside 'a', which has 4 elements"},
    {"ScaledFloat", "var float32 f scale(0.5);\nproc #main {}\n",
     "t.ssa:1:21: error: only integer variables can be scaled, and 'f' is float32"},
    {"SaturatedBool", "var bool b saturate(0..1);\nproc #main {}\n",
     "t.ssa:1:12: error: a bool variable cannot be saturated"},
    {"LimitsTheWrongWayRound", "var int16 x saturate(5..3);\nproc #main {}\n",
     "t.ssa:1:13: error: the lower limit 5 is above the upper limit 3"},
    {"ArrayLengthZero", "var int16 a[0];\nproc #main {}\n",
     "t.ssa:1:13: error: the length of an array must be a whole number from 1 to 1048576"},
    // Regression: accepted, and running it took more than 14 GB.
    {"ArrayLengthBeyondTheLimit", "var int16 a[2147483647];\nproc #main {}\n",
     "t.ssa:1:13: error: the length of an array must be a whole number from 1 to 1048576"},
    {"ArrayAsParameter", "var int16 a[2];\nproc f(a) {}\nproc #main {}\n",
     "t.ssa:2:8: error: the array 'a' cannot be a parameter"},
    // ---- Values that do not fit ----
    {"InitialValueOutOfRange", "var uint8 x = 256;\nproc #main {}\n",
     "t.ssa:1:15: error: initial value 256 does not fit 'x' (uint8)"},
    {"FractionForAnInteger", "var int16 x;\nproc #main {\n  x = 0.5;\n}\n",
     "t.ssa:3:7: error: value 0.5 does not fit 'x' (int16)"},
    {"BooleanOtherThanZeroOrOne", "var bool b;\nproc #main {\n  b = 2;\n}\n",
     "t.ssa:3:7: error: value 2 does not fit 'b' (bool)"},
    {"ScaledValueOutOfRange", "var int8 x scale(0.5) = 64;\nproc #main {}\n",
     "t.ssa:1:25: error: initial value 64 does not fit 'x' (int8)"},
    {"ArgumentOutOfRange", "var uint8 p;\nproc f(p) {}\nproc #main {\n  call f(-1);\n}\n",
     "t.ssa:4:10: error: value -1 does not fit 'p' (uint8)"},
    // ---- Calls ----
    {"WrongNumberOfArguments", "var int16 p;\nproc f(p) {}\nproc #main {\n  call f(1, 2);\n}\n",
     "t.ssa:4:8: error: 'f' takes 1 argument, 2 given"},
    {"ArgumentReadsAnotherFormal",
     "var int16 p;\nvar int16 q;\nproc f(p, q) {}\nproc #main {\n  call f(q, 1);\n}\n",
     "t.ssa:5:10: error: argument 1 reads 'q', another parameter of 'f'"},
    {"CallOfMain", "proc f {\n  call #main();\n}\nproc #main {}\n",
     "t.ssa:2:8: error: '#main' cannot be called: it is where the program starts"},
    {"MainWithParameters", "var int16 p;\nproc #main(p) {}\n",
     "t.ssa:2:12: error: '#main' takes no parameters"},
    // ---- Promises the library relies on ----
    {"VolatileAndErasable", "var int16 x volatile erasable;\nproc #main {}\n",
     "t.ssa:1:22: error: a volatile variable cannot be erasable"},
    {"ExternModifiesAPlainVariable", "var int16 x;\nproc #main {\n  extern read modifies(x);\n}\n",
     "t.ssa:3:24: error: 'x' may be modified by 'read', so it must be volatile or an array"},
    {"ProcedureWithoutEnd", "proc #main {\nL:\n  goto L;\n}\n",
     "t.ssa:1:6: error: procedure '#main' never reaches its end"},
    {"OutlineNameClash", "proc #block_7 {}\nproc #main {\noutline L:\n}\n",
     "t.ssa:3:1: error: a program that outlines blocks cannot have procedures named '#block_...', as "
     "'#block_7' at "
     "line 1; outlining names its procedures so"},
    {"OutlinedLoopWithoutEnd",
     "var bool b volatile;\nproc #main {\n  if b goto L else end;\noutline L:\n  goto M;\nM:\n  goto M;\n}\n",
     "t.ssa:4:1: error: outlining 'L' makes procedure '#block_1', which never reaches its end"},
};

class FrontEndError : public clienttest::ClientTest, public ::testing::WithParamInterface<ErrorCase> {};

TEST_P(FrontEndError, IsReportedAtItsPosition) {
  EXPECT_EQ(diagnosticsOf(GetParam().program), std::string(GetParam().diagnostic) + "\n");
}

INSTANTIATE_TEST_SUITE_P(Kinds, FrontEndError, ::testing::ValuesIn(kErrorCases),
                         [](const ::testing::TestParamInfo<ErrorCase>& kind) {
                           return std::string(kind.param.name);
                         });

class FrontEndLimits : public clienttest::ClientTest {};

TEST_F(FrontEndLimits, ExpressionsNestedTooDeeplyAreRejectedNotOverflowed) {
  std::string deep(1001, '(');
  std::string program = "var int16 x;\nproc #main {\n  x = " + deep + "1" + std::string(1001, ')') + ";\n}\n";
  EXPECT_EQ(diagnosticsOf(program), "t.ssa:3:1007: error: expression nested deeper than 1000 levels\n");
  std::string fine(999, '(');
  EXPECT_NE(load("var int16 x;\nproc #main {\n  x = " + fine + "1" + std::string(999, ')') + ";\n}\n"),
            nullptr);
}

TEST_F(FrontEndLimits, UnreachableBlocksAreDroppedWithAWarningThatNamesThem) {
  const char* program =
      "var int16 x;\n"
      "proc #main {\n"
      "  goto end;\n"
      "orphan:\n"
      "  x = 1;\n"
      "}\n";
  EXPECT_EQ(
      diagnosticsOf(program),
      "t.ssa:4:1: warning: block 'orphan' cannot be reached from the start of '#main' and is dropped\n");
  EXPECT_EQ(print(program), "var int16 x;\n\nproc #main {\n}\n");
}

TEST_F(FrontEndLimits, AnUnreadableFileIsAnErrorWithoutPosition) {
  ssaopt::client::LoadResult result = ssaopt::client::loadProgramFile("/nonexistent/program.ssa");
  ASSERT_EQ(result.program, nullptr);
  EXPECT_EQ(ssaopt::client::formatDiagnostic("p.ssa", result.diagnostics.at(0)),
            "p.ssa: error: cannot read the file");
}

}  // namespace
