// The interpreter's input streams: seeded values the variable can hold, reproducible per seed and
// per variable, and values listed in a text.
#include <cmath>
#include <optional>
#include <set>

#include "client_testing.h"
#include "ssaopt/client/interpreter.h"
#include "ssaopt/client/variable.h"

namespace {

using ssaopt::client::ListedInputs;
using ssaopt::client::SeededInputs;

constexpr int kDraws = 2000;

class SeededStreams : public clienttest::ClientTest {
protected:
  SeededStreams() {
    m_pProgram = load(
        "var bool b volatile;\n"
        "var int8 small volatile;\n"
        "var uint32 wide volatile;\n"
        "var uint8 mode volatile;\n"
        "var int16 limited saturate(-5..300) volatile;\n"
        "var int16 scaled scale(0.01, 2) saturate(1.5..3.25) volatile;\n"
        "var int32 fine scale(0.001) volatile;\n"
        "var float32 single volatile;\n"
        "var float64 narrow saturate(-0.5..0.5) volatile;\n"
        "proc #main {\n"
        "}\n");
  }

  const KvCCfgSFVariable& variable(const char* name) { return *m_pProgram->findVariable(name); }

  std::vector<double> draw(SeededInputs& inputs, const char* name, int count = kDraws) {
    std::vector<double> values;
    for (int i = 0; i < count; ++i) values.push_back(*inputs.next(variable(name)));
    return values;
  }

  ssaopt::client::Program* m_pProgram;
};

TEST_F(SeededStreams, EveryValueIsOneTheVariableCanHold) {
  SeededInputs inputs(3);
  for (const auto& pVariable : m_pProgram->variables()) {
    std::optional<double> lowest = ssaopt::client::declaredLowerBound(*pVariable);
    std::optional<double> highest = ssaopt::client::declaredUpperBound(*pVariable);
    for (double value : draw(inputs, pVariable->getName().c_str())) {
      SCOPED_TRACE(pVariable->getName() + " = " + std::to_string(value));
      ASSERT_TRUE(std::isfinite(value));
      // Storing it changes nothing: it is saturated, represented and of the type already.
      EXPECT_EQ(ssaopt::client::storedValue(*pVariable, value), value);
      EXPECT_GE(value, lowest.value_or(-INFINITY));
      EXPECT_LE(value, highest.value_or(INFINITY));
    }
  }
}

TEST_F(SeededStreams, BordersAndSmallValuesComeUpOften) {
  SeededInputs inputs(5);
  std::vector<double> smalls = draw(inputs, "small", 200);
  std::vector<double> limited = draw(inputs, "limited", 200);
  std::vector<double> modes = draw(inputs, "mode", 200);
  std::set<double> seen(smalls.begin(), smalls.end());
  seen.insert(limited.begin(), limited.end());
  seen.insert(modes.begin(), modes.end());
  for (double expected : {-128.0, 127.0, -5.0, 300.0, 0.0, 1.0, 2.0, 3.0})
    EXPECT_TRUE(seen.count(expected)) << expected << " never came up";
}

TEST_F(SeededStreams, AStreamDependsOnlyOnTheSeedTheVariableAndItsOwnReads) {
  SeededInputs first(11);
  SeededInputs second(11);
  SeededInputs other(12);
  std::vector<double> alone = draw(first, "limited", 50);
  std::vector<double> interleaved;
  for (int i = 0; i < 50; ++i) {
    second.next(variable("small"));
    interleaved.push_back(*second.next(variable("limited")));
  }
  EXPECT_EQ(alone, interleaved);
  EXPECT_NE(alone, draw(other, "limited", 50));
}

TEST(ListedStreams, GiveEachVariableItsValuesInOrderUntilTheyRunOut) {
  ssaopt::PoolMemController pool;
  ssaopt::PoolMemController::Scope scope(&pool);
  ssaopt::client::LoadResult loaded = ssaopt::client::loadProgram(
      "var float64 a volatile;\n"
      "var int16 b volatile;\n"
      "var int16 c volatile;\n"
      "proc #main {\n"
      "}\n");
  const KvCCfgSFVariable& a = *loaded.program->findVariable("a");
  const KvCCfgSFVariable& b = *loaded.program->findVariable("b");
  const KvCCfgSFVariable& c = *loaded.program->findVariable("c");
  std::string error;
  std::optional<ListedInputs> inputs =
      ListedInputs::parse("a 1 2.5 -inf # a comment\n\n# a line of comment\nb 3\na nan 4\n", error);
  ASSERT_TRUE(inputs) << error;
  std::vector<double> as;
  for (int i = 0; i < 5; ++i) as.push_back(*inputs->next(a));
  EXPECT_EQ(as[0], 1.0);
  EXPECT_EQ(as[1], 2.5);
  EXPECT_EQ(as[2], -INFINITY);
  EXPECT_TRUE(std::isnan(as[3]));
  EXPECT_EQ(as[4], 4.0);
  EXPECT_FALSE(inputs->next(a));
  EXPECT_EQ(inputs->next(b), 3.0);
  EXPECT_FALSE(inputs->next(c));
}

}  // namespace
