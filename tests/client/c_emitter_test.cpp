// The C emitter's text for small programs: what a reader of the emitted C relies on. That the C
// computes what the interpreter computes is checked by compiling it (tests/tools/cc_check_test.cpp).
#include "ssaopt/client/c_emitter.h"

#include "client_testing.h"
#include "passes.h"

namespace {

::testing::AssertionResult contains(const std::string& text, const std::string& piece) {
  if (text.find(piece) != std::string::npos) return ::testing::AssertionSuccess();
  return ::testing::AssertionFailure() << "no\n" << piece << "\nin\n" << text;
}

class EmittingC : public clienttest::ClientTest {
protected:
  ssaopt::client::EmittedC emit(const std::string& text, const std::vector<std::string>& pipeline = {}) {
    ssaopt::client::Program* pProgram = load(text);
    if (!pProgram) return {};
    ssaopt::tool::runPipeline(pipeline, *pProgram);
    return ssaopt::client::emitC(*pProgram);
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
  EXPECT_TRUE(contains(text, "ssa_write_table((double)mode, ssa_mul((double)gain, 2.0));\n"));
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
                       "    x = ssa_to_int16(ssa_in1 - ssa_in2);\n"
                       "  }\n"));
  EXPECT_TRUE(contains(emitted.text, "  x = ssa_to_int16(ssa_input_other());\n"));
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
                         "    a = ssa_to_int16(ssa_arg1);\n"
                         "    b = ssa_to_int16(ssa_arg2);\n"
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

}  // namespace
