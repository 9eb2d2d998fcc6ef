// The C emitter's text for small programs: what a reader of the emitted C relies on. That the C
// computes what the interpreter computes is checked by compiling it (tests/tools/cc_check_test.cpp).
#include "ssaopt/client/c_emitter.h"

#include <regex>

#include "client_testing.h"
#include "passes.h"

namespace {

::testing::AssertionResult contains(const std::string& text, const std::string& piece) {
  if (text.find(piece) != std::string::npos) return ::testing::AssertionSuccess();
  return ::testing::AssertionFailure() << "no\n" << piece << "\nin\n" << text;
}

bool defines(const std::string& text, const std::string& function) {
  return std::regex_search(text, std::regex("\nstatic inline [a-z0-9_]+ " + function + "\\("));
}

class EmittingC : public clienttest::ClientTest {
protected:
  // With every check, unless `useRanges`.
  ssaopt::client::EmittedC emit(const std::string& text, const std::vector<std::string>& pipeline = {},
                                bool useRanges = false) {
    ssaopt::client::Program* pProgram = load(text);
    if (!pProgram) return {};
    ssaopt::tool::runPipeline(pipeline, *pProgram);
    return ssaopt::client::emitC(*pProgram, ssaopt::client::EmitOptions{useRanges});
  }
};

TEST_F(EmittingC, VariablesAreGlobalsOfTheirTypesAndStoresGoThroughTheirHelpers) {
  std::string text = emit(
                         "var int16 level scale(0.5) saturate(..100) = 3;\n"
                         "var uint8 mode saturate(1..4) = 2;\n"
                         "var float32 gain output = 0.25;\n"
                         "var int32 table[3] = 7;\n"
                         "var bool unused = 1;\n"
                         "proc #main {\n"
                         "  level = level + mode;\n"
                         "  table[mode] = gain * 2;\n"
                         "}\n")
                         .text;
  EXPECT_TRUE(contains(text, "static double level = 3.0; /* int16 scaled: the value it stands for */\n"));
  EXPECT_TRUE(contains(text, "static uint8_t mode = 2;\n"));
  EXPECT_TRUE(contains(text, "static float gain = 0.25; /* output */\n"));
  EXPECT_TRUE(contains(text, "static int32_t table[3] = {7, 7, 7};\n"));
  EXPECT_FALSE(contains(text, "unused"));
  EXPECT_TRUE(contains(text, "  if (x > 100.0) {\n    x = 100.0;\n    saturated = 1;\n  }\n"));
  EXPECT_TRUE(contains(text, "  return ssa_represent(x, 0.5, 0.0);\n"));
  EXPECT_TRUE(contains(text, "level = ssa_store_level(level + (double)mode);\n"));
  EXPECT_TRUE(contains(text, "ssa_write_table(ssa_int((double)mode), ssa_mul((double)gain, 2.0));\n"));
}

TEST_F(EmittingC, InputsAreReadInTheInterpretersOrderThroughTheirHooks) {
  ssaopt::client::EmittedC emitted = emit(
      "var int16 in volatile;\n"
      "var int16 other volatile;\n"
      "var int16 x = 0;\n"
      "proc #main {\n"
      "  x = in - in;\n"
      "  x = other;\n"
      "}\n");
  EXPECT_TRUE(contains(emitted.text, "double ssa_input_in(void);\n"));
  EXPECT_TRUE(contains(emitted.text,
                       "  {\n"
                       "    double ssa_in1 = ssa_input_in();\n"
                       "    double ssa_in2 = ssa_input_in();\n"
                       "    x = ssa_to_int16(ssa_int(ssa_in1 - ssa_in2));\n"
                       "  }\n"));
  EXPECT_TRUE(contains(emitted.text, "  x = ssa_to_int16(ssa_int(ssa_input_other()));\n"));
  ASSERT_EQ(emitted.inputs.size(), 2u);
  EXPECT_EQ(emitted.inputs[0].variable, "in");
  EXPECT_EQ(emitted.inputs[1].hook, "ssa_input_other");
}

TEST_F(EmittingC, CallsAssignTheirArgumentsAndMainBecomesAStepFunction) {
  std::string program =
      "var int16 a = 0;\n"
      "var int16 b = 0;\n"
      "var int16 buf[2] = 0;\n"
      "var int16 total output = 0;\n"
      "proc #main {\n"
      "  call add(total, 2);\n"
      "  if total > 10 goto full else end;\n"
      "full:\n"
      "  extern report uses(total) modifies(buf);\n"
      "  total = buf[0];\n"
      "}\n"
      "proc add(a, b) {\n"
      "  total = a + b;\n"
      "}\n";
  for (const std::vector<std::string>& pipeline :
       {std::vector<std::string>{}, std::vector<std::string>{"ssa"}}) {
    std::string text = emit(program, pipeline).text;
    EXPECT_TRUE(contains(text,
                         "    double ssa_arg1 = (double)total;\n"
                         "    double ssa_arg2 = 2.0;\n"
                         "    a = ssa_to_int16(ssa_int(ssa_arg1));\n"
                         "    b = ssa_to_int16(ssa_int(ssa_arg2));\n"
                         "    proc_add();\n"));
    EXPECT_TRUE(contains(text,
                         "  ssa_extern_begin(\"report\");\n  ssa_value(\"total\", (double)total);\n"
                         "  ssa_extern_end();\n  ssa_refill_buf();\n"));
    EXPECT_TRUE(contains(text, "  if ((double)total > 10.0) goto full;\n"));
    EXPECT_TRUE(contains(text, "  return 1; /* the end of a pass"));
    EXPECT_TRUE(contains(text, "int ssaopt_step(void) {"));
    EXPECT_TRUE(contains(text, "  ssa_value(\"total\", (double)total);\n  ssa_output_end();\n"));
  }
}

TEST_F(EmittingC, TheUnitHoldsOnlyTheFunctionsItCalls) {
  // Warnings of unused functions are errors under -Werror: helpers, per-variable helpers and
  // procedures appear only where something calls them, and procedures are static.
  std::string text = emit(
                         "var int16 a[2] = 0;\n"
                         "var int16 x = 0;\n"
                         "var int16 y scale(0.5) = 0;\n"
                         "proc #main {\n"
                         "  x = a[x] << 1;\n"
                         "  call used();\n"
                         "}\n"
                         "proc used {\n"
                         "  y = x;\n"
                         "}\n"
                         "proc unused {\n"
                         "  call used();\n"
                         "  x = x * 2;\n"
                         "}\n")
                         .text;
  for (const char* called : {"ssa_shl", "ssa_signed", "ssa_int", "ssa_read_a", "ssa_store_y", "ssa_represent",
                             "ssa_round", "ssa_sign_bit", "ssa_to_int16", "ssa_wrap"})
    EXPECT_TRUE(defines(text, called)) << called << " in\n" << text;
  for (const char* unused : {"ssa_mul", "ssa_div", "ssa_shr", "ssa_write_a", "ssa_fill_a", "ssa_observe_a",
                             "ssa_to_int8", "ssa_to_float32", "proc_unused"})
    EXPECT_FALSE(contains(text, unused)) << unused;
  EXPECT_TRUE(contains(text, "static void proc_used(void) {\n"));
}

TEST_F(EmittingC, StatementsThatChangeNothingGenerateNoCode) {
  // The first step starts with the variables as their static initialisers left them, so the
  // initialisations of SSA form store nothing new; and a copy between versions of one variable stores
  // what it holds. Left in, the stores would keep the compiler from seeing that a never-written
  // variable is a constant.
  std::string text = emit(
                         "var int16 a = 5;\n"
                         "var int16 b = 0;\n"
                         "var float64 f = 1;\n"
                         "var int16 in volatile;\n"
                         "var int16 p = 0;\n"
                         "proc #main {\n"
                         "  b = a + in;\n"
                         "  f = f;\n"
                         "  call g(7);\n"
                         "}\n"
                         "proc g(p) {\n"
                         "  b = p;\n"
                         "}\n",
                         {"inline", "ssa"})
                         .text;
  EXPECT_TRUE(contains(text,
                       "  if (ssa_resume == 2) goto bb6;\n"
                       "bb0:\n"
                       "  b = ssa_to_int16(ssa_int((double)a + ssa_input_in()));\n"
                       "  p = 7;\n"
                       "  b = ssa_to_int16(ssa_int((double)p));\n"
                       "  return 1;"));
  EXPECT_FALSE(contains(text, " f = ")) << "f is neither read nor written";
  EXPECT_FALSE(contains(text, "static double f")) << "nor declared";
}

TEST_F(EmittingC, ConstantConditionsAreCsTruthValues) {
  // "if (-2.0)" draws a warning of a literal conversion that changes the value.
  std::string text = emit(
                         "var int16 x output = 0;\n"
                         "proc #main {\n"
                         "  if -2 goto a else end;\n"
                         "a:\n"
                         "  if 0 goto b else end;\n"
                         "b:\n"
                         "  x = 1;\n"
                         "}\n")
                         .text;
  EXPECT_TRUE(contains(text, "  if (1) goto a;\n"));
  EXPECT_TRUE(contains(text, "  if (0) goto b;\n"));
}

TEST_F(EmittingC, ChecksThatRangesShowToBeNeedlessAreLeftOut) {
  // Declared bounds (k, a) and propagated ranges (i in [3, 5] after the branch, x = f * 5 in [1, 4])
  // make saturations, wrapping casts, index checks and the checks of integer views needless; the value
  // is marked with the range it relies on. A value that may be NaN keeps its checks: C's conversion of
  // a NaN to an integer is undefined.
  std::string program =
      "var int8 a volatile;\n"
      "var uint8 k volatile saturate(0..5);\n"
      "var float64 g volatile saturate(0.2..0.8);\n"
      "var bool in volatile;\n"
      "var int16 x = 0;\n"
      "var int16 s saturate(0..100) = 0;\n"
      "var int16 t scale(0.5) saturate(-10..10) = 0;\n"
      "var float64 f saturate(0..1) = 0;\n"
      "var int16 tab[6] = 0;\n"
      "var uint8 i = 0;\n"
      "var int16 y output = 0;\n"
      "proc #main {\n"
      "  x = a + 1;\n"
      "  s = k * 10;\n"
      "  t = k;\n"
      "  tab[k] = s;\n"
      "  s = a * 10;\n"
      "  f = g;\n"
      "  x = a << 2;\n"
      "  x = f * 5;\n"
      "  i = 3;\n"
      "  if in goto five else read;\n"
      "five:\n"
      "  i = 5;\n"
      "read:\n"
      "  y = tab[i] + tab[x];\n"
      "}\n";
  std::string text = emit(program, {"ssa", "divide", "sccp"}, true).text;
  EXPECT_TRUE(contains(
      text,
      "  x = (int16_t)SSA_RANGE(ssa_input_a() + 1.0, -127.0, 128.0);\n"
      "  s = (int16_t)SSA_RANGE(ssa_mul(ssa_input_k(), 10.0), 0.0, 50.0);\n"
      "  t = ssa_represent(SSA_RANGE(ssa_input_k(), 0.0, 5.0), 0.5, 0.0);\n"
      "  tab[(int32_t)SSA_RANGE(ssa_input_k(), 0.0, 5.0)] = (int16_t)SSA_RANGE((double)s, 0.0, 50.0);\n"
      "  s = ssa_store_s(ssa_mul(ssa_input_a(), 10.0));\n"
      "  f = SSA_RANGE_OR_NAN(ssa_input_g(), 0.2, 0.8);\n"
      // An integer operator gives a 32-bit integer: its integer view needs no check.
      "  x = ssa_to_int16((int32_t)SSA_RANGE(ssa_shl((int32_t)SSA_RANGE(ssa_input_a(), -128.0, 127.0), 2), "
      "-2147483648.0, 2147483647.0));\n"
      "  x = ssa_to_int16(ssa_int(ssa_mul(f, 5.0)));\n"));
  // The sum may leave int16 but not the 32-bit range: it wraps, from its integer view without check.
  EXPECT_TRUE(
      contains(text,
               "  y = ssa_to_int16((int32_t)SSA_RANGE((double)tab[(int32_t)SSA_RANGE((double)i, 3.0, "
               "5.0)] + (double)tab[(int32_t)SSA_RANGE((double)x, 1.0, 4.0)], -65536.0, 65534.0));\n"));
  EXPECT_TRUE(contains(text, "#define SSA_RANGE(x, lo, hi) (x)\n"));
  EXPECT_FALSE(contains(emit(program, {"ssa", "divide", "sccp"}, false).text, "SSA_RANGE"));
}

TEST_F(EmittingC, LongExpressionsAreWrittenWhole) {
  std::string sum = "b";
  for (int i = 1; i < 100000; ++i) sum += " + b";
  std::string text =
      emit("var int32 a output = 0;\nvar int32 b = 1;\nproc #main {\n  a = " + sum + ";\n}\n").text;
  std::string expected = "(double)b";
  for (int i = 1; i < 100000; ++i) expected += " + (double)b";
  EXPECT_NE(text.find("  a = ssa_to_int32(ssa_int(" + expected + "));\n"), std::string::npos);
}

}  // namespace
